#include "options_dialog.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "plugin_test_support.h"
#include "u_strings.h"

namespace {

using ormond_test::FakeHost;

constexpr QN_ZELSuite1 kZEL{[](UI_DrawingSupplier** s) { return *s = nullptr, int32_t{0}; },
                            [](UI_Node** n) { return *n = nullptr, int32_t{0}; }};

// What the user does in the dialog, and what the dialog showed.
struct User {
    int32_t pick = -1;  // the popup entry chosen, or -1 to leave it
    UI_DialogResult press = UI_DialogResult::kCancel;
    std::string title, shown;
    bool checkMarks = false;
} gUser;

UI_DialogResult Present(UI_Dialog& dialog) {
    auto& popup = UI_FindNodeAs<UI_Popup>(dialog, "shadowMapSizePopup");
    gUser.title = U_UTF16ToMBString(dialog.Name());
    gUser.shown = U_UTF16ToMBString(popup.Items().at(static_cast<size_t>(popup.GetValue())));
    gUser.checkMarks = popup.ItemCheckStyle() && dialog.OkButton() && dialog.CancelButton();
    if (gUser.pick >= 0) popup.SetValue(gUser.pick);
    return gUser.press;
}

TEST(OptionsDialog, ShowsTheChoiceAndStoresItOnlyOnOK) {
    struct Case {
        const char* name;
        int32_t choice, pick;
        UI_DialogResult press;
        const char* shown;
        int32_t storedChoice, accepted, changed;
    };
    const Case kCases[] = {
        {"cancel keeps 750", 3, 0, UI_DialogResult::kCancel, "750", 3, 0, 0},
        {"OK on Comp Size", 3, 0, UI_DialogResult::kOK, "750", 0, 1, 1},
        {"OK without a change", 8, -1, UI_DialogResult::kOK, "4000", 8, 1, 0},
        {"a saved choice beyond the popup renders as", 12, -1, UI_DialogResult::kOK, "Comp Size", 0,
         1, 1},
    };
    auto previous = UI_SetModalPresenter(&Present);
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        FakeHost host;
        host.Serve(kQN_ZELSuite, 1, &kZEL);
        const QNGP_InData in{host.Basic(), 7};
        gUser = {c.pick, c.press, {}, {}, false};
        const ORM_InstanceOptions record{1, 0, c.choice, 5};
        QNGP_MemHandle options = host.Make(std::vector<uint8_t>(sizeof record));
        std::memcpy(FakeHost::Of(options).bytes.data(), &record, sizeof record);
        int32_t changed = -1;
        EXPECT_EQ(ORM_InstanceDialog(&in, nullptr, nullptr, nullptr, options, &changed), 0);
        ORM_InstanceOptions after;
        std::memcpy(&after, FakeHost::Of(options).bytes.data(), sizeof after);
        EXPECT_EQ(gUser.title, "Ostrel 3D Renderer Options");
        EXPECT_EQ(gUser.shown, c.shown);
        EXPECT_TRUE(gUser.checkMarks);
        EXPECT_EQ(after.shadowMapSizeChoice, c.storedChoice);
        EXPECT_EQ(after.accepted, c.accepted);
        EXPECT_EQ(changed, c.changed);
        EXPECT_EQ(FakeHost::Of(options).locks, 0);
        EXPECT_EQ(host.Held(), 0);
        EXPECT_EQ(UI_NodeManager::Get(0).GetModalWindow(), nullptr);
    }
    UI_SetModalPresenter(previous);
}

TEST(OptionsDialog, FailuresAreReportedAndReturned) {
    const std::string kButtonAsPopup =
        "layout zelvessa_dialog {\n zel_dialog(identifier: 'Tessary3DOptions') {\n"
        "  zel_button(identifier: 'shadowMapSizePopup');\n  zel_ok_cancel_row();\n }\n}\n";
    struct Case {
        const char* name;
        bool served;
        std::string script;
        int32_t result;
        std::string report;
    };
    const Case kCases[] = {
        {"no UI suite", false, "", 13, "PNG ZEL Suite missing (0, 4)"},
        {"popup identifier naming a button", true, kButtonAsPopup, kU_ErrInternal,
         "Internal error: Invalid type conversion. (0x13a80003, 8)"},
        {"malformed script", true, "layout zelvessa_dialog {\r\n zel_popup(;\r\n}", kU_ErrInternal,
         "Internal error: layout script line 2: expected a name (0x13a80003, 8)"},
    };
    for (const Case& c : kCases) {
        SCOPED_TRACE(c.name);
        FakeHost host;
        if (c.served) host.Serve(kQN_ZELSuite, 1, &kZEL);
        const QNGP_InData in{host.Basic(), 7};
        ORM_InstanceOptions record{1, 0, 2, 1};
        EXPECT_EQ(ORM_RunOptionsDialog(&in, &record, c.script), c.result);
        EXPECT_EQ(host.Reports(), std::vector<std::string>{c.report});
        EXPECT_EQ(record.shadowMapSizeChoice, 2);
        EXPECT_EQ(record.accepted, 0);
        EXPECT_EQ(host.Held(), 0);
    }
}

TEST(OptionsDialog, LayoutScriptIsTheStoredResource) {
    std::string_view script = ORM_TextResource("OPTIONS_DIALOG_SCRIPT");
    EXPECT_EQ(script.size(), 415u);
    EXPECT_EQ(script.substr(0, 24), "layout zelvessa_dialog\r\n");
    EXPECT_EQ(script.substr(script.size() - 3), "}\r\n");
}

}  // namespace
