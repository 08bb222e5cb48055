// Transfer modes of the host's pixel library: blend functions per mode number for the three
// pixel types, the mode-name table, and the linear-light blending tables.
#pragma once

#include <cstdint>
#include <string_view>

#include "pf_pixel.h"

// Linear-light blending tables. The members are read in place by callers, in this order.
struct PF_LinearBlendingTables {
    uint16_t forward[256];   // linear value (0..32768) of each 8-bit code
    uint16_t inverse[4097];  // code value (0..32768) of the linear value 8 × index
    float toLinearExponent;  // float channel → linear
    float fromLinearExponent;
};

// Tables for a pure power curve: linear = code^gamma (gamma > 0).
void PF_BuildLinearBlendingTablesGamma(float gamma, PF_LinearBlendingTables* tables);
// Tables for the sRGB curve; the float exponents approximate it by 2.2.
void PF_BuildLinearBlendingTablesSRGB(PF_LinearBlendingTables* tables);

// 8-bit code → 16-bit linear (0..32768).
inline uint32_t PF_LinearFrom8(const PF_LinearBlendingTables& t, uint32_t c) {
    return t.forward[c];
}
// 16-bit code → 16-bit linear, interpolating the forward table in steps of 1/32768 of a code.
inline uint32_t PF_LinearFrom16(const PF_LinearBlendingTables& t, uint32_t c) {
    uint32_t k = (c * 255) >> 15, r = (c * 255) & 0x7FFF;
    if (!r) return t.forward[k];
    return t.forward[k] +
           ((r * static_cast<uint32_t>(t.forward[k + 1] - t.forward[k]) + 16384) >> 15);
}
// 16-bit linear → 16-bit code, interpolating the inverse table in steps of 1/8.
inline uint32_t PF_LinearTo16(const PF_LinearBlendingTables& t, uint32_t v) {
    uint32_t i = v >> 3, f = v & 7;
    if (!f) return t.inverse[i];
    return t.inverse[i] + ((static_cast<uint32_t>(t.inverse[i + 1] - t.inverse[i]) * f + 4) >> 3);
}
// 16-bit linear → 8-bit code.
inline uint32_t PF_LinearTo8(const PF_LinearBlendingTables& t, uint32_t v) {
    return (PF_LinearTo16(t, v) * 255 + 16384) >> 15;
}

// Opacity comes in the channel's own range: 0..255, 0..32768 or 0..1.
template <class P>
using PF_XferOpacity = typename PF_PixelTraits<P>::Channel;

// Blends *src onto *dst in place. Colour is straight; tables null blends the stored values,
// otherwise 8- and 16-bit blend in linear light through the tables and float through the
// exponents.
template <class P>
using PF_Xfer1Func = void (*)(const P* src, const PF_LinearBlendingTables* tables, P* dst);
// As above, with the source's alpha scaled by opacity first.
template <class P>
using PF_Xfer1OpacityFunc = void (*)(const P* src, const PF_LinearBlendingTables* tables,
                                     PF_XferOpacity<P> opacity, P* dst);

// The blend function of a transfer-mode number (0..127; bit 7 and above are ignored). Numbers
// without a mode of their own blend as normal.
PF_Xfer1Func<PF_Pixel8> PF_Get_Xfer1_table8(int32_t mode);
PF_Xfer1Func<PF_Pixel16> PF_Get_Xfer1_table16(int32_t mode);
PF_Xfer1Func<PF_PixelFloat> PF_Get_Xfer1_tableF(int32_t mode);
PF_Xfer1OpacityFunc<PF_Pixel8> PF_Get_Xfer1_Opacity_table8(int32_t mode);
PF_Xfer1OpacityFunc<PF_Pixel16> PF_Get_Xfer1_Opacity_table16(int32_t mode);
PF_Xfer1OpacityFunc<PF_PixelFloat> PF_Get_Xfer1_Opacity_tableF(int32_t mode);

// The same, chosen by pixel type in code written once for the three.
template <class P>
PF_Xfer1Func<P> PF_Get_Xfer1(int32_t mode);
template <class P>
PF_Xfer1OpacityFunc<P> PF_Get_Xfer1_Opacity(int32_t mode);

// The fixed mode numbers the renderer relies on.
inline constexpr int32_t kPF_XferCopy = 0;
inline constexpr int32_t kPF_XferBehind = 1;
inline constexpr int32_t kPF_XferNormal = 2;
inline constexpr int32_t kPF_XferMultiply = 5;

// One named mode. Names are lower case, words joined by '-', as composition files write them.
struct PF_XferModeName {
    int32_t number;
    const char* name;
};

// Every named mode, in ascending number.
extern const PF_XferModeName PF_XferModeNames[];
extern const int32_t PF_XferModeNameCount;

// The name of a mode number, or null when the number has none.
const char* PF_XferModeToName(int32_t mode);
// The number of a mode name, or −1 when no mode has that name.
int32_t PF_XferModeFromName(std::string_view name);
