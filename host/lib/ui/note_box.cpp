#include <atomic>
#include <cstdio>
#include <string>
#include <string_view>

#include "u_strings.h"
#include "zel_ui.h"

namespace zelui::dialogs::messagebox {

namespace {

// A terminal has no note box: the title, then the text with the host's line breaks as new lines.
void PrintNote(UI_DrawingSupplier*, const std::u16string& title, const std::u16string& text,
               UI_Node*) {
    std::string raw = U_UTF16ToMBString(text);
    const std::string_view kBreak = "#{cr}";
    std::string body;
    for (size_t at = 0; at < raw.size();) {
        if (std::string_view(raw).substr(at, kBreak.size()) == kBreak) {
            body.push_back('\n');
            at += kBreak.size();
        } else {
            body.push_back(raw[at++]);
        }
    }
    std::printf("%s\n%s\n", U_UTF16ToMBString(title).c_str(), body.c_str());
    std::fflush(stdout);
}

std::atomic<NotePresenter> gPresenter{&PrintNote};

}  // namespace

void ShowNote(UI_DrawingSupplier* supplier, const std::u16string& title, const std::u16string& text,
              UI_Node* parent) {
    gPresenter.load()(supplier, title, text, parent);
}

NotePresenter SetNotePresenter(NotePresenter presenter) {
    return gPresenter.exchange(presenter ? presenter : &PrintNote);
}

}  // namespace zelui::dialogs::messagebox
