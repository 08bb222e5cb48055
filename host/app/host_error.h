// Errors a user can cause: a bad composition, a missing image, a plug-in that cannot load.
// The message names the file, the place in it and the problem.
#pragma once

#include <stdexcept>
#include <string>
#include <string_view>

namespace ostrel {

class HostError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// Text the user wrote, in quotes, for a message: a long one is cut, so that a megabyte-long key
// makes a one-line message.
inline std::string QuoteUserText(std::string_view text) {
    constexpr size_t kLongest = 64;
    std::string quoted = "\"";
    quoted.append(text.substr(0, kLongest));
    if (text.size() <= kLongest) return quoted += '"';
    return quoted.append("…\" (").append(std::to_string(text.size())).append(" characters)");
}

}  // namespace ostrel
