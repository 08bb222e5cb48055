// Fragment records: one per pixel a layer covers, linked into the pixel's list. The object
// records come in three qualities over the three pixel types; the shadow record carries an
// occluder's transmission for the shadow maps.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstdint>

#include "pf_pixel.h"

// Fields every object record begins with. F is the record type itself, so that a list links
// records of one type only.
template <class F>
struct SY_FragmentHead {
    F* next;                // toward the camera; null ends the list
    uint8_t mode;           // transfer mode in bits 0-6; bit 7 keeps the alpha beneath
    bool opaque;            // normal mode at full alpha: nothing behind shows through
    uint16_t scratchIndex;  // position within a depth group, for the resolves that split pixels
    float depth;            // the list is ascending in this key: larger is nearer
};

// Draft: colour only; intersections are not split.
template <class P>
struct SY_FragmentDraftX : SY_FragmentHead<SY_FragmentDraftX<P>> {
    using Pixel = P;
    static constexpr int kGradients = 0;

    float Extent() const { return this->depth; }

    // The layer in front at the pixel's centre (at mid-shutter) comes last in the list.
    static float Key(double center, float, float, float dzdt) {
        return static_cast<float>(center + 0.5 * dzdt);
    }

    P color;
};

// Anti-aliased: the depth plane over the pixel square, depth being its minimum there.
template <class P>
struct SY_FragmentAAX : SY_FragmentHead<SY_FragmentAAX<P>> {
    using Pixel = P;
    static constexpr int kGradients = 2;

    // The largest depth the plane reaches inside the pixel.
    float Extent() const { return this->depth + std::fabs(dzdx) + std::fabs(dzdy); }

    // The plane's minimum over the square, from its value at the centre: the resolve rebuilds
    // the plane from it, and records whose ranges overlap meet in one depth group.
    static float Key(double center, float dzdx, float dzdy, float) {
        return static_cast<float>(center - 0.5 * (std::fabs(dzdx) + std::fabs(dzdy)));
    }

    float dzdx;  // per pixel step in x
    float dzdy;  // per pixel step in y
    P color;
};

// Motion blur: the depth plane and its travel over the shutter interval.
template <class P>
struct SY_FragmentMBX : SY_FragmentHead<SY_FragmentMBX<P>> {
    using Pixel = P;
    static constexpr int kGradients = 3;

    // The largest depth the record reaches inside the pixel during the shutter interval.
    float Extent() const {
        return this->depth + std::fabs(dzdx) + std::fabs(dzdy) + std::fabs(dzdt);
    }

    // The minimum over the square and the shutter: the centre value at shutter open moves by
    // dzdt until it closes.
    static float Key(double center, float dzdx, float dzdy, float dzdt) {
        return static_cast<float>(center - 0.5 * (std::fabs(dzdx) + std::fabs(dzdy)) +
                                  std::min(0.0f, dzdt));
    }

    float dzdx;
    float dzdy;
    float dzdt;  // change of the key from shutter open to close
    P color;
};

// An occluder of a shadow map texel; lists are kept descending in depth (larger is nearer the
// light).
struct SY_ShadowFragment {
    SY_ShadowFragment* next;
    float depth;
    uint16_t red, green, blue;  // transmission left after the occluder, 0..32768
    uint16_t value16;
    float value32;
};

// Records are carved back to back from blocks, so their sizes decide how many fit in one.
static_assert(sizeof(SY_FragmentDraftX<PF_Pixel8>) == 24);
static_assert(sizeof(SY_FragmentDraftX<PF_Pixel16>) == 24);
static_assert(sizeof(SY_FragmentDraftX<PF_PixelFloat>) == 32);
static_assert(sizeof(SY_FragmentAAX<PF_Pixel8>) == 32);
static_assert(sizeof(SY_FragmentMBX<PF_Pixel16>) == 40);
static_assert(sizeof(SY_ShadowFragment) == 24);
