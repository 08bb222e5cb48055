// The plug-in's localised strings: one "key=default text" entry per index, served by the host's
// string cache once the plug-in's entry has registered them.
#pragma once

#include <cstdint>

#include "u_strings.h"

enum class ORM_StringId : int32_t {
    kName = 0,
    kSuiteMissing = 1,
    kAboutText = 2,
    kOptionsHandleName = 31,
};

extern const U_LStrTable ORM_LStrTable;

// Registers and drops the cache of ORM_LStrTable; both return 0 or the string cache's error.
int32_t ORM_RegisterStrings();
int32_t ORM_UnregisterStrings();

// The text of an entry: from the registered cache, else the table's default text.
const char* ORM_String(ORM_StringId id);
