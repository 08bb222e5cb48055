#include "resources/ormond_strings.h"

#include <array>
#include <cstring>

namespace {

constexpr int32_t kEntryCount = 32;

// Indexes without an entry are not looked up by this plug-in.
constexpr std::array<const char*, kEntryCount> kEntries = [] {
    std::array<const char*, kEntryCount> entries{};
    entries[0] = "$$$/QN/Ormond/LStr/0000=Ostrel 3D";
    entries[1] = "$$$/QN/Ormond/LStr/0001=Could not acquire TOMA suite.";
    entries[2] = "$$$/QN/Ormond/LStr/0002=Ostrel 3D (Tessary 3D) Renderer plug-in#{cr}Version 1.1";
    entries[31] = "$$$/QN/Ormond/LStr/0031=Tessary 3D options data";
    return entries;
}();

// Registered by the plug-in's entry, dropped by its death hook; read by any thread in between.
U_LStrCache gCache = nullptr;

}  // namespace

const U_LStrTable ORM_LStrTable{kEntries.data(), kEntryCount};

int32_t ORM_RegisterStrings() {
    if (gCache) return 0;
    return U_ZRegisterLStrCache(&ORM_LStrTable, &gCache);
}

int32_t ORM_UnregisterStrings() {
    if (!gCache) return 0;
    int32_t error = U_ZUnregisterLStrCache(gCache);
    gCache = nullptr;
    return error;
}

const char* ORM_String(ORM_StringId id) {
    auto index = static_cast<int32_t>(id);
    if (gCache) return U_ZLookupLStrCache(gCache, index, 0, 0);
    const char* entry = kEntries[static_cast<size_t>(index)];
    return std::strchr(entry, '=') + 1;
}
