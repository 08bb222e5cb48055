// ORM_TTrackMatteFetcher: a layer's track matte, rendered by the host once when first asked for
// and turned into an alpha matte, then served until released.
#pragma once

#include <memory>

#include "matte_conversion.h"
#include "render_context.h"
#include "renderer/scene/fetchers.h"
#include "u_memory.h"

// Turns the rendered matte layer into the alpha matte of its type, in place. A world of a depth
// other than 8, 16 or 32 is reported and throws kU_ErrUnexpectedBitDepth.
void ORM_ConvertMatteWorld(const PF_World& world, ORM_MatteType type);

class ORM_TTrackMatteFetcher : public SY_TImageFetcher, public U_MemTrackedObject {
public:
    // layerContext is the matted layer's own; the matte's context is asked for at each fetch.
    ORM_TTrackMatteFetcher(ORM_RenderContext* context, QNGP_LayerH layer,
                           QNGP_LayerContextH layerContext, ORM_MatteType type)
        : context_(context), layer_(layer), layerContext_(layerContext), type_(type) {}

    PF_World* Fetch() override;
    void Release() override { matte_.reset(); }
    // A missing plain matte hides the layer; a missing inverted one shows it.
    bool OutsideIsClear() const override {
        return type_ == ORM_MatteType::kAlpha || type_ == ORM_MatteType::kLuma;
    }

private:
    ORM_RenderContext* context_;
    // Part of the record though fetching needs only the layer context, which finds the matte.
    [[maybe_unused]] QNGP_LayerH layer_;
    QNGP_LayerContextH layerContext_;
    ORM_MatteType type_;
    std::unique_ptr<PF_World> matte_;  // the host's world, ours to delete
};
