/// Why a file cannot be used.
#pragma once

#include <stdexcept>

namespace fleet {

/// what() is for the operator: which file, what is wrong with it, and what helps.
class FileError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace fleet
