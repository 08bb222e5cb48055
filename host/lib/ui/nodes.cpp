#include <algorithm>
#include <atomic>
#include <utility>

#include "u_strings.h"
#include "zel_ui.h"

namespace zelcore {

Error::Error(const std::string& zstring)
    : std::runtime_error(U_ZStringToMBString(zstring.c_str())),
      key_(zstring.substr(0, zstring.find('='))) {}

}  // namespace zelcore

UI_Node::~UI_Node() = default;

UI_Node* UI_Node::FindNode(std::string_view identifier) {
    if (identifier_ == identifier) return this;
    for (const auto& child : children_) {
        if (UI_Node* found = child->FindNode(identifier)) return found;
    }
    return nullptr;
}

void UI_Popup::SetItems(std::vector<std::u16string> items) {
    items_ = std::move(items);
    value_ = 0;
}

void UI_Popup::SetValue(int32_t index) {
    value_ = std::clamp(index, 0, std::max(0, static_cast<int32_t>(items_.size()) - 1));
}

void UI_Dialog::SetButtons(UI_Button* ok, UI_Button* cancel) {
    ok_ = ok;
    cancel_ = cancel;
}

namespace {

UI_DialogResult CancelUnasked(UI_Dialog&) {
    return UI_DialogResult::kCancel;
}

std::atomic<UI_ModalPresenter> gModalPresenter{&CancelUnasked};

}  // namespace

UI_ModalPresenter UI_SetModalPresenter(UI_ModalPresenter presenter) {
    return gModalPresenter.exchange(presenter ? presenter : &CancelUnasked);
}

UI_DialogResult UI_Dialog::RunModal() {
    // A dialog opened from this one while it runs is placed above it.
    UI_NodeManager& manager = UI_NodeManager::Get(0);
    UI_Node* below = std::exchange(manager.modal_, this);
    struct Restore {
        UI_NodeManager& manager;
        UI_Node* below;
        ~Restore() { manager.modal_ = below; }
    } restore{manager, below};
    return gModalPresenter.load()(*this);
}

UI_NodeManager& UI_NodeManager::Get(int32_t) {
    static UI_NodeManager manager;
    return manager;
}
