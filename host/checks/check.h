/// The checks of a home and its machine: whether a host can work there, and what an operator should
/// mend.
#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/home/inventory.h"
#include "host/process/configuration/environment.h"
#include "host/process/configuration/options.h"

namespace host {

enum class Verdict {
    Ok,
    Warning,  ///< the host works, but something an operator may need does not
    Error,    ///< a guarded host refuses to start
};

/// "ok", "warning" or "error".
const char* nameOf(Verdict verdict);

/// What one check found.
struct Finding {
    Verdict verdict = Verdict::Ok;
    std::string text;
    std::string remedy;  ///< what to do; empty if nothing is to be done
};

/// What is checked. One run of the checks has one of it.
class CheckSubject {
public:
    CheckSubject(HostOptions hostOptions, Environment environment)
        : options(std::move(hostOptions)), environment_(std::move(environment)) {}

    /// The value of an environment variable; "" if it is not set.
    std::string variable(const char* name) const;
    /// The path of a file in the home.
    std::string inHome(const std::string& relative) const { return options.home + "/" + relative; }
    /// The home's inventory, for which its program runs once.
    const Inventory& inventory();

    const HostOptions options;

private:
    const Environment environment_;
    std::optional<Inventory> inventory_;
};

/// The depot that the host uses, whether it exists or not.
std::string depotOf(CheckSubject& subject);

/// Looks at one thing. Changes nothing. Only what keeps the host from its work is an error: a
/// program of the home that is missing or cannot be executed, a directory that cannot be used or
/// whose path the plug-in cuts, a run-as database that does not parse or has entries that would be
/// overlooked, a time-out that is none, and a plug-in that does not fit.
using CheckFunction = Finding(CheckSubject& subject);

/// One row of the list of checks.
struct Check {
    const char* name;
    CheckFunction* look;
};

}  // namespace host
