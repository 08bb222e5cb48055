#include "pf_iterate.h"

int32_t PF_IterateGeneric_Static(int32_t count, void* closure, PF_IterateCallback callback) {
    for (int32_t i = 0; i < count; ++i) {
        if (int32_t error = callback(closure, 0, i)) return error;
    }
    return 0;
}
