#include "session/transfer_modes.h"

namespace ostrel {
namespace {

struct NamedMode {
    std::string_view name;
    int32_t number;
};

// The modes whose numbers the renderer itself relies on.
constexpr NamedMode kModes[] = {{"copy", 0}, {"behind", 1}, {"normal", 2}, {"multiply", 5}};

}  // namespace

int32_t TransferModeNumber(std::string_view name) {
    for (const NamedMode& mode : kModes) {
        if (mode.name == name) return mode.number;
    }
    return -1;
}

}  // namespace ostrel
