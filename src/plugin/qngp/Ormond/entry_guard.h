// The guard of every entry point the host calls: a thrown error code becomes the call's result,
// any other exception is reported to the user through the host and its code returned.
#pragma once

#include <cstdint>

#include "u_report.h"

template <class Body>
int32_t ORM_Guard(Body&& body) noexcept {
    try {
        body();
        return 0;
    } catch (int32_t error) {
        return error;
    } catch (...) {
        return U_TranslateAndReportException();
    }
}
