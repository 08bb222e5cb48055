// The error codes the stand-in host's suites answer with, beside kQNGP_ErrMissingSuite.
#pragma once

#include <cstdint>

namespace ostrel {

inline constexpr int32_t kErrBadHandle = 0x13A80020;       // a null or foreign handle
inline constexpr int32_t kErrBadIndex = 0x13A80021;        // an index past the end of a list
inline constexpr int32_t kErrBadArgument = 0x13A80022;     // a null out-pointer or unknown mode
inline constexpr int32_t kErrNoSuchStream = 0x13A80023;    // a stream the layer does not have
inline constexpr int32_t kErrWrongLayerKind = 0x13A80024;  // a camera call on a non-camera, …
inline constexpr int32_t kErrHostFailure = 0x13A80025;     // the host could not deliver (a message
                                                           // says why)
inline constexpr int32_t kErrOutOfMemory = 4;
inline constexpr int32_t kErrUserCancel = 0x13A80026;  // the user interrupted the render

}  // namespace ostrel
