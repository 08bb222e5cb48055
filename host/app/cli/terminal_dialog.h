// The stand-in host shows the framework's modal dialogs on the terminal.
#pragma once

#include "zel_ui.h"

namespace ostrel {

// Shows the dialog on standard output and lets the user answer on standard input. On a
// terminal each popup is a list that the arrow keys move through (Tab moves to the next popup),
// Enter is OK and Escape (or Ctrl-C) Cancel. Otherwise each popup's entries are numbered and a
// line is read: a number picks an entry, an empty line keeps it, "c" or the end of the input
// cancels.
UI_DialogResult PresentDialogOnTerminal(UI_Dialog& dialog);

// Installs PresentDialogOnTerminal for its lifetime.
class TerminalDialogs {
public:
    TerminalDialogs() : previous_(UI_SetModalPresenter(&PresentDialogOnTerminal)) {}
    ~TerminalDialogs() { UI_SetModalPresenter(previous_); }
    TerminalDialogs(const TerminalDialogs&) = delete;
    TerminalDialogs& operator=(const TerminalDialogs&) = delete;

private:
    UI_ModalPresenter previous_;
};

}  // namespace ostrel
