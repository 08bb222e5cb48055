// The host's UI suite for the about box and the options dialog.
#pragma once

#include "qngp_suites.h"
#include "suite_table.h"
#include "u_report.h"

// Reported, and thrown as 13, when the host has no UI suite to show a note or a dialog with.
inline constexpr char kORM_ZELSuiteMissing[] = "PNG ZEL Suite missing";

// The UI suite, held while a note or a dialog is shown. It is not one of the suite table's: its
// absence is reported with its own message.
class ORM_ZELSuite {
public:
    explicit ORM_ZELSuite(const QNGP_BasicSuite* basic) : basic_(basic) {
        const void* acquired = nullptr;
        if (!basic_ || basic_->AcquireSuite(kQN_ZELSuite, 1, &acquired) != 0 || !acquired) {
            Up_ReportErrString(0, 4, kORM_ZELSuiteMissing);
            throw kORM_ErrSuiteMissing;
        }
        suite_ = static_cast<const QN_ZELSuite1*>(acquired);
    }
    ~ORM_ZELSuite() { basic_->ReleaseSuite(kQN_ZELSuite, 1); }
    ORM_ZELSuite(const ORM_ZELSuite&) = delete;
    ORM_ZELSuite& operator=(const ORM_ZELSuite&) = delete;

    const QN_ZELSuite1* operator->() const { return suite_; }

private:
    const QNGP_BasicSuite* basic_;
    const QN_ZELSuite1* suite_ = nullptr;
};
