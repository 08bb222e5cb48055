// Reading JSON values for the composition loader (internal to it; nlohmann-json is not part of
// the library's interface), with messages that name the file, the place
// (such as "layers[3].transform.position") and the problem.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <limits>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <utility>

#include <nlohmann/json.hpp>

#include "composition/keyframes.h"
#include "host_error.h"

namespace ostrel {

using Json = nlohmann::json;

// Where a value is read from; every failure throws CompositionError.
struct JsonContext {
    std::string file;
    [[noreturn]] void Fail(const std::string& place, const std::string& problem) const;
};

// Accepted values of a number, with both ends included unless minExclusive.
struct Range {
    double min = -std::numeric_limits<double>::max();
    double max = std::numeric_limits<double>::max();
    bool minExclusive = false;

    static Range Any() { return {}; }
    static Range Between(double lo, double hi) { return {lo, hi, false}; }
    static Range Positive(double hi) { return {0.0, hi, true}; }
};

std::string PlaceOf(const std::string& place, std::string_view key);
std::string PlaceOf(const std::string& place, size_t index);

double ReadNumber(const JsonContext& c, const Json& j, const std::string& place, Range range);
int32_t ReadInteger(const JsonContext& c, const Json& j, const std::string& place, int32_t min,
                    int32_t max);
bool ReadBool(const JsonContext& c, const Json& j, const std::string& place);
std::string ReadString(const JsonContext& c, const Json& j, const std::string& place);

// A number for N = 1. For N = 3 an array of three numbers, or of two with the third taken
// from fallback; with color, also a "#rrggbb" string.
template <size_t N>
Vec<N> ReadVec(const JsonContext& c, const Json& j, const std::string& place,
               const Vec<N>& fallback, Range range, bool color);

// A constant as ReadVec reads it, or {"keyframes": [{"time", "value", "interpolation"}...]}.
template <size_t N>
Animated<N> ReadAnimated(const JsonContext& c, const Json& j, const std::string& place,
                         const Vec<N>& fallback, Range range, bool color);

template <class E>
using Choices = std::initializer_list<std::pair<std::string_view, E>>;

// The members of one JSON object. Keys that no reader asked for are errors when Finish runs,
// which catches misspelt keys.
class ObjectReader {
public:
    // Fails unless node is an object. An absent node reads as an empty object.
    ObjectReader(const JsonContext& c, const Json* node, std::string place);

    const std::string& Place() const { return place_; }
    std::string PlaceOf(std::string_view key) const { return ostrel::PlaceOf(place_, key); }
    const JsonContext& Context() const { return c_; }
    [[noreturn]] void Fail(std::string_view key, const std::string& problem) const {
        c_.Fail(PlaceOf(key), problem);
    }

    bool Has(std::string_view key) const { return node_->contains(key); }
    // The member, or null when absent; either way the key counts as known.
    const Json* Find(std::string_view key);
    const Json& Require(std::string_view key);
    ObjectReader Object(std::string_view key) { return ObjectReader(c_, Find(key), PlaceOf(key)); }

    double Number(std::string_view key, double fallback, Range range);
    int32_t Integer(std::string_view key, int32_t fallback, int32_t min, int32_t max);
    bool Bool(std::string_view key, bool fallback);
    std::string String(std::string_view key, std::string fallback);
    // Absent keys keep `current`; arrays of two take z from its first key.
    template <size_t N>
    Animated<N> Anim(std::string_view key, const Animated<N>& current, Range range,
                     bool color = false) {
        const Json* j = Find(key);
        return j ? ReadAnimated<N>(c_, *j, PlaceOf(key), current.Keys().front().value, range, color)
                 : current;
    }
    template <class E>
    E Choice(std::string_view key, E fallback, Choices<E> choices) {
        const Json* j = Find(key);
        return j ? ChoiceOf(*j, PlaceOf(key), choices) : fallback;
    }
    template <class E>
    E ChoiceOf(const Json& j, const std::string& place, Choices<E> choices) const {
        std::string name = ReadString(c_, j, place);
        for (const auto& [text, value] : choices) {
            if (text == name) return value;
        }
        std::string expected;
        for (const auto& choice : choices) {
            expected += (expected.empty() ? "\"" : ", \"") + std::string(choice.first) + "\"";
        }
        c_.Fail(place, "unknown value " + QuoteUserText(name) + "; expected one of " + expected);
    }

    // Fails on the first key nobody asked for. Keys in `elsewhere` belong to other kinds of
    // layer; for them the message says they do not apply to `what`.
    void Finish(std::string_view what = {}, std::span<const std::string_view> elsewhere = {}) const;

private:
    const JsonContext& c_;
    const Json* node_;
    std::string place_;
    std::set<std::string, std::less<>> known_;
};

}  // namespace ostrel
