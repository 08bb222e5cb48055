// ORM_TProgressAbort: the renderer's progress, passed on to the host, whose non-zero answer is
// the user's cancel and ends the frame.
#pragma once

#include "render_context.h"
#include "renderer/scene/fetchers.h"

class ORM_TProgressAbort : public SY_ProgressAbort {
public:
    explicit ORM_TProgressAbort(ORM_RenderContext* context) : context_(context) {}

    void ReportRenderables(int32_t done, int32_t count) override {
        ORM_Check(context_->Canvas().ReportRenderProgress(context_->Render(), done, count));
    }
    void ReportRows(int32_t row, int32_t count) override {
        ORM_Check(context_->Canvas().ReportRowProgress(context_->Render(), row, count));
    }

private:
    ORM_RenderContext* context_;
};
