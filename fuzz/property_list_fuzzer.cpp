// Property lists from arbitrary bytes: the host reads one before it loads any plug-in code, so
// a damaged file must end in the host's one error, never in a crash or an endless read.
#include <cstddef>
#include <cstdint>
#include <span>

#include "host_error.h"
#include "plugins/property_list.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    try {
        ostrel::ParsePropertyList(std::span(data, size), "fuzzed.prpl");
    } catch (const ostrel::HostError&) {
    }
    return 0;
}
