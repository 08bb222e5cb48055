// What the processor can run, found once: the span routines' wide paths (four pixels lit at
// once, area samples in pairs) are compiled for AVX2 in files of their own and called only
// where it is there.
#pragma once

inline bool SY_ProcessorHasAvx2() {
    static const bool has = (__builtin_cpu_init(), __builtin_cpu_supports("avx2"));
    return has;
}
