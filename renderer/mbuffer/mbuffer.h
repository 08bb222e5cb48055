// Fragment buffers: the per-pixel fragment lists a group of layers that overlap in depth is
// drawn into, then resolved into the output world.
//
// Per group the frame driver makes a buffer with SY_MBuffer::New for the group's rectangle
// (clipped to the output world), hands the SY_MBuffer pointer itself to the spans as the
// target object of kind 2, draws every member, calls Resolve once and lets the owner go (also
// when a member's drawing throws).
//
// A span routine (and a span from an image) asks the target's IsAntialiased, HasMotionBlur and
// GetBitDepth once per span, casts the SY_MBuffer pointer to the concrete class with
// static_cast (SY_MBufferDraftX<P>, SY_MBufferAAX<P> or SY_MBufferMBX<P> for a draft,
// anti-aliased or motion-blur buffer of P's depth), takes the head of its first pixel with
// HeadAt(x, y), and calls AddFragment for every covered pixel with consecutive heads along the
// row and the worker's thread index as pool index. The key is the record class's Key of W at
// the pixel centre; anti-aliased records also take W's steps per pixel, motion-blur records its
// travel over the shutter as well. The resolve puts each list in depth order before it walks it.
#pragma once

#include <cstdint>
#include <memory>

#include "m_matrix.h"
#include "pf_pixel.h"
#include "pf_world.h"
#include "pf_xfer.h"
#include "renderer/mbuffer/fragment_array.h"
#include "renderer/mbuffer/records.h"
#include "renderer/scene/fetchers.h"

class SY_MBuffer {
public:
    // A buffer for the pixels of bounds, of the depth bitDepth (8, 16 or 32) and the class the
    // flags ask for; motion blur wins over anti-aliasing. Throws 4 when memory runs out, with
    // nothing left allocated; any other depth is reported and throws 3. Never gives null.
    static std::unique_ptr<SY_MBuffer> New(const M_LRect& bounds, int16_t bitDepth, bool antialias,
                                           bool motionBlur);

    virtual ~SY_MBuffer() = default;
    virtual bool IsAntialiased() const = 0;
    virtual bool HasMotionBlur() const = 0;
    // Composites every pixel's list onto pixel (x, y) of destination, a world of the buffer's
    // depth, farthest record first. Reports rows to progress when it is not null. blendTables
    // (null: none) are the frame's colour settings, for the classes that mix in linear light.
    virtual void Resolve(SY_ProgressAbort* progress, const PF_LinearBlendingTables* blendTables,
                         PF_World& destination) = 0;
    // 8, 16 or 32: the pixel type the concrete class works in.
    virtual int16_t GetBitDepth() const = 0;
};

enum class SY_MBufferQuality : uint8_t { kDraft, kAntialiased, kMotionBlur };

// The class New chooses for the flags of a request.
SY_MBufferQuality SY_MBufferQualityFor(bool antialias, bool motionBlur);

template <class P>
class SY_MBufferDraftX;

// Draft buffers blend each list in order, farthest first, without splitting intersections.
class SY_MBufferDraft
    : public SY_MBuffer,
      public PF_PixelContainer<SY_MBufferDraftX<PF_Pixel8>, SY_MBufferDraftX<PF_Pixel16>,
                               SY_MBufferDraftX<PF_PixelFloat>> {
public:
    bool IsAntialiased() const final { return false; }
    bool HasMotionBlur() const final { return false; }
};

template <class P>
class SY_MBufferDraftX final : public SY_MBufferDraft,
                               public SY_FragmentArray<SY_FragmentDraftX<P>> {
public:
    using Record = SY_FragmentDraftX<P>;

    // Throws 4 when memory runs out.
    explicit SY_MBufferDraftX(const M_LRect& rect) : SY_FragmentArray<Record>(rect) {}

    // Blends with the host's transfer functions and no blending tables, whatever is passed.
    void Resolve(SY_ProgressAbort* progress, const PF_LinearBlendingTables* blendTables,
                 PF_World& destination) override;
    int16_t GetBitDepth() const override { return PF_PixelTraits<P>::kBitDepth; }
};

extern template class SY_MBufferDraftX<PF_Pixel8>;
extern template class SY_MBufferDraftX<PF_Pixel16>;
extern template class SY_MBufferDraftX<PF_PixelFloat>;

template <class P>
class SY_MBufferAAX;

// Anti-aliased buffers keep each fragment's depth plane over the pixel, so that layers passing
// through each other inside a pixel share it by the area each is in front in. Edge coverage is
// already in the fragments' alpha.
class SY_MBufferAA : public SY_MBuffer,
                     public PF_PixelContainer<SY_MBufferAAX<PF_Pixel8>, SY_MBufferAAX<PF_Pixel16>,
                                              SY_MBufferAAX<PF_PixelFloat>> {
public:
    bool IsAntialiased() const final { return true; }
    bool HasMotionBlur() const final { return false; }
};

template <class P>
class SY_MBufferAAX final : public SY_MBufferAA, public SY_FragmentArray<SY_FragmentAAX<P>> {
public:
    using Record = SY_FragmentAAX<P>;

    // Throws 4 when memory runs out.
    explicit SY_MBufferAAX(const M_LRect& rect) : SY_FragmentArray<Record>(rect) {}

    // Records whose depth ranges overlap are split inside the pixel where their planes cross;
    // every blend passes blendTables, so the group blends in the same light as layers drawn
    // straight. Throws 4 when the memory for splitting a pixel is not there.
    void Resolve(SY_ProgressAbort* progress, const PF_LinearBlendingTables* blendTables,
                 PF_World& destination) override;
    int16_t GetBitDepth() const override { return PF_PixelTraits<P>::kBitDepth; }
};

extern template class SY_MBufferAAX<PF_Pixel8>;
extern template class SY_MBufferAAX<PF_Pixel16>;
extern template class SY_MBufferAAX<PF_PixelFloat>;

template <class P>
class SY_MBufferMBX;

// Motion-blur buffers keep each fragment's depth plane and its travel over the shutter, so that
// layers that pass through each other during the shutter share the pixel by the part of the
// pixel and of the shutter each is in front in. Colour and coverage blurred over the shutter
// are already in the fragments; this buffer blurs the depth order.
class SY_MBufferMB : public SY_MBuffer,
                     public PF_PixelContainer<SY_MBufferMBX<PF_Pixel8>, SY_MBufferMBX<PF_Pixel16>,
                                              SY_MBufferMBX<PF_PixelFloat>> {
public:
    bool IsAntialiased() const final { return true; }
    bool HasMotionBlur() const final { return true; }
};

template <class P>
class SY_MBufferMBX final : public SY_MBufferMB, public SY_FragmentArray<SY_FragmentMBX<P>> {
public:
    using Record = SY_FragmentMBX<P>;

    // Throws 4 when memory runs out.
    explicit SY_MBufferMBX(const M_LRect& rect) : SY_FragmentArray<Record>(rect) {}

    // Records whose depth ranges overlap are split where they cross inside the pixel and the
    // shutter; runs of three or more that change order during the shutter are composited at
    // enough instants to follow every change. Blends pass blendTables. Throws 4 when the memory
    // for splitting a pixel is not there.
    void Resolve(SY_ProgressAbort* progress, const PF_LinearBlendingTables* blendTables,
                 PF_World& destination) override;
    int16_t GetBitDepth() const override { return PF_PixelTraits<P>::kBitDepth; }
};

extern template class SY_MBufferMBX<PF_Pixel8>;
extern template class SY_MBufferMBX<PF_Pixel16>;
extern template class SY_MBufferMBX<PF_PixelFloat>;
