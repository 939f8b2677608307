/// How the program ends, and how a command says why it could not go on.
#pragma once

#include <stdexcept>
#include <string>
#include <utility>

namespace ctl {

/// The program's exit statuses, as scripts know them.
enum ExitStatus : int {
    kSuccess = 0,
    kHostReportedFailure = 1,  ///< also: the host refuses the request as things are now
    kWrongUsage = 2,           ///< also: a file cannot be read, output cannot be written
    kNoHost = 3,
    kNoOutcome = 4,
    kInterrupted = 130,
};

/// What a status means, for help and manual.
struct ExitMeaning {
    ExitStatus status;
    const char* when;
};

constexpr ExitMeaning kExitMeanings[] = {
    {kSuccess, "done"},
    {kHostReportedFailure,
     "failed, cancelled, interrupted or expired, not known to be done, refused by a guard or for "
     "now, or errors found by doctor"},
    {kWrongUsage, "wrong usage"},
    {kNoHost, "no host reached"},
    {kNoOutcome, "no outcome within --timeout"},
    {kInterrupted, "ended by Ctrl-C"},
};

/// Ends the command with an exit status. The text becomes one line on standard error.
class Failure : public std::runtime_error {
public:
    /// `hint` is the way out, a line of its own; `guard` names the host's guard that held the
    /// request back. Both may be empty.
    Failure(ExitStatus status, const std::string& text, std::string hint = {},
            std::string guard = {})
        : std::runtime_error(text),
          status_(status),
          hint_(std::move(hint)),
          guard_(std::move(guard)) {}
    ExitStatus status() const { return status_; }
    const std::string& hint() const { return hint_; }
    const std::string& guard() const { return guard_; }

private:
    ExitStatus status_;
    std::string hint_;
    std::string guard_;
};

/// The connection ended before the answer was whole: the host may have done what it was asked.
class BrokenConnection : public Failure {
public:
    explicit BrokenConnection(const std::string& text) : Failure(kNoHost, text) {}
};

}  // namespace ctl
