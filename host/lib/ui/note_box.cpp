#include <atomic>
#include <cstdio>
#include <string>
#include <string_view>

#include "zel_ui.h"

namespace zelui::dialogs::messagebox {

namespace {

std::string ToUtf8(const std::u16string& text) {
    std::string out;
    for (size_t i = 0; i < text.size(); ++i) {
        char32_t c = text[i];
        if (c >= 0xD800 && c < 0xDC00 && i + 1 < text.size()) {
            c = 0x10000 + ((c - 0xD800) << 10) + (text[++i] - 0xDC00);
        }
        if (c < 0x80) {
            out.push_back(static_cast<char>(c));
        } else if (c < 0x800) {
            out.push_back(static_cast<char>(0xC0 | (c >> 6)));
            out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
        } else if (c < 0x10000) {
            out.push_back(static_cast<char>(0xE0 | (c >> 12)));
            out.push_back(static_cast<char>(0x80 | ((c >> 6) & 0x3F)));
            out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
        } else {
            out.push_back(static_cast<char>(0xF0 | (c >> 18)));
            out.push_back(static_cast<char>(0x80 | ((c >> 12) & 0x3F)));
            out.push_back(static_cast<char>(0x80 | ((c >> 6) & 0x3F)));
            out.push_back(static_cast<char>(0x80 | (c & 0x3F)));
        }
    }
    return out;
}

// A terminal has no note box: the title, then the text with the host's line breaks as new lines.
void PrintNote(void*, const std::u16string& title, const std::u16string& text, void*) {
    std::string raw = ToUtf8(text);
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
    std::printf("%s\n%s\n", ToUtf8(title).c_str(), body.c_str());
    std::fflush(stdout);
}

std::atomic<NotePresenter> gPresenter{&PrintNote};

}  // namespace

void ShowNote(void* supplier, const std::u16string& title, const std::u16string& text,
              void* parent) {
    gPresenter.load()(supplier, title, text, parent);
}

NotePresenter SetNotePresenter(NotePresenter presenter) {
    return gPresenter.exchange(presenter ? presenter : &PrintNote);
}

}  // namespace zelui::dialogs::messagebox
