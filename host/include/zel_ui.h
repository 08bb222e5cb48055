// The host's UI framework, as far as plug-ins use it: the note box, and modal dialogs built from
// a layout script (nodes, popups, buttons, the node manager and the script interpreter).
#pragma once

#include <boost/intrusive_ptr.hpp>
#include <cstdint>
#include <istream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

// The host's drawing resources (fonts, colours) for a dialog; opaque to plug-ins.
struct UI_DrawingSupplier;

class UI_Node;
class UI_Dialog;

namespace zelcore {

// A failure of the framework, carrying its localised "key=default text" string; what() is the
// text.
class Error : public std::runtime_error {
public:
    // Takes a "key=default text" string.
    explicit Error(const std::string& zstring);
    // The key part of the string.
    const std::string& Key() const { return key_; }

private:
    std::string key_;
};

// A node asked for as a kind of control that it is not.
inline constexpr char kInvalidTypeConversion[] =
    "$$$/zelcore/utility/Error/InvalidTypeConversion=Invalid type conversion.";
// A node asked for by an identifier that no node of the view carries.
inline constexpr char kNodeNotFound[] = "$$$/zelcore/utility/Error/NodeNotFound=No such node.";

}  // namespace zelcore

namespace zelui::dialogs::messagebox {

// Shows a note with a title and a text (the host's line break is "#{cr}") above the parent
// node, drawn with the supplier's resources; either may be null.
void ShowNote(UI_DrawingSupplier* supplier, const std::u16string& title, const std::u16string& text,
              UI_Node* parent);

// How the host application presents a note. The default writes the title and the text to
// standard output.
using NotePresenter = void (*)(UI_DrawingSupplier* supplier, const std::u16string& title,
                               const std::u16string& text, UI_Node* parent);

// Installs the presenter and returns the previous one; null restores the default.
NotePresenter SetNotePresenter(NotePresenter presenter);

}  // namespace zelui::dialogs::messagebox

// A node of a view: a control or a container of nodes, counted by intrusive pointers.
class UI_Node {
public:
    // Placement of a container's children.
    enum class Placement { kRow, kColumn };

    virtual ~UI_Node();
    UI_Node(const UI_Node&) = delete;
    UI_Node& operator=(const UI_Node&) = delete;

    // The identifier a script gives the node ("" when none).
    const std::string& Identifier() const { return identifier_; }
    void SetIdentifier(std::string identifier) { identifier_ = std::move(identifier); }
    // The text shown for the node: a dialog's title, a static text's or a button's label.
    const std::u16string& Name() const { return name_; }
    void SetName(std::u16string name) { name_ = std::move(name); }
    // How a container places its children: side by side (the default) or one below another.
    Placement GetPlacement() const { return placement_; }
    void SetPlacement(Placement placement) { placement_ = placement; }
    // The narrowest the node is drawn, in points; 0 when the content decides.
    int32_t MinWidth() const { return minWidth_; }
    void SetMinWidth(int32_t points) { minWidth_ = points; }

    // The nodes inside this one, in the order they are drawn; each is held by its parent.
    const std::vector<boost::intrusive_ptr<UI_Node>>& Children() const { return children_; }
    void AddChild(boost::intrusive_ptr<UI_Node> child) { children_.push_back(std::move(child)); }
    // The first node in depth-first order, this one included, with the identifier; null if none.
    UI_Node* FindNode(std::string_view identifier);

    // Counting for boost::intrusive_ptr; a node goes with its last pointer. Nodes live on the
    // UI thread, so the count is a plain integer.
    friend void intrusive_ptr_add_ref(UI_Node* node) { ++node->references_; }
    friend void intrusive_ptr_release(UI_Node* node) {
        if (--node->references_ == 0) delete node;
    }

protected:
    UI_Node() = default;

private:
    std::string identifier_;
    std::u16string name_;
    Placement placement_ = Placement::kRow;
    int32_t minWidth_ = 0;
    std::vector<boost::intrusive_ptr<UI_Node>> children_;
    int32_t references_ = 0;
};

// A node as the kind of control T; throws zelcore::Error (kInvalidTypeConversion) when it is
// another kind.
template <class T>
T& UI_NodeCast(UI_Node& node) {
    T* typed = dynamic_cast<T*>(&node);
    if (!typed) throw zelcore::Error(zelcore::kInvalidTypeConversion);
    return *typed;
}

