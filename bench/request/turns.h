/// Several ways to do a like thing, timed in turns.
#pragma once

#include <string>
#include <vector>

#include "request/clients.h"

namespace request {

struct Way {
    std::string name;
    Exchange exchange;
    std::string expected;  ///< what every answer holds; empty for anything
    std::vector<double> seconds{};
};

/// The program that a command line, split at blanks, starts. "NAME=COMMAND-LINE" says what it is
/// called; throws std::runtime_error when there is no name.
Way programOf(const std::string& named, const std::string& expected);

/// Does all of them `rounds` times, each round in another order: what a way leaves behind, cold
/// caches for one, is then borne by all the others alike. Throws std::runtime_error when an answer
/// does not hold what is expected.
void takeTurns(std::vector<Way>& ways, int rounds);

/// Prints the medians in microseconds. `out` is a file that takes them in seconds, with `prefix`
/// before their names; none if empty.
void report(std::vector<Way>& ways, const std::string& prefix, const std::string& out);

}  // namespace request
