/// Why something about the fleet's keys cannot be done.
#pragma once

#include <stdexcept>

namespace fleet {

/// what() is for the administrator: what is wrong, and what helps. It never holds a secret.
class KeysError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace fleet
