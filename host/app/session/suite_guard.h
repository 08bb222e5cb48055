// What every suite operation of a frame shares: handles resolved to the session, and no
// exception crossing into the plug-in, only error codes.
#pragma once

#include <cstdint>
#include <new>
#include <stdexcept>

#include "qngp_suites.h"
#include "session/frame_session.h"
#include "u_memory.h"

namespace ostrel {

inline FrameSession* SessionOf(QNGP_RenderContextH context) {
    return context ? context->session : nullptr;
}
inline FrameSession* SessionOf(QNGP_CompH comp) {
    return comp ? comp->session : nullptr;
}
inline FrameSession* SessionOf(QNGP_ItemH item) {
    return item ? item->session : nullptr;
}
inline FrameSession* SessionOf(QNGP_LayerH layer) {
    return layer ? layer->session : nullptr;
}

// Runs body(session) when the handle resolves, returning its code; an exception becomes a code,
// and its message is kept for the user.
template <class Handle, class Body>
int32_t Serve(Handle handle, Body&& body) noexcept {
    FrameSession* session = SessionOf(handle);
    if (!session) return kQNGP_ErrBadHandle;
    try {
        return body(*session);
    } catch (const std::bad_alloc&) {
        return kU_ErrOutOfMemory;
    } catch (const std::exception& error) {
        session->NoteFailure(error.what());
        return kQNGP_ErrHostFailure;
    }
}

}  // namespace ostrel
