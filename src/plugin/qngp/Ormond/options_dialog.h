// The options dialog: the user picks an instance's shadow map resolution from a popup, in a
// modal dialog of the host's UI framework built from the library's layout script.
#pragma once

#include <cstdint>
#include <string_view>

#include "instance_options.h"
#include "qngp_suites.h"
#include "resources/text_resources.h"
#include "zel_ui.h"

// Reads the options record when its view is built and is read back by the run when the user
// accepts.
class Tessary3DOptionsDialog : public UI_Vessa {
public:
    Tessary3DOptionsDialog(const ORM_InstanceOptions* options, UI_DrawingSupplier* supplier,
                           UI_Node* parent);
    ~Tessary3DOptionsDialog() override;

    // Connects the OK and Cancel buttons and fills the popup, the record's choice selected.
    void ViewBuilt() override;

private:
    const ORM_InstanceOptions* options_;
};

// Shows the dialog built from the script on the locked options record. On OK the popup's entry
// becomes the record's choice; the accepted field says whether the user pressed OK. Returns 0,
// 13 when the host has no UI suite, or the code of the failure, reported to the user.
int32_t ORM_RunOptionsDialog(const QNGP_InData* in, ORM_InstanceOptions* options,
                             std::string_view script = ORM_TextResource(kORM_OptionsDialogScript));
