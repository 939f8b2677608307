/// Runs rules and reports on them.
#pragma once

#include <chrono>
#include <string>
#include <vector>

#include "conformance/rule.h"

namespace conformance {

/// Runs one rule in a child process, so that a platform that crashes, hangs or leaves its state
/// behind spoils no other rule. Returns what is wrong, or an empty text. The calling process must
/// have no other threads. Throws std::system_error when no child or scratch directory can be
/// created.
std::string run(const Rule& rule, std::chrono::milliseconds limit = std::chrono::seconds(30));

/// One line on an operation: "ok    NAME", or "FAIL  NAME: " and each broken promise.
struct Verdict {
    bool fulfilled;
    std::string line;
};
Verdict judge(const Operation& operation,
              std::chrono::milliseconds limit = std::chrono::seconds(30));

}  // namespace conformance
