// "QNGP Memory Suite" 1: movable blocks that plug-ins lock while they read or write them.
#pragma once

#include <cstdint>

#include "qngp_suites.h"

namespace ostrel {

const QNGP_MemorySuite1* MemorySuite();

// Handles made and not yet freed, and handles locked now; both return to 0 when plug-ins
// clean up after themselves.
int64_t LiveMemoryHandles();
int64_t LockedMemoryHandles();

}  // namespace ostrel
