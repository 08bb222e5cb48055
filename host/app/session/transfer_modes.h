// Transfer modes by the names composition files give them.
#pragma once

#include <cstdint>
#include <string_view>

namespace ostrel {

// The host's number of a transfer mode name, or -1 when no mode has that name.
int32_t TransferModeNumber(std::string_view name);

}  // namespace ostrel
