// One frame of a composition as the host serves it to an artisan: the render context, the comp,
// its layers and the layer contexts of the render order, the destination world and every
// texture handed out. The suites reach all of it through the handles, which point here.
#pragma once

#include <atomic>
#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "composition/composition.h"
#include "composition/image_cache.h"
#include "m_matrix.h"
#include "pf_world.h"
#include "pf_xfer.h"
#include "qngp_suites.h"
#include "t_time.h"

namespace ostrel {
class FrameSession;
}

// The host objects behind the suites' opaque handles.
struct QNGP_Comp {
    ostrel::FrameSession* session;
};
struct QNGP_Item {
    ostrel::FrameSession* session;
};
struct QNGP_Layer {
    ostrel::FrameSession* session;
    int32_t index;  // in the comp's layer list
};
struct QNGP_LayerContext {
    QNGP_Layer* layer;
    QNGP_LayerContext* matte;  // the context of the layer's track matte, or null
};
struct QNGP_RenderContext {
    ostrel::FrameSession* session;
};

namespace ostrel {

// How a frame is rendered, beyond what the composition says.
struct RenderSettings {
    int16_t bitDepth = 0;  // 8, 16 or 32; 0 keeps the comp's
    int16_t downsampleX = 1;
    int16_t downsampleY = 1;
    // Interlaced output: each frame is two passes half a frame apart, the first drawing the
    // upper (even) or the lower (odd) rows, the second the others.
    enum class Fields { kOff, kUpperFirst, kLowerFirst } fields = Fields::kOff;
    std::optional<M_LRect> region;  // comp pixels, right and bottom exclusive; none: whole comp
};

// Told of the artisan's progress; answering false cancels the frame.
class FrameProgress {
public:
    virtual ~FrameProgress() = default;
    virtual bool Renderables(int32_t done, int32_t count) = 0;
    virtual bool Rows(int32_t row, int32_t count) = 0;
};

class FrameSession {
public:
    // Throws std::invalid_argument for settings the comp cannot take (a region outside it, a
    // downsample below 1, an unknown depth) and std::overflow_error for a frame whose time does
    // not fit the host's time type.
    FrameSession(const Composition& comp, ImageCache& images, const RenderSettings& settings,
                 int32_t frame);
    // Deletes the textures the artisan did not give back.
    ~FrameSession();
    FrameSession(const FrameSession&) = delete;
    FrameSession& operator=(const FrameSession&) = delete;

    // One pass per frame, two with field rendering; each has its own time and field mode.
    int32_t PassCount() const;
    void BeginPass(int32_t pass);

    QNGP_RenderContextH RenderContext() { return &renderContext_; }
    QNGP_CompH CompHandle() { return &compHandle_; }
    QNGP_ItemH ItemHandle() { return &item_; }
    QNGP_LayerH LayerHandle(int32_t index) { return &layers_[static_cast<size_t>(index)]; }
    int32_t LayerCount() const { return static_cast<int32_t>(layers_.size()); }

    const Composition& Comp() const { return comp_; }
    const Layer& LayerAt(int32_t index) const { return comp_.layers[static_cast<size_t>(index)]; }
    PF_World& Destination() { return *destination_; }
    int16_t BitDepth() const { return bitDepth_; }
    int16_t DownsampleX() const { return settings_.downsampleX; }
    int16_t DownsampleY() const { return settings_.downsampleY; }
    // Top, left, bottom, right in comp pixels.
    QNGP_ShortRect Region() const { return region_; }

    const T_Time& RenderTime() const { return renderTime_; }
    double RenderSeconds() const { return T_Seconds(renderTime_); }
    T_Time TimeStep() const { return comp_.FrameDuration(); }
    int32_t FieldMode() const { return fieldMode_; }

    // The layer contexts of the layers to render, in render order.
    int32_t LayerContextCount() const { return static_cast<int32_t>(contexts_.size()); }
    QNGP_LayerContextH LayerContext(int32_t renderIndex) {
        return &contexts_[static_cast<size_t>(renderIndex)];
    }

    // The layer's pixels at the frame's depth and downsample, in a world the caller owns.
    // Throws CompositionError for an image that can no longer be read.
    std::unique_ptr<PF_World> LayerPixels(int32_t layerIndex);
    // An unbounded solid in output coordinates, in a world the caller owns: the destination's
    // size and depth, every pixel the solid's colour, so that output pixel (x, y) reads pixel
    // (x, y) whatever the region and downsample.
    std::unique_ptr<PF_World> OutputPixels(int32_t layerIndex);
    // The layer's pixels as LayerPixels gives them, shared with other frames of the run: for
    // worlds the artisan only reads.
    std::shared_ptr<PF_World> SharedLayerPixels(int32_t layerIndex);
    // Keeps a world handed to the artisan until TakeBack; safe from any thread.
    PF_World* HandOut(std::shared_ptr<PF_World> world);
    // Lets go of a world handed out; false when it is not one of them.
    bool TakeBack(PF_World* world);

    // The frame's colour settings as "PF Color Settings Suite" reports them.
    const PF_LinearBlendingTables* ColorSettings() const;

    void SetProgress(FrameProgress* progress) { progress_ = progress; }
    FrameProgress* Progress() const { return progress_; }

    // A message for the user when a suite call fails for a reason the code alone cannot say
    // (an image that became unreadable); the first one of the frame is kept.
    void NoteFailure(const std::string& message);
    std::string Failure() const;

    // Time spent delivering layer pixels, over all threads, in nanoseconds.
    int64_t PixelDeliveryNanoseconds() const { return pixelNanoseconds_.load(); }
    void AddPixelDeliveryNanoseconds(int64_t ns) { pixelNanoseconds_ += ns; }

private:
    const Composition& comp_;
    ImageCache& images_;
    RenderSettings settings_;
    int16_t bitDepth_;
    T_Time frameTime_;
    T_Time renderTime_;
    int32_t fieldMode_ = 0;
    QNGP_ShortRect region_{};

    QNGP_RenderContext renderContext_{this};
    QNGP_Comp compHandle_{this};
    QNGP_Item item_{this};
    std::vector<QNGP_Layer> layers_;
    std::vector<QNGP_LayerContext> contexts_;       // render order
    std::vector<QNGP_LayerContext> matteContexts_;  // one per context with a matte
    std::unique_ptr<PF_World> destination_;
    // Linear-light blending of the comp, or null: the colour settings the resolve receives.
    std::unique_ptr<PF_LinearBlendingTables> blending_;

    mutable std::mutex mutex_;  // guards what the artisan's threads reach: textures, failure
    std::multimap<PF_World*, std::shared_ptr<PF_World>> handedOut_;
    std::string failure_;
    std::atomic<int64_t> pixelNanoseconds_{0};
    FrameProgress* progress_ = nullptr;
};

}  // namespace ostrel
