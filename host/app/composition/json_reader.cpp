#include "composition/json_reader.h"

#include <algorithm>
#include <cmath>
#include <sstream>
#include <vector>

#include "composition/composition_error.h"

namespace ostrel {
namespace {

const Json kEmptyObject = Json::object();

std::string Describe(const Json& j) {
    switch (j.type()) {
        case Json::value_t::object:
            return "an object";
        case Json::value_t::array:
            return "an array";
        case Json::value_t::string:
            return "a string";
        case Json::value_t::boolean:
            return "true or false";
        case Json::value_t::null:
            return "null";
        default:
            return "a number";
    }
}

std::string Format(double v) {
    std::ostringstream out;
    out.precision(10);
    out << v;
    return out.str();
}

std::string RangeText(Range r) {
    bool hasMin = r.min > -std::numeric_limits<double>::max();
    bool hasMax = r.max < std::numeric_limits<double>::max();
    if (hasMin && hasMax && !r.minExclusive)
        return "between " + Format(r.min) + " and " + Format(r.max);
    std::string low = r.minExclusive ? "above " + Format(r.min) : "at least " + Format(r.min);
    if (hasMin && hasMax) return low + " and at most " + Format(r.max);
    return hasMin ? low : "at most " + Format(r.max);
}

// Edit distance, to suggest the key a misspelt one was meant to be.
size_t Distance(std::string_view a, std::string_view b) {
    std::vector<size_t> row(b.size() + 1);
    for (size_t j = 0; j <= b.size(); ++j)
        row[j] = j;
    for (size_t i = 1; i <= a.size(); ++i) {
        size_t diagonal = row[0];
        row[0] = i;
        for (size_t j = 1; j <= b.size(); ++j) {
            size_t up = row[j];
            row[j] =
                std::min({row[j] + 1, row[j - 1] + 1, diagonal + (a[i - 1] == b[j - 1] ? 0 : 1)});
            diagonal = up;
        }
    }
    return row[b.size()];
}

int HexDigit(char ch) {
    if (ch >= '0' && ch <= '9') return ch - '0';
    if (ch >= 'a' && ch <= 'f') return ch - 'a' + 10;
    if (ch >= 'A' && ch <= 'F') return ch - 'A' + 10;
    return -1;
}

Vec<3> ReadHexColor(const JsonContext& c, const std::string& text, const std::string& place) {
    bool valid =
        text.size() == 7 && text[0] == '#' &&
        std::all_of(text.begin() + 1, text.end(), [](char ch) { return HexDigit(ch) >= 0; });
    if (!valid)
        c.Fail(place, "expected a colour as \"#rrggbb\" or [red, green, blue], got " +
                          QuoteUserText(text));
    Vec<3> color;
    for (size_t i = 0; i < 3; ++i) {
        color[i] = (HexDigit(text[1 + 2 * i]) * 16 + HexDigit(text[2 + 2 * i])) / 255.0;
    }
    return color;
}

}  // namespace

void JsonContext::Fail(const std::string& place, const std::string& problem) const {
    throw CompositionError(file + ": " + (place.empty() ? "" : place + ": ") + problem);
}

std::string PlaceOf(const std::string& place, std::string_view key) {
    return place.empty() ? std::string(key) : place + "." + std::string(key);
}

std::string PlaceOf(const std::string& place, size_t index) {
    return place + "[" + std::to_string(index) + "]";
}

double ReadNumber(const JsonContext& c, const Json& j, const std::string& place, Range range) {
    if (!j.is_number()) c.Fail(place, "expected a number, got " + Describe(j));
    // Always finite: JSON has no NaN or infinity, and the parser refuses numbers that
    // overflow a double.
    double v = j.get<double>();
    bool below = range.minExclusive ? !(v > range.min) : v < range.min;
    if (below || v > range.max) c.Fail(place, "must be " + RangeText(range) + ", got " + Format(v));
    return v;
}

int32_t ReadInteger(const JsonContext& c, const Json& j, const std::string& place, int32_t min,
                    int32_t max) {
    double v = ReadNumber(c, j, place, Range::Any());
    if (v != std::floor(v)) c.Fail(place, "expected a whole number, got " + Format(v));
    if (v < min || v > max) {
        c.Fail(place, "must be " + RangeText(Range::Between(min, max)) + ", got " + Format(v));
    }
    return static_cast<int32_t>(v);
}

bool ReadBool(const JsonContext& c, const Json& j, const std::string& place) {
    if (!j.is_boolean()) c.Fail(place, "expected true or false, got " + Describe(j));
    return j.get<bool>();
}

std::string ReadString(const JsonContext& c, const Json& j, const std::string& place) {
    if (!j.is_string()) c.Fail(place, "expected a string, got " + Describe(j));
    // A NUL would silently cut a file name short where the system reads it.
    if (j.get_ref<const std::string&>().find('\0') != std::string::npos)
        c.Fail(place, "a string with a NUL character");
    return j.get<std::string>();
}

template <size_t N>
Vec<N> ReadVec(const JsonContext& c, const Json& j, const std::string& place,
               const Vec<N>& fallback, Range range, bool color) {
    if constexpr (N == 1) {
        return {ReadNumber(c, j, place, range)};
    } else {
        if (color && j.is_string()) return ReadHexColor(c, j.get<std::string>(), place);
        size_t least = color ? N : N - 1;
        if (!j.is_array() || j.size() < least || j.size() > N) {
            std::string wanted =
                color ? "[red, green, blue] or \"#rrggbb\"" : "[x, y] or [x, y, z]";
            std::string got =
                j.is_array() ? "an array of " + std::to_string(j.size()) : Describe(j);
            c.Fail(place, "expected " + wanted + ", got " + got);
        }
        Vec<N> v = fallback;
        for (size_t i = 0; i < j.size(); ++i)
            v[i] = ReadNumber(c, j[i], PlaceOf(place, i), range);
        return v;
    }
}

template <size_t N>
Animated<N> ReadAnimated(const JsonContext& c, const Json& j, const std::string& place,
                         const Vec<N>& fallback, Range range, bool color) {
    if (!j.is_object()) return Animated<N>(ReadVec<N>(c, j, place, fallback, range, color));
    ObjectReader animated(c, &j, place);
    const Json& keys = animated.Require("keyframes");
    std::string keysPlace = animated.PlaceOf("keyframes");
    if (!keys.is_array() || keys.empty()) {
        c.Fail(keysPlace, "expected a non-empty array of keyframes, got " + Describe(keys));
    }
    std::vector<Keyframe<N>> frames;
    for (size_t i = 0; i < keys.size(); ++i) {
        ObjectReader key(c, &keys[i], PlaceOf(keysPlace, i));
        Keyframe<N> frame;
        frame.time = ReadNumber(c, key.Require("time"), key.PlaceOf("time"), Range::Any());
        if (!frames.empty() && frame.time <= frames.back().time) {
            key.Fail("time", "keyframe times must increase, got " + Format(frame.time) + " after " +
                                 Format(frames.back().time));
        }
        frame.value =
            ReadVec<N>(c, key.Require("value"), key.PlaceOf("value"), fallback, range, color);
        frame.out = key.Choice<Interpolation>("interpolation", Interpolation::kLinear,
                                              {{"linear", Interpolation::kLinear},
                                               {"hold", Interpolation::kHold},
                                               {"ease", Interpolation::kEase}});
        key.Finish();
        frames.push_back(frame);
    }
    animated.Finish();
    return Animated<N>(std::move(frames));
}

template Vec<1> ReadVec<1>(const JsonContext&, const Json&, const std::string&, const Vec<1>&,
                           Range, bool);
template Vec<3> ReadVec<3>(const JsonContext&, const Json&, const std::string&, const Vec<3>&,
                           Range, bool);
template Animated<1> ReadAnimated<1>(const JsonContext&, const Json&, const std::string&,
                                     const Vec<1>&, Range, bool);
template Animated<3> ReadAnimated<3>(const JsonContext&, const Json&, const std::string&,
                                     const Vec<3>&, Range, bool);

ObjectReader::ObjectReader(const JsonContext& c, const Json* node, std::string place)
    : c_(c), node_(node ? node : &kEmptyObject), place_(std::move(place)) {
    if (!node_->is_object()) c_.Fail(place_, "expected an object, got " + Describe(*node_));
}

const Json* ObjectReader::Find(std::string_view key) {
    known_.emplace(key);
    auto found = node_->find(key);
    return found == node_->end() ? nullptr : &*found;
}

const Json& ObjectReader::Require(std::string_view key) {
    const Json* j = Find(key);
    if (!j) Fail(key, "is required");
    return *j;
}

double ObjectReader::Number(std::string_view key, double fallback, Range range) {
    const Json* j = Find(key);
    return j ? ReadNumber(c_, *j, PlaceOf(key), range) : fallback;
}

int32_t ObjectReader::Integer(std::string_view key, int32_t fallback, int32_t min, int32_t max) {
    const Json* j = Find(key);
    return j ? ReadInteger(c_, *j, PlaceOf(key), min, max) : fallback;
}

bool ObjectReader::Bool(std::string_view key, bool fallback) {
    const Json* j = Find(key);
    return j ? ReadBool(c_, *j, PlaceOf(key)) : fallback;
}

std::string ObjectReader::String(std::string_view key, std::string fallback) {
    const Json* j = Find(key);
    return j ? ReadString(c_, *j, PlaceOf(key)) : fallback;
}

void ObjectReader::Finish(std::string_view what,
                          std::span<const std::string_view> elsewhere) const {
    for (const auto& item : node_->items()) {
        const std::string& key = item.key();
        if (known_.contains(key)) continue;
        if (std::find(elsewhere.begin(), elsewhere.end(), key) != elsewhere.end()) {
            Fail(key, "does not apply to " + std::string(what));
        }
        std::string problem = "unknown key " + QuoteUserText(key);
        // A near miss differs by a letter or two; a long key cannot be one.
        if (key.size() <= 64) {
            auto nearest = std::min_element(
                known_.begin(), known_.end(),
                [&](const auto& a, const auto& b) { return Distance(key, a) < Distance(key, b); });
            if (nearest != known_.end() && Distance(key, *nearest) <= 2)
                problem += " (did you mean \"" + *nearest + "\"?)";
        }
        c_.Fail(place_, problem);
    }
}

}  // namespace ostrel
