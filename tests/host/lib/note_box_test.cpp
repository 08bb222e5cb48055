#include <gtest/gtest.h>

#include <string>

#include "u_strings.h"
#include "zel_ui.h"

namespace {

TEST(NoteBox, DefaultPresenterPrintsTitleThenTextWithLineBreaks) {
    testing::internal::CaptureStdout();
    zelui::dialogs::messagebox::ShowNote(nullptr, u"Ostrel 3D",
                                         u"First line#{cr}Zweite Zeile \u00e4", nullptr);
    EXPECT_EQ(testing::internal::GetCapturedStdout(),
              "Ostrel 3D\nFirst line\nZweite Zeile \xc3\xa4\n");
}

TEST(NoteBox, InstalledPresenterReceivesTheNote) {
    static std::u16string shown;
    auto previous = zelui::dialogs::messagebox::SetNotePresenter(
        [](void*, const std::u16string& title, const std::u16string& text, void*) {
            shown = title + u"|" + text;
        });
    zelui::dialogs::messagebox::ShowNote(nullptr, u"T", u"x", nullptr);
    zelui::dialogs::messagebox::SetNotePresenter(previous);
    EXPECT_EQ(shown, u"T|x");
}

TEST(Strings, ZStringToMBStringGivesTheDefaultText) {
    EXPECT_EQ(U_ZStringToMBString("$$$/QN/Tessary3d/OptionDlg/ShadowMapSize/750=750"), "750");
    EXPECT_EQ(U_ZStringToMBString("a=b=c"), "b=c");
    EXPECT_EQ(U_ZStringToMBString("plain"), "plain");
}

}  // namespace
