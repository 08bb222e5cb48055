// The one error a user can cause with a composition: a bad file, a missing or unreadable image.
#pragma once

#include <stdexcept>
#include <string>

namespace ostrel {

// The message names the file, the place in it (such as "layers[3].transform.position") and
// the problem, ready to show as it is.
class CompositionError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace ostrel
