// "QNGP Persistent Data Suite" 3: the application's settings, by section and key.
#pragma once

#include <cstdint>
#include <string>

#include "qngp_suites.h"

namespace ostrel {

const QNGP_PersistentDataSuite3* PersistentDataSuite();

// Sets a 32-bit setting of the application blob; Clear forgets them all.
void SetApplicationSetting(const std::string& section, const std::string& key, int32_t value);
void ClearApplicationSettings();

}  // namespace ostrel
