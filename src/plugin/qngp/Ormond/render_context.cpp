#include "render_context.h"

namespace {

QNGP_CompH CompToRender(const QNGP_CanvasSuite10& canvas, QNGP_RenderContextH render) {
    QNGP_CompH comp = nullptr;
    ORM_Check(canvas.GetCompToRender(render, &comp));
    return comp;
}

PF_World* CompDestination(const QNGP_CanvasSuite10& canvas, QNGP_RenderContextH render,
                          QNGP_CompH comp) {
    PF_World* world = nullptr;
    ORM_Check(canvas.GetCompDestination(render, comp, &world));
    return world;
}

}  // namespace

ORM_RenderContext::ORM_RenderContext(const QNGP_InData* in, const ORM_RenderHandles& handles)
    : suites_(in->basic),
      handles_(handles),
      canvas_(&suites_.Get<QNGP_CanvasSuite10>()),
      comp_(CompToRender(*canvas_, handles_.renderContext)),
      destination_(CompDestination(*canvas_, handles_.renderContext, comp_)),
      options_(suites_.Get<QNGP_MemorySuite1>(), handles_.options) {}
