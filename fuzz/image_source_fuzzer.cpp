// Image paths from arbitrary bytes, as a composition may name them: the loader resolves the path
// beside the composition and probes the file, and ends in its one error for anything that is
// not a readable image (no such file, a folder, a device, a name too long, a NUL).
#include <cstddef>
#include <cstdint>
#include <nlohmann/json.hpp>
#include <string>

#include "composition/composition_error.h"
#include "composition/composition_loader.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    std::string path(reinterpret_cast<const char*>(data), size);
    nlohmann::json layer = {{"kind", "image"}, {"source", path}};
    nlohmann::json comp = {{"width", 64}, {"height", 64}, {"duration", 1}, {"layers", {layer}}};
    std::string text;
    try {
        text = comp.dump();
    } catch (const nlohmann::json::exception&) {
        return 0;  // not UTF-8: a composition file could not hold it either
    }
    try {
        ostrel::ParseComposition(text, "examples/cards/fuzzed.json");
    } catch (const ostrel::CompositionError&) {
    }
    return 0;
}
