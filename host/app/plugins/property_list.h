// A plug-in's property list: what the host reads before it loads the plug-in's code.
#pragma once

#include <cstdint>
#include <span>
#include <string>

namespace ostrel {

struct PropertyList {
    std::string kind;  // "QNgx" for a general plug-in
    std::string name;  // the localised name entry, "key=default text"
    std::string category;
    uint32_t version = 0;
    std::string entryPoint;  // the exported function to call on x86-64
    uint32_t flags = 0;
};

// Reads the bytes of a property list; `source` names the file in error messages. Throws
// HostError for anything malformed or missing.
PropertyList ParsePropertyList(std::span<const uint8_t> bytes, const std::string& source);

}  // namespace ostrel
