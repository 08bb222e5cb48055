// The renderer core's localised strings and the messages it reports to the user.
#pragma once

#include <cstdint>

#include "u_strings.h"

enum class SY_Message : int32_t {
    kName = 0,
    kSubsampleMismatch = 1,
    kMatrixCountMismatch = 2,
    kCameraZeroScale = 3,
    kProjectionMismatch = 4,
    kFragmentArray = 5,
    kFragments = 6,
    kShadowMap = 7,
    kShadowMapVertices = 8,
};

// Error codes thrown after a renderer message.
inline constexpr int32_t kSY_ErrGeometry = 0x4B01;
inline constexpr int32_t kSY_ErrCameraScale = 0x4B02;

// The core's string table, "key=default text" per entry, for the host's string cache.
const U_LStrTable* SY_StringTable();

// Registers and drops the core's cache; both return 0 or the string cache's error code.
int32_t SY_RegisterStrings();
int32_t SY_UnregisterStrings();

// The text of a message: from the registered cache, else the table's default text.
const char* SY_LookupString(SY_Message message);

// Reports "^1: ^2" (the renderer's name and the message) to the user with reportCode, then
// throws errorCode.
[[noreturn]] void SY_ReportAndThrow(SY_Message message, int32_t reportCode, int32_t errorCode);

// Reports the math library's zero-length-vector message and throws its error code.
[[noreturn]] void SY_ThrowZeroLengthVector();
