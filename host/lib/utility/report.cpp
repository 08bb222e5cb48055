#include "u_report.h"

#include <atomic>
#include <cstdio>
#include <exception>
#include <new>
#include <string>

#include "u_memory.h"

namespace {

void WriteToStandardError(const U_Report& report) {
    switch (report.kind) {
        case U_Report::Kind::kFailedVerification:
            std::fprintf(stderr, "verification failed (line %d): %s\n", report.severity,
                         report.text);
            break;
        default:
            std::fprintf(stderr, "%s\n", report.text);
            break;
    }
}

std::atomic<U_Reporter> gReporter{&WriteToStandardError};

void Report(U_Report::Kind kind, int32_t code, int32_t severity, const char* text) {
    gReporter.load()(U_Report{kind, code, severity, text ? text : ""});
}

}  // namespace

U_Reporter U_SetReporter(U_Reporter reporter) {
    return gReporter.exchange(reporter ? reporter : &WriteToStandardError);
}

void Up_ReportErrString(int32_t code, int32_t severity, const char* text) {
    Report(U_Report::Kind::kErrorString, code, severity, text);
}

void U_ReportFailedVerification(int32_t code, int32_t line, int32_t, const char* message) {
    Report(U_Report::Kind::kFailedVerification, code, line, message);
}

void U_BitDepthVerification::operator()(int32_t) const {
    U_ReportFailedVerification(0, line_, 0, message_);
    throw kU_ErrUnexpectedBitDepth;
}

int32_t U_TranslateAndReportException() {
    try {
        throw;
    } catch (const std::bad_alloc&) {
        Report(U_Report::Kind::kException, kU_ErrOutOfMemory, 8, "Out of memory.");
        return kU_ErrOutOfMemory;
    } catch (const std::exception& e) {
        std::string text = std::string("Internal error: ") + e.what();
        Report(U_Report::Kind::kException, kU_ErrInternal, 8, text.c_str());
    } catch (...) {
        Report(U_Report::Kind::kException, kU_ErrInternal, 8, "Internal error.");
    }
    return kU_ErrInternal;
}
