/// How the program ends and how it says why.
#pragma once

#include <stdexcept>
#include <string>

namespace ctl {

/// Exit statuses.
enum ExitStatus : int {
    kSuccess = 0,
    kHostReportedFailure = 1,
    kWrongUsage = 2,
    kNoHost = 3,
    kNoOutcome = 4,
};

/// Ends the command with a status and one line on standard error.
class Failure : public std::runtime_error {
public:
    Failure(ExitStatus status, const std::string& text)
        : std::runtime_error(text), status_(status) {}
    ExitStatus status() const { return status_; }

private:
    ExitStatus status_;
};

}  // namespace ctl
