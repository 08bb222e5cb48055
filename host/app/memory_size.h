// The machine's memory, and sizes of memory as a user reads them.
#pragma once

#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <string>

namespace ostrel {

inline uint64_t PhysicalMemoryBytes() {
    long pages = sysconf(_SC_PHYS_PAGES), pageBytes = sysconf(_SC_PAGESIZE);
    return pages > 0 && pageBytes > 0
               ? static_cast<uint64_t>(pages) * static_cast<uint64_t>(pageBytes)
               : uint64_t{1} << 32;
}

// "23.5 GiB", or "512.0 MiB" below a gibibyte: in the powers of 1024 that sizes are given in.
inline std::string SizeText(double bytes) {
    char text[32];
    const double kGiB = 1024.0 * 1024 * 1024;
    if (bytes >= kGiB) {
        std::snprintf(text, sizeof text, "%.1f GiB", bytes / kGiB);
    } else {
        std::snprintf(text, sizeof text, "%.1f MiB", bytes / (1024.0 * 1024));
    }
    return text;
}

}  // namespace ostrel
