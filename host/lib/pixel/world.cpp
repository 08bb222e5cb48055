#include "pf_world.h"

#include <cstring>
#include <new>

#include "boost/numeric/conversion/cast.hpp"

template <class P>
PF_WorldX<P>::PF_WorldX(int32_t w, int32_t h) {
    if (w < 0 || h < 0) throw std::bad_alloc();
    int32_t rb = boost::numeric_cast<int32_t>(sizeof(P) * static_cast<size_t>(w));
    size_t bytes = static_cast<size_t>(rb) * static_cast<size_t>(h);
    void* pixels = U_AllocatePtr(0, "world", bytes ? bytes : 1);
    if (!pixels) throw std::bad_alloc();
    std::memset(pixels, 0, bytes);
    U_AccountAllocationEx(bytes, 1);
    width = w;
    height = h;
    rowBytes = rb;
    bitDepth = PF_PixelTraits<P>::kBitDepth;
    data = pixels;
}

template <class P>
PF_WorldX<P>::~PF_WorldX() {
    U_AccountAllocationEx(static_cast<size_t>(rowBytes) * static_cast<size_t>(height), 0);
    U_FreePtr(data);
}

template class PF_WorldX<PF_Pixel8>;
template class PF_WorldX<PF_Pixel16>;
template class PF_WorldX<PF_PixelFloat>;
