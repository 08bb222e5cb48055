#include <cmath>
#include <new>

#include "pf_bit_depth.h"
#include "pf_tables.h"

namespace {

// A pixel premultiplied and normalised; non-finite float values count as nothing, so that
// every box sum stays finite.
template <class P>
PF_PixelDouble Normalised(const P& p) {
    constexpr double k = 1.0 / PF_PixelTraits<P>::kMax;
    auto finite = [](double v) { return std::isfinite(v) ? v : 0.0; };
    double a = finite(p.alpha * k);
    return {a, a * finite(p.red * k), a * finite(p.green * k), a * finite(p.blue * k)};
}

template <class P, class S>
void Fill(const PF_World& world, S* sums) {
    using V = decltype(S::alpha);
    ptrdiff_t stride = ptrdiff_t(world.width) + 1;
    for (ptrdiff_t x = 0; x < stride; ++x)
        sums[x] = S{};
    for (int32_t y = 0; y < world.height; ++y) {
        const P* pixels = world.Row<P>(y);
        const S* above = sums + y * stride;
        S* row = sums + (y + 1) * stride;
        PF_PixelDouble running{0.0, 0.0, 0.0, 0.0};
        row[0] = S{};
        for (int32_t x = 0; x < world.width; ++x) {
            PF_PixelDouble p = Normalised(pixels[x]);
            running = {running.alpha + p.alpha, running.red + p.red, running.green + p.green,
                       running.blue + p.blue};
            const S& a = above[x + 1];
            row[x + 1] = {V(a.alpha + running.alpha), V(a.red + running.red),
                          V(a.green + running.green), V(a.blue + running.blue)};
        }
    }
}

}  // namespace

PF_SummedAreaTable::PF_SummedAreaTable(const PF_World& world, bool doubleSums)
    : width_(world.width), height_(world.height), doubleSums_(doubleSums) {
    // The depth is known good before anything is allocated.
    PF_DispatchBitDepth(world.bitDepth, [&]<class P>() {
        size_t cell = doubleSums ? sizeof(PF_PixelDouble) : sizeof(PF_PixelFloat);
        bytes_ = cell * (size_t(width_) + 1) * (size_t(height_) + 1);
        sums_ = U_AllocatePtr(0, "summed-area table", bytes_);
        if (!sums_) throw std::bad_alloc();
        U_AccountAllocationEx(bytes_, 1);
        if (doubleSums)
            Fill<P>(world, static_cast<PF_PixelDouble*>(sums_));
        else
            Fill<P>(world, static_cast<PF_PixelFloat*>(sums_));
    });
}

PF_SummedAreaTable::~PF_SummedAreaTable() {
    U_AccountAllocationEx(bytes_, 0);
    U_FreePtr(sums_);
}
