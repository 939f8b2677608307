/// Why the host cannot start.
#pragma once

#include <stdexcept>

namespace host {

/// Carries one line for standard error; the process ends with status 1.
class StartError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace host
