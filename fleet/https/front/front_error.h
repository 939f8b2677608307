/// Why a front cannot work.
#pragma once

#include <stdexcept>

namespace fleet {

/// what() is for the operator: which address or file, what is wrong with it, and what helps.
class FrontError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace fleet
