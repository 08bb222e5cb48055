#include "cli/terminal_dialog.h"

#include <poll.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <iostream>
#include <string>
#include <vector>

#include "host_error.h"
#include "u_strings.h"

namespace ostrel {
namespace {

std::string Text(const UI_Node& node) {
    return U_UTF16ToMBString(node.Name());
}

void CollectPopups(UI_Node& node, std::vector<UI_Popup*>& popups) {
    if (auto* popup = dynamic_cast<UI_Popup*>(&node)) popups.push_back(popup);
    for (const auto& child : node.Children())
        CollectPopups(*child, popups);
}

// The dialog as lines of text: the title, then each node in order; the children of a row share
// a line, except a popup, whose entries follow one a line. `entry` draws an entry of a popup.
template <class Entry>
void Lines(const UI_Node& node, std::vector<std::string>& lines, bool inRow, Entry&& entry) {
    auto add = [&](const std::string& text) {
        if (inRow && !lines.empty() && !lines.back().empty()) {
            lines.back() += "  " + text;
        } else {
            lines.push_back(text);
        }
    };
    if (auto* popup = dynamic_cast<const UI_Popup*>(&node)) {
        for (size_t i = 0; i < popup->Items().size(); ++i)
            lines.push_back(entry(*popup, static_cast<int32_t>(i)));
        lines.emplace_back();  // what follows a list starts a line of its own
    } else if (dynamic_cast<const UI_Button*>(&node)) {
        add(std::string(1, '[').append(Text(node)).append("]"));
    } else if (!node.Children().empty()) {
        bool row = node.GetPlacement() == UI_Node::Placement::kRow;
        if (row && inRow) lines.emplace_back();
        for (const auto& child : node.Children())
            Lines(*child, lines, row, entry);
        if (row) lines.emplace_back();
    } else if (!node.Name().empty()) {
        add(Text(node));
    }
}

template <class Entry>
std::vector<std::string> Draw(const UI_Dialog& dialog, Entry&& entry) {
    std::vector<std::string> lines{Text(dialog), ""};
    for (const auto& child : dialog.Children())
        Lines(*child, lines, false, entry);
    // Blank lines collapse into one and none ends the dialog.
    auto twice = [](const std::string& a, const std::string& b) { return a.empty() && b.empty(); };
    lines.erase(std::unique(lines.begin(), lines.end(), twice), lines.end());
    while (!lines.empty() && lines.back().empty())
        lines.pop_back();
    return lines;
}

// A popup's entries are drawn at least its minimum width, in columns of about 8 points.
std::string Padded(std::string text, const UI_Popup& popup) {
    constexpr int32_t kPointsPerColumn = 8;
    auto columns =
        std::count_if(text.begin(), text.end(), [](char c) { return (c & 0xC0) != 0x80; });
    auto wanted = popup.MinWidth() / kPointsPerColumn;
    if (columns < wanted) text.append(static_cast<size_t>(wanted - columns), ' ');
    return text;
}

std::string Mark(const UI_Popup& popup, int32_t i) {
    bool selected = popup.GetValue() == i;
    return popup.ItemCheckStyle() ? (selected ? "✓ " : "  ") : "";
}

// Standard input switched to reading keys one at a time, without echo, for its lifetime.
class RawKeys {
public:
    RawKeys() {
        ::tcgetattr(STDIN_FILENO, &saved_);
        termios raw = saved_;
        raw.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO | ISIG);
        raw.c_cc[VMIN] = 1;
        raw.c_cc[VTIME] = 0;
        ::tcsetattr(STDIN_FILENO, TCSANOW, &raw);
    }
    ~RawKeys() { ::tcsetattr(STDIN_FILENO, TCSANOW, &saved_); }
    RawKeys(const RawKeys&) = delete;
    RawKeys& operator=(const RawKeys&) = delete;

    enum class Key { kUp, kDown, kNext, kEnter, kCancel, kOther };

    Key Read() const {
        char c = 0;
        if (::read(STDIN_FILENO, &c, 1) != 1) return Key::kCancel;
        if (c == '\r' || c == '\n') return Key::kEnter;
        if (c == '\t') return Key::kNext;
        if (c == 3 || c == 4) return Key::kCancel;  // Ctrl-C, Ctrl-D
        if (c != 27) return Key::kOther;
        // Escape alone is a key; an arrow is Escape, '[' or 'O', then a letter, sent at once.
        char sequence[2] = {};
        if (!Ready() || ::read(STDIN_FILENO, &sequence[0], 1) != 1) return Key::kCancel;
        if (!Ready() || ::read(STDIN_FILENO, &sequence[1], 1) != 1) return Key::kOther;
        if (sequence[1] == 'A') return Key::kUp;
        if (sequence[1] == 'B') return Key::kDown;
        return Key::kOther;
    }

private:
    static bool Ready() {
        pollfd in{STDIN_FILENO, POLLIN, 0};
        return ::poll(&in, 1, 50) == 1;
    }

