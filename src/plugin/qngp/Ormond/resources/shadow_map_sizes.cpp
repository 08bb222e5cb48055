#include "resources/shadow_map_sizes.h"

#include <cstdlib>
#include <string>

#include "u_strings.h"

const char* const ORM_ShadowMapSizeLabels[kORM_ShadowMapSizeChoices] = {
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/CompSize=Comp Size",
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/250=250",
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/500=500",
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/750=750",
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/1000=1000",
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/1500=1500",
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/2000=2000",
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/3000=3000",
    "$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/4000=4000",
};

int32_t ORM_ShadowMapSize(int32_t choice) {
    // A project saved by a later version may carry a choice this popup does not have.
    if (choice <= 0 || choice >= kORM_ShadowMapSizeChoices) return 0;
    return std::atoi(U_ZStringToMBString(ORM_ShadowMapSizeLabels[choice]).c_str());
}
