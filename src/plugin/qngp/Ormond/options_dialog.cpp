#include "options_dialog.h"

#include <sstream>
#include <string>
#include <vector>

#include "entry_guard.h"
#include "resources/shadow_map_sizes.h"
#include "u_strings.h"
#include "zel_suite.h"

namespace {

constexpr char kPopup[] = "shadowMapSizePopup";

}  // namespace

Tessary3DOptionsDialog::Tessary3DOptionsDialog(const ORM_InstanceOptions* options,
                                               UI_DrawingSupplier* supplier, UI_Node* parent)
    : UI_Vessa(u"Tessary3DOptions", supplier, parent), options_(options) {}

Tessary3DOptionsDialog::~Tessary3DOptionsDialog() = default;

void Tessary3DOptionsDialog::ViewBuilt() {
    UI_Node& view = *GetView();
    UI_Button& ok = UI_FindNodeAs<UI_Button>(view, "okButton");
    UI_Button& cancel = UI_FindNodeAs<UI_Button>(view, "cancelButton");
    UI_NodeCast<UI_Dialog>(view).SetButtons(&ok, &cancel);
    UI_Popup& popup = UI_FindNodeAs<UI_Popup>(view, kPopup);
    popup.SetItemCheckStyle(true);
    std::vector<std::u16string> items;
    for (const char* label : ORM_ShadowMapSizeLabels)
        items.push_back(U_ZStringToUTF16String(label));
    popup.SetItems(std::move(items));
    // A choice this popup lacks (saved by a later version) renders as "Comp Size"; so it shows.
    int32_t choice = options_->shadowMapSizeChoice;
    popup.SetValue(choice > 0 && choice < kORM_ShadowMapSizeChoices ? choice : 0);
}

int32_t ORM_RunOptionsDialog(const QNGP_InData* in, ORM_InstanceOptions* options,
                             std::string_view script) {
    options->accepted = 0;
    return ORM_Guard([&] {
        std::istringstream text{std::string(script)};
        UI_Node* modal = UI_NodeManager::Get(0).GetModalWindow();
        ORM_ZELSuite zel(in->basic);
        UI_DrawingSupplier* supplier = nullptr;
        UI_Node* parent = nullptr;
        ORM_Check(zel->GetDrawingSupplier(&supplier));
        ORM_Check(zel->GetParentNode(&parent));
        Tessary3DOptionsDialog dialog(options, supplier, modal ? modal : parent);
        dialog.ParseVessaScript(text);
        UI_Node& view = *dialog.GetView();
        bool accepted = UI_NodeCast<UI_Dialog>(view).RunModal() == UI_DialogResult::kOK;
        if (accepted)
            options->shadowMapSizeChoice = UI_FindNodeAs<UI_Popup>(view, kPopup).GetValue();
        options->accepted = accepted ? 1 : 0;
    });
}
