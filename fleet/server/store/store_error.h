/// Why the centre's database cannot be used.
#pragma once

#include <stdexcept>

namespace fleet {

/// what() is for the operator: which file, what is wrong with it, and what helps.
class StoreError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace fleet
