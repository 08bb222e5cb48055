// ORM_RenderContext: what one frame's scene capture and fetchers reach the host through. It
// lives on the render entry's stack for the whole frame.
#pragma once

#include "instance_options.h"
#include "memory_handles.h"
#include "pf_world.h"
#include "qngp_suites.h"
#include "suite_table.h"

// The handles that follow the in-data in the render call.
struct ORM_RenderHandles {
    QNGP_HostHandle first;
    QNGP_HostHandle second;
    QNGP_RenderContextH renderContext;  // passed to every Canvas suite call
    QNGP_HostHandle fourth;
    QNGP_MemHandle options;  // the instance options
    QNGP_HostHandle sixth;
};

class ORM_RenderContext {
public:
    // Acquires the comp to render and its destination world and locks the instance options.
    ORM_RenderContext(const QNGP_InData* in, const ORM_RenderHandles& handles);
    ORM_RenderContext(const ORM_RenderContext&) = delete;
    ORM_RenderContext& operator=(const ORM_RenderContext&) = delete;

    QNGP_RenderContextH Render() const { return handles_.renderContext; }
    // The Canvas suite is acquired with the context, on the render thread, so the fetchers only
    // read a filled slot when the renderer's threads call them.
    const QNGP_CanvasSuite10& Canvas() const { return *canvas_; }
    QNGP_CompH Comp() const { return comp_; }
    PF_World* Destination() const { return destination_; }
    const ORM_InstanceOptions& Options() const { return *options_.As<ORM_InstanceOptions>(); }
    // Unlocks the instance options at the end of a frame; a failure is thrown.
    void UnlockOptions() { options_.Unlock(); }

    ORM_SuiteTable& Suites() { return suites_; }

private:
    ORM_SuiteTable suites_;
    const ORM_RenderHandles handles_;
    const QNGP_CanvasSuite10* canvas_;
    QNGP_CompH comp_;
    PF_World* destination_;
    // Last, so that the options are unlocked before the suites are released.
    ORM_LockedHandle options_;
};
