/// Why somebody does not get in.
#pragma once

#include <stdexcept>

namespace fleet {

/// The same words whatever was wrong: who tries tokens learns nothing from them.
class JoinRefused : public std::runtime_error {
public:
    JoinRefused()
        : std::runtime_error(
              "refused: the invitation is not known, was used, or is over; ask for "
              "a new one") {}
};

}  // namespace fleet