    termios saved_{};
};

UI_DialogResult Interactive(UI_Dialog& dialog, const std::vector<UI_Popup*>& popups) {
    size_t focus = 0;
    auto entry = [&](const UI_Popup& popup, int32_t i) {
        bool current = !popups.empty() && &popup == popups[focus] && popup.GetValue() == i;
        std::string text =
            Mark(popup, i) + U_UTF16ToMBString(popup.Items()[static_cast<size_t>(i)]);
        return current ? "> \x1b[7m" + Padded(text, popup) + "\x1b[0m" : "  " + text;
    };
    std::cout << "\x1b[?25l";  // no cursor blinking over the list
    size_t drawn = 0;
    auto redraw = [&] {
        if (drawn) std::cout << "\x1b[" << drawn << "A\r\x1b[J";
        std::vector<std::string> lines = Draw(dialog, entry);
        lines.push_back("(↑ ↓ choose, Enter: OK, Escape: Cancel)");
        for (const std::string& line : lines)
            std::cout << line << '\n';
        std::cout << std::flush;
        drawn = lines.size();
    };
    UI_DialogResult result = UI_DialogResult::kCancel;
    {
        RawKeys keys;
        for (bool open = true; open;) {
            redraw();
            UI_Popup* popup = popups.empty() ? nullptr : popups[focus];
            switch (keys.Read()) {
                case RawKeys::Key::kUp:
                    if (popup) popup->SetValue(popup->GetValue() - 1);
                    break;
                case RawKeys::Key::kDown:
                    if (popup) popup->SetValue(popup->GetValue() + 1);
                    break;
                case RawKeys::Key::kNext:
                    if (!popups.empty()) focus = (focus + 1) % popups.size();
                    break;
                case RawKeys::Key::kEnter:
                    result = UI_DialogResult::kOK;
                    open = false;
                    break;
                case RawKeys::Key::kCancel:
                    open = false;
                    break;
                case RawKeys::Key::kOther:
                    break;
            }
        }
    }
    std::cout << "\x1b[?25h" << (result == UI_DialogResult::kOK ? "OK" : "Cancelled") << std::endl;
    return result;
}

UI_DialogResult Numbered(UI_Dialog& dialog, const std::vector<UI_Popup*>& popups) {
    auto entry = [](const UI_Popup& popup, int32_t i) {
        return std::to_string(i + 1) + "  " + Mark(popup, i) +
               U_UTF16ToMBString(popup.Items()[static_cast<size_t>(i)]);
    };
    for (const std::string& line : Draw(dialog, entry))
        std::cout << line << '\n';
    for (UI_Popup* popup : popups) {
        if (popup->Items().empty()) continue;
        int32_t count = static_cast<int32_t>(popup->Items().size());
        std::string current =
            U_UTF16ToMBString(popup->Items()[static_cast<size_t>(popup->GetValue())]);
        for (;;) {
            std::cout << "Choose 1-" << count << ", Enter keeps " << current
                      << ", c cancels: " << std::flush;
            std::string answer;
            bool read = static_cast<bool>(std::getline(std::cin, answer));
            std::cout << answer << '\n';  // the input is not a terminal that shows it
            if (!read || answer == "c") {
                std::cout << "Cancelled" << std::endl;
                return UI_DialogResult::kCancel;
            }
            if (answer.empty()) break;
            bool digits =
                answer.size() < 4 && std::all_of(answer.begin(), answer.end(),
                                                 [](char c) { return c >= '0' && c <= '9'; });
            int32_t picked = digits ? std::stoi(answer) : 0;
            if (picked >= 1 && picked <= count) {
                popup->SetValue(picked - 1);
                break;
            }
            std::cout << QuoteUserText(answer) << " is not a number from 1 to " << count << '\n';
        }
    }
    std::cout << "OK" << std::endl;
    return UI_DialogResult::kOK;
}

}  // namespace

UI_DialogResult PresentDialogOnTerminal(UI_Dialog& dialog) {
    std::vector<UI_Popup*> popups;
    CollectPopups(dialog, popups);
    return ::isatty(STDIN_FILENO) ? Interactive(dialog, popups) : Numbered(dialog, popups);
}

}  // namespace ostrel
