#include "composition/renderer_options.h"

#include "composition/composition_error.h"

namespace ostrel {
namespace {

// Byte offsets [begin, end) of a value in the text.
struct Span {
    size_t begin = 0;
    size_t end = 0;
};

// Reads the JSON text that the loader accepted: it looks for members by their key and gives
// the places of their values, so that one value can change and every other byte stays.
class Scanner {
public:
    explicit Scanner(std::string_view text) : text_(text) {}

    // The first non-blank offset at or after at.
    size_t SkipBlanks(size_t at) const {
        while (at < text_.size() &&
               (text_[at] == ' ' || text_[at] == '\t' || text_[at] == '\n' || text_[at] == '\r'))
            ++at;
        return at;
    }

    // The value starting at at (not blank); empty at the end of the text.
    Span Value(size_t at) const {
        Span span{at, at};
        if (at >= text_.size()) return span;
        char first = text_[at];
        if (first == '"') {
            span.end = StringEnd(at);
        } else if (first == '{' || first == '[') {
            int depth = 0;
            size_t i = at;
            for (; i < text_.size(); ++i) {
                char c = text_[i];
                if (c == '"') {
                    i = StringEnd(i) - 1;
                } else if (c == '{' || c == '[') {
                    ++depth;
                } else if ((c == '}' || c == ']') && --depth == 0) {
                    break;
                }
            }
            span.end = i + 1;
        } else {
            size_t i = at;
            while (i < text_.size() &&
                   std::string_view(",}] \t\r\n").find(text_[i]) == std::string_view::npos)
                ++i;
            span.end = i;
        }
        return span;
    }

    // The value of the member with the key in the object whose '{' is at objectStart; a key
    // written with escapes is not recognised, which the caller's check of the result catches.
    std::optional<Span> Member(size_t objectStart, std::string_view key) const {
        std::optional<Span> found;
        Members(objectStart, [&](std::string_view name, Span value) {
            if (name == key && !found) found = value;
        });
        return found;
    }

    // The text with a member added after the last one of the object spanning `object`, on a
    // line of its own when the object's first member has one, indented as that member.
    std::string WithMember(Span object, std::string_view member) const {
        size_t first = SkipBlanks(object.begin + 1);
        size_t at = object.begin + 1;
        std::string added;
        if (text_[first] != '}') {
            at = TrailingValueEnd(object);
            added.push_back(',');
            added.append(text_.substr(object.begin + 1, first - object.begin - 1));
        }
        added.append(member);
        return std::string(text_.substr(0, at)).append(added).append(text_.substr(at));
    }

private:
    // The offset after the closing quote of the string starting at at.
    size_t StringEnd(size_t at) const {
        size_t i = at + 1;
        while (i < text_.size() && text_[i] != '"')
            i += text_[i] == '\\' ? 2 : 1;
        return i + 1;
    }

    // Calls visit(key, value) for each member of the object whose '{' is at objectStart.
    template <class Visit>
    void Members(size_t objectStart, Visit&& visit) const {
        size_t at = SkipBlanks(objectStart + 1);
        while (at < text_.size() && text_[at] == '"') {
            size_t keyEnd = StringEnd(at);
            Span value = Value(SkipBlanks(SkipBlanks(keyEnd) + 1));
            visit(text_.substr(at + 1, keyEnd - at - 2), value);
            at = SkipBlanks(value.end);
            if (at < text_.size() && text_[at] == ',') at = SkipBlanks(at + 1);
        }
    }

    // The offset after the last member's value of a non-empty object.
    size_t TrailingValueEnd(Span object) const {
        size_t end = object.begin + 1;
        Members(object.begin, [&](std::string_view, Span value) { end = value.end; });
        return end;
    }

    std::string_view text_;
};

std::string ReadableValue(const std::vector<uint8_t>& flattened) {
    std::optional<int32_t> choice = ShadowMapSizeChoice(flattened);
    if (!choice) throw CompositionError("the renderer's options have no readable form");
    return *choice == 0 ? "\"Comp Size\"" : ShadowMapSizeText(*choice);
}

std::string HexValue(const std::vector<uint8_t>& flattened) {
    static constexpr char kDigits[] = "0123456789abcdef";
    std::string hex = "\"";
    for (uint8_t byte : flattened) {
        hex += kDigits[byte >> 4];
        hex += kDigits[byte & 15];
    }
    return hex + '"';
}

std::string Replaced(std::string_view text, Span span, const std::string& value) {
    return std::string(text.substr(0, span.begin)) + value + std::string(text.substr(span.end));
}

}  // namespace

std::string ShadowMapSizeText(int32_t choice) {
    return choice == 0 ? "Comp Size" : std::to_string(kShadowMapSizes[static_cast<size_t>(choice)]);
}

std::vector<uint8_t> FlattenedRendererOptions(int32_t choice) {
    std::vector<uint8_t> bytes;
    for (uint32_t word : {1u, 0u, static_cast<uint32_t>(choice)}) {
        for (int shift = 24; shift >= 0; shift -= 8)
            bytes.push_back(static_cast<uint8_t>(word >> shift));
    }
    return bytes;
}

std::optional<int32_t> ShadowMapSizeChoice(const std::vector<uint8_t>& flattened) {
    if (flattened.empty()) return 0;
    if (flattened.size() != 12) return std::nullopt;
    auto word = [&](size_t at) {
        return static_cast<int32_t>(uint32_t{flattened[at]} << 24 |
                                    uint32_t{flattened[at + 1]} << 16 |
                                    uint32_t{flattened[at + 2]} << 8 | flattened[at + 3]);
    };
    int32_t choice = word(8);
    if (word(0) != 1 || word(4) != 0 || choice < 0 ||
        choice >= static_cast<int32_t>(kShadowMapSizes.size()))
        return std::nullopt;
    return choice;
}

std::string WithRendererOptions(std::string_view text, const std::vector<uint8_t>& flattened) {
    Scanner scan(text);
    Span root = scan.Value(scan.SkipBlanks(0));
    if (std::optional<Span> hex = scan.Member(root.begin, "rendererOptions")) {
        return Replaced(text, *hex, HexValue(flattened));
    }
    std::string value = ReadableValue(flattened);
    if (std::optional<Span> renderer = scan.Member(root.begin, "renderer")) {
        if (std::optional<Span> size = scan.Member(renderer->begin, "shadowMapSize")) {
            return Replaced(text, *size, value);
        }
        return scan.WithMember(*renderer, "\"shadowMapSize\": " + value);
    }
    return scan.WithMember(root, "\"renderer\": {\"shadowMapSize\": " + value + "}");
}

}  // namespace ostrel
