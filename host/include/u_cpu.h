// The host's processor record.
#pragma once

#include <cstdint>

// What the renderer asks of the processor: how many threads, and which vector paths.
struct U_CPU_Data {
    int32_t processorCount;  // logical processors this process may use
    int32_t reserved;
    int32_t hasVectorUnits;  // non-zero when SSE4.1 is there: the renderer's vector paths
};

// The process-wide processor record, filled on first use.
const U_CPU_Data* U_G_CPU_DataP();

// Swaps the bytes of a 32-bit value (flattened data is big-endian).
uint32_t U_LongSwap(uint32_t value);
