/// The part of the program that manages many hosts at once. It is a program of its own.
#pragma once

#include <string>
#include <vector>

namespace ctl {

/// Whether a command line is about a fleet: it has --fleet or --on, or its verb is one of a fleet
/// alone. What stands behind "--" does not count.
bool isForFleet(const std::vector<std::string>& words);

/// A word of a fleet's for shells to offer.
struct FleetWord {
    const char* word;
    const char* help;  ///< a few words
};
/// Verbs and options that make a command line one about a fleet; none where there is no
/// zavctl-fleet.
std::vector<FleetWord> fleetVerbsOffered();
std::vector<FleetWord> fleetOptionsOffered();

/// Runs zavctl-fleet with the same words in the place of this process, see becomeProgram().
[[noreturn]] void becomeFleetProgram(char* const* argv);

}  // namespace ctl
