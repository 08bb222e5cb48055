// The host utility library's error reporting. Everything goes to one reporter that the
// host installs; the default writes to standard error.
#pragma once

#include <cstdint>

// Returned for an exception that is not about memory.
inline constexpr int32_t kU_ErrInternal = 0x13A80003;

// Thrown by the plug-in and the renderer for pixels of a depth other than 8, 16 or 32.
inline constexpr int32_t kU_ErrUnexpectedBitDepth = 3;

// One report as the installed reporter receives it.
struct U_Report {
    enum class Kind { kErrorString, kFailedVerification, kException, kMath };
    Kind kind;
    int32_t code;      // the error code reported with the text
    int32_t severity;  // the host's severity (4 warning, 8 error) or the source line
    const char* text;
};

// Receives every report of the process, from any thread.
using U_Reporter = void (*)(const U_Report& report);

// Installs the reporter and returns the previous one; null restores the default.
U_Reporter U_SetReporter(U_Reporter reporter);

// Reports a message for the user with the error code it explains.
void Up_ReportErrString(int32_t code, int32_t severity, const char* text);
// Reports an internal check that failed, with the source line.
void U_ReportFailedVerification(int32_t code, int32_t line, int32_t reserved, const char* message);

// Reports the exception in flight (call it from a catch block) and returns the error
// code the caller should hand back: 4 for memory, kU_ErrInternal for anything else.
int32_t U_TranslateAndReportException();

// The answer of plug-in and renderer code to an unknown depth in PF_DispatchBitDepth: the
// failed check is reported with message and the caller's line, then kU_ErrUnexpectedBitDepth
// is thrown.
class U_BitDepthVerification {
public:
    // The builtin, unlike std::source_location, is known to every compiler the project uses.
    explicit U_BitDepthVerification(const char* message, int32_t line = __builtin_LINE())
        : message_(message), line_(line) {}
    [[noreturn]] void operator()(int32_t bitDepth) const;

private:
    const char* message_;
    int32_t line_;
};
