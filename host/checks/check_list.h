/// The list of checks, for all who run it: `zavhost --check`, a guarded start, and GET /v1/doctor.
#pragma once

#include <string>
#include <vector>

#include "host/checks/check.h"

namespace host {

struct CheckResult {
    std::string check;  ///< its name
    Finding finding;
};

/// The rows, in the order in which they run.
const std::vector<Check>& checks();

/// Runs all of them, in order. Takes as long as the home's inventory program and, where it is
/// asked, its search for Java. What a check throws becomes its warning. Any thread.
std::vector<CheckResult> runChecks(CheckSubject& subject);

bool hasError(const std::vector<CheckResult>& results);

/// What was found, and the remedy if there is one.
std::string wordsOf(const Finding& finding);

/// A result as a line for people, with a line feed: the verdict, the check's name and the words.
std::string lineOf(const CheckResult& result);

}  // namespace host
