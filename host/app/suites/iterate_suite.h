// "QNGP Iterate Suite" 1: the host's threaded iterator.
#pragma once

#include <cstdint>

#include "pf_iterate.h"

namespace ostrel {

const QNGP_IterateSuite1* IterateSuite();

// Sets how many threads the iterator runs items on (0: one per processor). Takes effect for
// iterations that start afterwards.
void SetIterateThreads(int32_t threads);

}  // namespace ostrel
