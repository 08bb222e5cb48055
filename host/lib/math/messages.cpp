#include "m_matrix.h"
#include "u_report.h"

namespace {

struct MathMessage {
    int32_t error;
    int32_t reportCode;
    const char* text;
};

// The math library's own messages; the zero-length one is entry 38 of its string table.
constexpr MathMessage kMessages[] = {
    {kM_ErrSingularMatrix, 0x110012, "Matrix cannot be inverted."},
    {kM_ErrNotFinite, 0x110013, "Matrix is not finite."},
    {kM_ErrBadArgument, 0x110014, "Bad argument to a math operation."},
    {kM_ErrZeroLengthVector, 0x110034, "Vector has zero length."},
};

}  // namespace

const char* M_ErrorMessage(int32_t error) {
    for (const auto& message : kMessages) {
        if (message.error == error) return message.text;
    }
    return "";
}

void Mp_ReportErr(int32_t error) {
    for (const auto& message : kMessages) {
        if (message.error == error) {
            Up_ReportErrString(message.reportCode, 8, message.text);
            return;
        }
    }
    Up_ReportErrString(error, 8, "Math error.");
}
