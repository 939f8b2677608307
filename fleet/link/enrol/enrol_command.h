/// The subcommand "enrol" of zavlink.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace fleet {

/// Carries out what the words behind "enrol" say. The invitation comes from `in` if it is "-".
/// Writes the result and help to `out`, and errors to `err`. Returns the exit status: 0 enrolled, 1
/// not, 2 the words make no sense.
int runEnrolCommand(std::vector<std::string> words, std::istream& in, std::ostream& out,
                    std::ostream& err);

/// Declares its options and arguments, for the manual; what they are given goes nowhere.
void describeEnrolment(CLI::App& app);

}  // namespace fleet
