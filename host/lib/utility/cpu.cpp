#include "u_cpu.h"

#include <thread>

namespace {

U_CPU_Data Probe() {
    U_CPU_Data data{};
    unsigned count = std::thread::hardware_concurrency();
    data.processorCount = count ? static_cast<int32_t>(count) : 1;
    data.hasVectorUnits = __builtin_cpu_supports("sse4.1") ? 1 : 0;
    return data;
}

}  // namespace

const U_CPU_Data* U_G_CPU_DataP() {
    static const U_CPU_Data data = Probe();
    return &data;
}

uint32_t U_LongSwap(uint32_t value) {
    return __builtin_bswap32(value);
}
