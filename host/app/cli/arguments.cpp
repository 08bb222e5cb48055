#include "cli/arguments.h"

#include <charconv>
#include <cmath>
#include <stdexcept>
#include <vector>

#include "host_error.h"

namespace ostrel {
namespace {

// A whole number filling the text exactly.
bool ReadInt(const std::string& text, int32_t* value) {
    const char* end = text.data() + text.size();
    auto [stop, error] = std::from_chars(text.data(), end, *value);
    return error == std::errc() && stop == end && !text.empty();
}

std::vector<std::string> Split(const std::string& text, char separator) {
    std::vector<std::string> parts;
    size_t start = 0;
    for (size_t at = text.find(separator); at != std::string::npos;
         at = text.find(separator, start)) {
        parts.push_back(text.substr(start, at - start));
        start = at + 1;
    }
    parts.push_back(text.substr(start));
    return parts;
}

}  // namespace

FrameRange ParseFrameRange(const std::string& text, int32_t frameCount) {
    std::vector<std::string> parts = Split(text, '-');
    FrameRange range;
    bool read = parts.size() <= 2 && ReadInt(parts[0], &range.first);
    range.last = range.first;
    if (read && parts.size() == 2) read = ReadInt(parts[1], &range.last);
    if (!read) throw std::invalid_argument(QuoteUserText(text) + " is not a frame range like 0-47");
    if (range.first > range.last) {
        throw std::invalid_argument("the frame range " + text + " ends before it starts");
    }
    if (range.first < 0 || range.last >= frameCount) {
        throw std::invalid_argument("the frame range " + text + " reaches outside the frames 0-" +
                                    std::to_string(frameCount - 1) + " of the composition");
    }
    return range;
}

Downsample ParseDownsample(const std::string& text) {
    std::vector<std::string> parts = Split(text, 'x');
    int32_t x = 0, y = 0;
    bool read = parts.size() <= 2 && ReadInt(parts[0], &x);
    y = x;
    if (read && parts.size() == 2) read = ReadInt(parts[1], &y);
    if (!read || x < 1 || x > 64 || y < 1 || y > 64) {
        throw std::invalid_argument(QuoteUserText(text) +
                                    " is not a downsample factor like 2 or 2x1 (1 to 64)");
    }
    return {static_cast<int16_t>(x), static_cast<int16_t>(y)};
}

M_LRect ParseRegion(const std::string& text) {
    std::vector<std::string> parts = Split(text, ',');
    int32_t v[4] = {};
    bool read = parts.size() == 4;
    for (size_t i = 0; read && i < 4; ++i)
        read = ReadInt(parts[i], &v[i]);
    if (!read) {
        throw std::invalid_argument(QuoteUserText(text) +
                                    " is not a region like LEFT,TOP,RIGHT,BOTTOM in pixels");
    }
    return {v[0], v[1], v[2], v[3]};
}

int64_t ParseMemorySize(const std::string& text) {
    size_t digits = 0;
    double number = 0;
    try {
        number = std::stod(text, &digits);
    } catch (const std::logic_error&) {
        digits = 0;
    }
    std::string unit = text.substr(digits);
    const std::string kUnits = "KMGT";
    size_t power = unit.empty() ? 0 : kUnits.find(unit) + 1;
    double bytes = number * std::pow(1024.0, static_cast<double>(power));
    if (!digits || (!unit.empty() && (unit.size() != 1 || power == 0)) || !(bytes >= 1 << 20) ||
        bytes > 1e18) {
        throw std::invalid_argument(QuoteUserText(text) +
                                    " is not a size of memory like 512M or 8G (at least 1M)");
    }
    return static_cast<int64_t>(bytes);
}

std::string FrameList(const std::vector<int32_t>& frames) {
    std::string text;
    for (size_t i = 0; i < frames.size();) {
        size_t j = i;
        while (j + 1 < frames.size() && frames[j + 1] == frames[j] + 1)
            ++j;
        if (!text.empty()) text += ", ";
        text += std::to_string(frames[i]);
        if (j > i) text.append("-").append(std::to_string(frames[j]));
        i = j + 1;
    }
    return text;
}

}  // namespace ostrel
