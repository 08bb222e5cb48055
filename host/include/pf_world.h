// Worlds: the host's pixel rectangles. Destination, textures and mattes are all worlds.
#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>

#include "pf_pixel.h"
#include "u_memory.h"

// Anything that holds pixels of one of the three depths and can say which.
class PF_PixelContainerBase {
public:
    virtual ~PF_PixelContainerBase() = default;
    virtual int16_t GetBitDepth() const = 0;
};

// Base of the renderer's buffers that come in three depths; A, B and C are the 8-bit,
// 16-bit and float variants, named so that a reader of the class sees the family.
template <class A, class B, class C>
class PF_PixelContainer : public PF_PixelContainerBase, public U_MemTrackedObject {};

class PF_AreaTable;

// The sampling tables the pixel library builds for a world on first use (area sampling's
// summed-area table). They describe the world they sit in: a copy or an assigned world starts
// without them, and they are freed with the world.
class PF_WorldSamplingTables {
public:
    PF_WorldSamplingTables() = default;
    PF_WorldSamplingTables(const PF_WorldSamplingTables&) noexcept {}
    PF_WorldSamplingTables& operator=(const PF_WorldSamplingTables&) noexcept {
        Drop();
        return *this;
    }
    ~PF_WorldSamplingTables() { Drop(); }

    // Frees the tables. Call it when the world's pixels change, while no sampler reads it.
    void Drop() noexcept {
        if (area.load(std::memory_order_relaxed)) Free();
    }

    std::atomic<const PF_AreaTable*> area{nullptr};

private:
    void Free() noexcept;
};

// A view of pixels owned elsewhere (or by PF_WorldX below): width × height pixels, rows
// rowBytes apart, of the depth bitDepth (8, 16 or 32).
class PF_World : public PF_PixelContainerBase {
public:
    PF_World() = default;
    PF_World(int32_t w, int32_t h, int32_t rb, int16_t depth, void* pixels)
        : width(w), height(h), rowBytes(rb), bitDepth(depth), data(pixels) {}

    int16_t GetBitDepth() const override { return bitDepth; }

    template <class P>
    P* Row(int32_t y) const {
        return reinterpret_cast<P*>(static_cast<char*>(data) +
                                    static_cast<ptrdiff_t>(y) * rowBytes);
    }
    template <class P>
    P* PixelAt(int32_t x, int32_t y) const {
        return Row<P>(y) + x;
    }

    int32_t width = 0;
    int32_t height = 0;
    int32_t rowBytes = 0;
    int16_t bitDepth = 0;
    void* data = nullptr;
    mutable PF_WorldSamplingTables samplingTables;
};

// A world that owns its pixels: allocated through the host's accounted allocator and
// cleared to transparent black. Throws std::bad_alloc when the memory cannot be had.
template <class P>
class PF_WorldX : public PF_World, public U_MemTrackedObject {
public:
    PF_WorldX(int32_t w, int32_t h);
    ~PF_WorldX() override;
    PF_WorldX(const PF_WorldX&) = delete;
    PF_WorldX& operator=(const PF_WorldX&) = delete;

    P* Row(int32_t y) const { return PF_World::Row<P>(y); }
    P& At(int32_t x, int32_t y) const { return *PF_World::PixelAt<P>(x, y); }
};

extern template class PF_WorldX<PF_Pixel8>;
extern template class PF_WorldX<PF_Pixel16>;
extern template class PF_WorldX<PF_PixelFloat>;
