#include "about_box.h"

#include "entry_guard.h"
#include "resources/ormond_strings.h"
#include "u_strings.h"
#include "zel_suite.h"
#include "zel_ui.h"

int32_t ORM_AboutBox(const QNGP_InData* in) {
    return ORM_Guard([&] {
        ORM_ZELSuite zel(in->basic);
        UI_DrawingSupplier* supplier = nullptr;
        UI_Node* parent = nullptr;
        ORM_Check(zel->GetDrawingSupplier(&supplier));
        ORM_Check(zel->GetParentNode(&parent));
        zelui::dialogs::messagebox::ShowNote(
            supplier, U_MBToUTF16String(ORM_String(ORM_StringId::kName)),
            U_MBToUTF16String(ORM_String(ORM_StringId::kAboutText)), parent);
    });
}
