// The host's UI framework, as far as plug-ins use it: the note box.
#pragma once

#include <string>

namespace zelui::dialogs::messagebox {

// Shows a note with a title and a text (the host's line break is "#{cr}") above the parent
// node, drawn with the supplier's resources; either may be null.
void ShowNote(void* supplier, const std::u16string& title, const std::u16string& text,
              void* parent);

// How the host application presents a note. The default writes the title and the text to
// standard output.
using NotePresenter = void (*)(void* supplier, const std::u16string& title,
                               const std::u16string& text, void* parent);

// Installs the presenter and returns the previous one; null restores the default.
NotePresenter SetNotePresenter(NotePresenter presenter);

}  // namespace zelui::dialogs::messagebox
