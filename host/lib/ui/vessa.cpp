// The layout script interpreter: a tokenizer and a recursive reader of nodes.
#include <cctype>
#include <iterator>
#include <string>
#include <utility>

#include "u_strings.h"
#include "zel_ui.h"

namespace {

constexpr char kOkName[] = "$$$/zelui/Dialog/OK=OK";
constexpr char kCancelName[] = "$$$/zelui/Dialog/Cancel=Cancel";

struct Token {
    enum class Kind { kName, kString, kIdentifier, kNumber, kPunctuation, kEnd } kind;
    std::string text;
    int line;
};

class Reader {
public:
    explicit Reader(std::string text) : text_(std::move(text)) { Advance(); }

    boost::intrusive_ptr<UI_Node> Script() {
        ExpectName("layout");
        // The one layout this framework draws: a dialog window.
        if (ExpectName() != "zelvessa_dialog") Fail("unknown layout");
        boost::intrusive_ptr<UI_Node> root(new UI_Group);
        Children(*root);
        if (token_.kind != Token::Kind::kEnd) Fail("text after the layout");
        return root;
    }

private:
    [[noreturn]] void Fail(const std::string& problem) const {
        throw zelcore::Error("$$$/zelvessa/Error/Script=layout script line " +
                             std::to_string(token_.line) + ": " + problem);
    }

    void Advance() {
        while (at_ < text_.size() && std::isspace(static_cast<unsigned char>(text_[at_]))) {
            line_ += text_[at_] == '\n';
            ++at_;
        }
        token_ = {Token::Kind::kEnd, {}, line_};
        if (at_ == text_.size()) return;
        char c = text_[at_];
        auto is = [&](auto test) {
            return at_ < text_.size() && test(static_cast<unsigned char>(text_[at_]));
        };
        size_t start = at_;
        if (c == '"' || c == '\'') {
            size_t close = text_.find(c, at_ + 1);
            if (close == std::string::npos || text_.find('\n', at_) < close) {
                Fail("a quotation that does not end on its line");
            }
            token_.kind = c == '"' ? Token::Kind::kString : Token::Kind::kIdentifier;
            token_.text = text_.substr(at_ + 1, close - at_ - 1);
            at_ = close + 1;
        } else if (std::isalpha(static_cast<unsigned char>(c)) || c == '_') {
            while (is([](int ch) { return std::isalnum(ch) || ch == '_'; }))
                ++at_;
            token_.kind = Token::Kind::kName;
        } else if (std::isdigit(static_cast<unsigned char>(c))) {
            while (is([](int ch) { return std::isdigit(ch); }))
                ++at_;
            token_.kind = Token::Kind::kNumber;
        } else if (std::string_view("{}(),:;").find(c) != std::string_view::npos) {
            ++at_;
            token_.kind = Token::Kind::kPunctuation;
        } else {
            Fail(std::string("unexpected character '") + c + "'");
        }
        if (token_.kind != Token::Kind::kString && token_.kind != Token::Kind::kIdentifier) {
            token_.text = text_.substr(start, at_ - start);
        }
    }

    std::string Take(Token::Kind kind, const char* what) {
        if (token_.kind != kind) Fail(std::string("expected ") + what);
        std::string text = std::move(token_.text);
        Advance();
        return text;
    }
    std::string ExpectName() { return Take(Token::Kind::kName, "a name"); }
    void ExpectName(std::string_view name) {
        if (ExpectName() != name) Fail("expected \"" + std::string(name) + "\"");
    }
    bool Punctuation(char c) const {
        return token_.kind == Token::Kind::kPunctuation && token_.text[0] == c;
    }
    void Expect(char c) {
        if (!Punctuation(c)) Fail(std::string("expected '") + c + "'");
        Advance();
    }

    // "{" nodes "}"
    void Children(UI_Node& parent) {
        Expect('{');
        while (!Punctuation('}')) {
            if (token_.kind == Token::Kind::kEnd) Fail("expected '}'");
            parent.AddChild(Node());
        }
        Advance();
    }

    boost::intrusive_ptr<UI_Node> Node() {
        std::string kind = ExpectName();
        boost::intrusive_ptr<UI_Node> node = Make(kind);
        Expect('(');
        while (!Punctuation(')')) {
            Parameter(*node);
            if (!Punctuation(')')) Expect(',');
        }
        Advance();
        if (Punctuation(';')) {
            Advance();
        } else {
            if (kind == "zel_ok_cancel_row") Fail("zel_ok_cancel_row makes its own children");
            Children(*node);
        }
        return node;
    }

    boost::intrusive_ptr<UI_Node> Make(const std::string& kind) {
        if (kind == "zel_dialog") return new UI_Dialog;
        if (kind == "zel_static_text") return new UI_StaticText;
        if (kind == "zel_popup") return new UI_Popup;
        if (kind == "zel_button") return new UI_Button;
        if (kind == "row" || kind == "column") {
            boost::intrusive_ptr<UI_Node> group(new UI_Group);
            group->SetPlacement(kind == "row" ? UI_Node::Placement::kRow
                                              : UI_Node::Placement::kColumn);
            return group;
        }
        if (kind == "zel_ok_cancel_row") {
            boost::intrusive_ptr<UI_Node> row(new UI_Group);
            for (auto [identifier, name] :
                 {std::pair{"okButton", kOkName}, std::pair{"cancelButton", kCancelName}}) {
                boost::intrusive_ptr<UI_Node> button(new UI_Button);
                button->SetIdentifier(identifier);
                button->SetName(U_ZStringToUTF16String(name));
                row->AddChild(std::move(button));
            }
            return row;
        }
        Fail("unknown kind of node \"" + kind + "\"");
    }

    // KEY ":" VALUE
    void Parameter(UI_Node& node) {
        std::string key = ExpectName();
        Expect(':');
        if (key == "name") {
            node.SetName(
                U_ZStringToUTF16String(Take(Token::Kind::kString, "a \"string\"").c_str()));
        } else if (key == "identifier") {
            node.SetIdentifier(Take(Token::Kind::kIdentifier, "an 'identifier'"));
        } else if (key == "placement") {
            std::string placement = ExpectName();
            if (placement != "place_row" && placement != "place_column") {
                Fail("placement is place_row or place_column");
            }
            node.SetPlacement(placement == "place_row" ? UI_Node::Placement::kRow
                                                       : UI_Node::Placement::kColumn);
        } else if (key == "minWidth") {
            std::string digits = Take(Token::Kind::kNumber, "a number");
            if (digits.size() > 5) Fail("minWidth is at most 99999");
            node.SetMinWidth(std::stoi(digits));
        } else {
            Fail("unknown parameter \"" + key + "\"");
        }
    }

    std::string text_;
    size_t at_ = 0;
    int line_ = 1;
    Token token_;
};

}  // namespace

UI_Vessa::UI_Vessa(std::u16string viewName, UI_DrawingSupplier* supplier, UI_Node* parent)
    : viewName_(std::move(viewName)), supplier_(supplier), parent_(parent) {}

UI_Vessa::~UI_Vessa() = default;

void UI_Vessa::ParseVessaScript(std::istream& script) {
    std::string text(std::istreambuf_iterator<char>(script), {});
    boost::intrusive_ptr<UI_Node> root = Reader(std::move(text)).Script();
    std::string name = U_UTF16ToMBString(viewName_);
    UI_Node* view = root->FindNode(name);
    if (!view) {
        throw zelcore::Error("$$$/zelvessa/Error/NoView=the layout script has no view '" + name +
                             "'");
    }
    view_ = view;
    ViewBuilt();
}
