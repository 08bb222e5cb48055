#include "about_box.h"

#include "entry_guard.h"
#include "resources/ormond_strings.h"
#include "suite_table.h"
#include "u_report.h"
#include "u_strings.h"
#include "zel_ui.h"

namespace {

// The UI suite, held for the note's lifetime. It is not one of the suite table's: its absence is
// reported with its own message.
class ZELSuite {
public:
    explicit ZELSuite(const QNGP_BasicSuite* basic) : basic_(basic) {
        const void* acquired = nullptr;
        if (!basic_ || basic_->AcquireSuite(kQN_ZELSuite, 1, &acquired) != 0 || !acquired) {
            Up_ReportErrString(0, 4, kORM_ZELSuiteMissing);
            throw kORM_ErrSuiteMissing;
        }
        suite_ = static_cast<const QN_ZELSuite1*>(acquired);
    }
    ~ZELSuite() { basic_->ReleaseSuite(kQN_ZELSuite, 1); }
    ZELSuite(const ZELSuite&) = delete;
    ZELSuite& operator=(const ZELSuite&) = delete;

    const QN_ZELSuite1* operator->() const { return suite_; }

private:
    const QNGP_BasicSuite* basic_;
    const QN_ZELSuite1* suite_ = nullptr;
};

}  // namespace

int32_t ORM_AboutBox(const QNGP_InData* in) {
    return ORM_Guard([&] {
        ZELSuite zel(in->basic);
        void* supplier = nullptr;
        void* parent = nullptr;
        ORM_Check(zel->GetDrawingSupplier(&supplier));
        ORM_Check(zel->GetParentNode(&parent));
        zelui::dialogs::messagebox::ShowNote(
            supplier, U_MBToUTF16String(ORM_String(ORM_StringId::kName)),
            U_MBToUTF16String(ORM_String(ORM_StringId::kAboutText)), parent);
    });
}
