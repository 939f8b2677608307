/// How the program ends, and how a command says why it could not go on.
#pragma once

#include <stdexcept>
#include <string>

namespace ctl {

/// The program's exit statuses, as scripts know them.
enum ExitStatus : int {
    kSuccess = 0,
    kHostReportedFailure = 1,
    kWrongUsage = 2,  ///< also: a file cannot be read, output cannot be written
    kNoHost = 3,
    kNoOutcome = 4,
};

/// Ends the command with an exit status. The text becomes one line on standard error.
class Failure : public std::runtime_error {
public:
    Failure(ExitStatus status, const std::string& text)
        : std::runtime_error(text), status_(status) {}
    ExitStatus status() const { return status_; }

private:
    ExitStatus status_;
};

}  // namespace ctl
