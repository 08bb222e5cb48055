#include <cstdlib>
#include <limits>
#include <numeric>

#include "t_time.h"

namespace {

// Products of a 32-bit value and a 32-bit scale need 64 bits; sums of two need one more.
__extension__ typedef __int128 Wide;

// Reduces value/scale to lowest terms and stores it when it fits a T_Time.
int32_t Store(Wide value, Wide scale, T_Time* out) {
    if (scale == 0) return kT_ErrZeroScale;
    if (scale < 0) {
        value = -value;
        scale = -scale;
    }
    Wide a = value < 0 ? -value : value, b = scale;
    while (b != 0) {
        Wide r = a % b;
        a = b;
        b = r;
    }
    if (a > 1) {
        value /= a;
        scale /= a;
    }
    if (value < std::numeric_limits<int32_t>::min() ||
        value > std::numeric_limits<int32_t>::max() ||
        scale > std::numeric_limits<uint32_t>::max()) {
        return kT_ErrOverflow;
    }
    out->value = static_cast<int32_t>(value);
    out->scale = static_cast<uint32_t>(scale);
    return 0;
}

}  // namespace

int32_t T_AddTimes(const T_Time* a, const T_Time* b, T_Time* sum) {
    if (a->scale == 0 || b->scale == 0) return kT_ErrZeroScale;
    Wide value = static_cast<Wide>(a->value) * b->scale + static_cast<Wide>(b->value) * a->scale;
    return Store(value, static_cast<Wide>(a->scale) * b->scale, sum);
}

int32_t T_MultiplyTime(const T_Time* t, int32_t factor, T_Time* product) {
    if (t->scale == 0) return kT_ErrZeroScale;
    return Store(static_cast<Wide>(t->value) * factor, t->scale, product);
}

int32_t T_DivideTime(const T_Time* t, int32_t divisor, T_Time* quotient) {
    if (t->scale == 0 || divisor == 0) return kT_ErrZeroScale;
    return Store(t->value, static_cast<Wide>(t->scale) * divisor, quotient);
}

int32_t T_CompareTimes(const T_Time* a, const T_Time* b) {
    Wide left = static_cast<Wide>(a->value) * b->scale;
    Wide right = static_cast<Wide>(b->value) * a->scale;
    return left < right ? -1 : left > right ? 1 : 0;
}

double T_Seconds(const T_Time& t) {
    return static_cast<double>(t.value) / t.scale;
}
