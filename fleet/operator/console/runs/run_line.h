/// The command line of a verb that a browser has run.
#pragma once

#include <string>
#include <vector>

#include "ctl/verbs/verb.h"

namespace fleet {

/// How long verbs have, and those that bring a file.
inline constexpr int kVerbSeconds = 110;
inline constexpr int kPushSeconds = 590;

/// An option and its value, "" for a flag.
struct GivenOption {
    const ctl::Argument* argument;
    std::string value;
};

struct RunLine {
    std::string url;  ///< of the fleet's centre
    const ctl::Verb* verb = nullptr;
    std::vector<std::string> arguments;
    std::vector<GivenOption> options;
    int seconds = kVerbSeconds;  ///< before the verb gives up by itself
};

/// The argument that stands for standard input.
inline constexpr const char* kFromInput = "-";

/// What the program is run with, from its name on. It prints one JSON document, and returns as soon
/// as a roll-out has begun. Each value is in one word with its option, and the arguments stand
/// behind "--", so that none of them is taken for an option.
std::vector<std::string> programWords(const RunLine& line);

/// Throws ctl::Failure(kWrongUsage) unless the program takes these words as they are meant: the
/// same parser looks at them here.
void insistThatTaken(const RunLine& line);

/// The line as somebody would type it into a shell. It waits for the end of what it begins.
std::string lineToCopy(const RunLine& line);

}  // namespace fleet
