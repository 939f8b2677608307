/// Why the host cannot start.
#pragma once

#include <stdexcept>
#include <string>
#include <system_error>

namespace host {

/// Carries one line for standard error; the process ends with status 1.
class StartError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
    /// "what: " and the system's text for `error`, a value of errno.
    StartError(const std::string& what, int error)
        : std::runtime_error(what + ": " + std::generic_category().message(error)) {}
};

}  // namespace host
