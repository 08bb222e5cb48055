#include "session/frame_session.h"

#include <unistd.h>

#include <stdexcept>

#include "composition/composition_error.h"
#include "composition/render_order.h"
#include "pf_bit_depth.h"

namespace ostrel {
namespace {

std::unique_ptr<PF_World> MakeWorld(int16_t bitDepth, int32_t width, int32_t height) {
    return PF_DispatchBitDepth(bitDepth, [&]<class P>() -> std::unique_ptr<PF_World> {
        return std::make_unique<PF_WorldX<P>>(width, height);
    });
}

// An image that cannot be decoded when its pixels are first wanted is named with its layer's
// place in the composition, as it would have been had it failed when the file was read.
template <class Make>
auto NamingLayer(const Composition& comp, int32_t index, Make&& make) {
    try {
        return make();
    } catch (const CompositionError& error) {
        throw CompositionError(comp.file.string() + ": layers[" + std::to_string(index) +
                               "].source: " + error.what());
    }
}

QNGP_ShortRect RegionOf(const Composition& comp, const RenderSettings& settings) {
    M_LRect r = settings.region.value_or(M_LRect{0, 0, comp.width, comp.height});
    if (r.left < 0 || r.top < 0 || r.right > comp.width || r.bottom > comp.height ||
        r.left >= r.right || r.top >= r.bottom) {
        throw std::invalid_argument("a region of interest that is empty or reaches outside the " +
                                    std::to_string(comp.width) + " × " +
                                    std::to_string(comp.height) + " comp");
    }
    return {static_cast<int16_t>(r.top), static_cast<int16_t>(r.left),
            static_cast<int16_t>(r.bottom), static_cast<int16_t>(r.right)};
}

int32_t CeilDiv(int32_t a, int32_t b) {
    return (a + b - 1) / b;
}

// A frame larger than the machine's memory would be cleared page by page until the system
// ends the program; it is refused before it is made.
void CheckFits(int32_t width, int32_t height, int16_t bitDepth) {
    uint64_t bytes = uint64_t{4} * static_cast<uint64_t>(bitDepth / 8) *
                     static_cast<uint64_t>(width) * static_cast<uint64_t>(height);
    uint64_t memory = static_cast<uint64_t>(sysconf(_SC_PHYS_PAGES)) *
                      static_cast<uint64_t>(sysconf(_SC_PAGE_SIZE));
    if (bytes > memory) {
        throw std::invalid_argument(
            "a frame of " + std::to_string(width) + " × " + std::to_string(height) + " pixels at " +
            std::to_string(bitDepth) + " bits needs " + std::to_string(bytes >> 20) +
            " MB, more than this machine has");
    }
}

}  // namespace

FrameSession::FrameSession(const Composition& comp, ImageCache& images,
                           const RenderSettings& settings, int32_t frame)
    : comp_(comp),
      images_(images),
      settings_(settings),
      bitDepth_(settings.bitDepth ? settings.bitDepth : comp.bitDepth),
      frameTime_(comp.FrameTime(frame)),
      renderTime_(frameTime_) {
    if (settings.downsampleX < 1 || settings.downsampleY < 1) {
        throw std::invalid_argument("a downsample factor below 1");
    }
    region_ = RegionOf(comp, settings);
    layers_.reserve(comp.layers.size());
    for (size_t i = 0; i < comp.layers.size(); ++i)
        layers_.push_back({this, static_cast<int32_t>(i)});
    int32_t width = CeilDiv(region_.right - region_.left, settings.downsampleX);
    int32_t height = CeilDiv(region_.bottom - region_.top, settings.downsampleY);
    CheckFits(width, height, bitDepth_);
    destination_ = MakeWorld(bitDepth_, width, height);
    if (comp.blending.linear) {
        blending_ = std::make_unique<PF_LinearBlendingTables>();
        PF_BuildLinearBlendingTablesGamma(static_cast<float>(comp.blending.gamma), blending_.get());
    }
    BeginPass(0);
}

FrameSession::~FrameSession() = default;

int32_t FrameSession::PassCount() const {
    return settings_.fields == RenderSettings::Fields::kOff ? 1 : 2;
}

void FrameSession::BeginPass(int32_t pass) {
    // Field modes: 1 draws the even rows (the upper field), 2 the odd rows.
    constexpr int32_t kEvenRows = 1, kOddRows = 2;
    renderTime_ = frameTime_;
    fieldMode_ = 0;
    if (settings_.fields != RenderSettings::Fields::kOff) {
        bool upperFirst = settings_.fields == RenderSettings::Fields::kUpperFirst;
        fieldMode_ = (pass == 0) == upperFirst ? kEvenRows : kOddRows;
        if (pass == 1) {
            T_Time step = TimeStep(), half{};
            if (T_DivideTime(&step, 2, &half) != 0 || T_AddTimes(&frameTime_, &half, &renderTime_))
                throw std::overflow_error("the second field's time is out of range");
        }
    }

    std::vector<int32_t> order = RenderOrder(comp_, RenderSeconds());
    contexts_.assign(order.size(), QNGP_LayerContext{});
    size_t mattes = 0;
    for (int32_t index : order) {
        if (LayerAt(index).trackMatte != TrackMatte::kNone) ++mattes;
    }
    // Sized before any pointer into it is taken.
    matteContexts_.assign(mattes, QNGP_LayerContext{});
    size_t matte = 0;
    for (size_t i = 0; i < order.size(); ++i) {
        const Layer& layer = LayerAt(order[i]);
        contexts_[i].layer = LayerHandle(order[i]);
        if (layer.trackMatte == TrackMatte::kNone) continue;
        matteContexts_[matte] = {LayerHandle(layer.matteLayer), nullptr};
        contexts_[i].matte = &matteContexts_[matte++];
    }
}

std::unique_ptr<PF_World> FrameSession::LayerPixels(int32_t layerIndex) {
    return NamingLayer(comp_, layerIndex, [&] {
        return LayerSource(images_, LayerAt(layerIndex), bitDepth_, settings_.downsampleX,
                           settings_.downsampleY);
    });
}

std::unique_ptr<PF_World> FrameSession::OutputPixels(int32_t layerIndex) {
    return SolidPixels(LayerAt(layerIndex).source.solidColor, bitDepth_, destination_->width,
                       destination_->height);
}

std::shared_ptr<PF_World> FrameSession::SharedLayerPixels(int32_t layerIndex) {
    return NamingLayer(comp_, layerIndex, [&] {
        return images_.SharedSource(LayerAt(layerIndex), bitDepth_, settings_.downsampleX,
                                    settings_.downsampleY);
    });
}

PF_World* FrameSession::HandOut(std::shared_ptr<PF_World> world) {
    PF_World* handle = world.get();
    std::lock_guard lock(mutex_);
    handedOut_.emplace(handle, std::move(world));
    return handle;
}

bool FrameSession::TakeBack(PF_World* world) {
    std::shared_ptr<PF_World> last;  // let go outside the lock
    std::lock_guard lock(mutex_);
    auto found = handedOut_.find(world);
    if (found == handedOut_.end()) return false;
    last = std::move(found->second);
    handedOut_.erase(found);
    return true;
}

const PF_LinearBlendingTables* FrameSession::ColorSettings() const {
    return blending_.get();
}

void FrameSession::NoteFailure(const std::string& message) {
    std::lock_guard lock(mutex_);
    if (failure_.empty()) failure_ = message;
}

std::string FrameSession::Failure() const {
    std::lock_guard lock(mutex_);
    return failure_;
}

}  // namespace ostrel
