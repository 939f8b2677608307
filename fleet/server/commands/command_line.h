/// The command line of zavfleetd.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

// Exit statuses.
constexpr int kDone = 0;
constexpr int kFailed = 1;
constexpr int kMisused = 2;

/// Carries out what the words behind the program's name say. Writes results to `out`, and errors
/// and remarks to `err`. Returns the exit status; throws nothing that is the words' fault.
int runCommandLine(std::vector<std::string> words, Moment now, std::ostream& out,
                   std::ostream& err);

}  // namespace fleet