// The node of the view with the identifier, as the kind T; throws zelcore::Error when there is
// none (kNodeNotFound) or it is another kind.
template <class T>
T& UI_FindNodeAs(UI_Node& view, std::string_view identifier) {
    UI_Node* found = view.FindNode(identifier);
    if (!found) throw zelcore::Error(zelcore::kNodeNotFound);
    return UI_NodeCast<T>(*found);
}

// A container that only places its children.
class UI_Group : public UI_Node {};

// A line of text.
class UI_StaticText : public UI_Node {};

// A push button; its name is its label.
class UI_Button : public UI_Node {};

// A list of entries of which one is selected.
class UI_Popup : public UI_Node {
public:
    // Entries shown with a check mark beside the selected one, rather than only it shown.
    void SetItemCheckStyle(bool checkMarks) { checkMarks_ = checkMarks; }
    bool ItemCheckStyle() const { return checkMarks_; }
    // Replaces the entries; the selection moves to the first.
    void SetItems(std::vector<std::u16string> items);
    const std::vector<std::u16string>& Items() const { return items_; }
    // The index of the selected entry.
    int32_t GetValue() const { return value_; }
    // Selects an entry; an index outside the entries is clamped into them.
    void SetValue(int32_t index);

private:
    std::vector<std::u16string> items_;
    int32_t value_ = 0;
    bool checkMarks_ = false;
};

// How a modal dialog was closed.
enum class UI_DialogResult : int32_t { kCancel = 0, kOK = 1 };

// A dialog window: its name is its title; two of its buttons close it.
class UI_Dialog : public UI_Node {
public:
    // The buttons that close the dialog with OK and with Cancel.
    void SetButtons(UI_Button* ok, UI_Button* cancel);
    UI_Button* OkButton() const { return ok_; }
    UI_Button* CancelButton() const { return cancel_; }

    // Shows the dialog through the application's presenter and returns how the user closed it.
    // While it runs, the node manager's modal window is this dialog.
    UI_DialogResult RunModal();

private:
    UI_Button* ok_ = nullptr;
    UI_Button* cancel_ = nullptr;
};

// How the host application shows a modal dialog to the user: it may change the dialog's
// controls and returns how the user closed it. The default closes it with Cancel, as there is
// no one to ask.
using UI_ModalPresenter = UI_DialogResult (*)(UI_Dialog& dialog);

// Installs the presenter and returns the previous one; null restores the default.
UI_ModalPresenter UI_SetModalPresenter(UI_ModalPresenter presenter);

// The framework's record of its windows.
class UI_NodeManager {
public:
    // The manager of a screen; the host has one, index 0, whatever the index asked for.
    static UI_NodeManager& Get(int32_t screen);
    // The dialog being shown modally, or null.
    UI_Node* GetModalWindow() const { return modal_; }

private:
    friend class UI_Dialog;
    UI_Node* modal_ = nullptr;
};

// A layout script interpreter and the view it builds. Scripts are text: "layout NAME { ... }",
// where each node is written KIND(KEY: VALUE, ...) followed by ";" or by "{ children }". Values
// are "zstrings", 'identifiers', numbers and names. The view is the node whose identifier is the
// interpreter's view name.
class UI_Vessa {
public:
    // The view name says which view of a script this interpreter builds; the drawing supplier
    // and the parent node are the host's.
    UI_Vessa(std::u16string viewName, UI_DrawingSupplier* supplier, UI_Node* parent);
    virtual ~UI_Vessa();
    UI_Vessa(const UI_Vessa&) = delete;
    UI_Vessa& operator=(const UI_Vessa&) = delete;

    // Called once the script's view is built, to connect and fill its controls.
    virtual void ViewBuilt() {}

    // Builds the view from the script and calls ViewBuilt. Throws zelcore::Error with the line
    // and the problem when the script is malformed or names a kind of node the framework lacks.
    void ParseVessaScript(std::istream& script);
    // The built view; null before a script is parsed.
    UI_Node* GetView() const { return view_.get(); }

    const std::u16string& ViewName() const { return viewName_; }
    UI_DrawingSupplier* Supplier() const { return supplier_; }
    UI_Node* Parent() const { return parent_; }

private:
    std::u16string viewName_;
    UI_DrawingSupplier* supplier_;
    UI_Node* parent_;
    boost::intrusive_ptr<UI_Node> view_;
};
