/// Why a host cannot join.
#pragma once

#include <stdexcept>

namespace fleet {

/// what() is for the operator of the host: what is wrong, and what helps.
class EnrolError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace fleet
