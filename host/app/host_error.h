// Errors a user can cause: a bad composition, a missing image, a plug-in that cannot load.
// The message names the file, the place in it and the problem.
#pragma once

#include <stdexcept>
#include <string>

namespace ostrel {

class HostError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace ostrel
