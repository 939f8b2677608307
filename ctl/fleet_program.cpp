#include "ctl/fleet_program.h"

#include <algorithm>

#include "ctl/sibling_program.h"
#include "ctl/verbs/arguments/global_arguments.h"

namespace ctl {
namespace {

constexpr SiblingProgram kFleetProgram = {"zavctl-fleet",
                                          "what manages fleets is not installed here"};
constexpr FleetWord kFleetOptions[] = {{"--fleet", "The fleet's centre"},
                                       {"--on", "The hosts of the fleet that are meant"}};
constexpr FleetWord kFleetVerbs[] = {
    {"login", "Join a fleet as an operator"},
    {"hosts", "List the hosts of a fleet"},
    {"rollout", "Look at roll-outs, stop them, and let them go on"}};

template <typename List>
bool isAmong(const std::string& word, const List& list) {
    return std::any_of(std::begin(list), std::end(list),
                       [&word](const FleetWord& one) { return word == one.word; });
}

template <typename List>
std::vector<FleetWord> offered(const List& list) {
    if (!isThere(kFleetProgram)) return {};
    return {std::begin(list), std::end(list)};
}

bool hasValueBehind(const std::string& option) {
    return std::any_of(
        kGlobalArguments.begin(), kGlobalArguments.end(), [&](const Argument& argument) {
            return argument.kind == Argument::Kind::Option && option == argument.name;
        });
}

/// The words that are neither global options nor their values.
std::vector<std::string> commandWords(const std::vector<std::string>& words) {
    std::vector<std::string> command;
    for (std::size_t i = 0; i < words.size() && words[i] != "--"; ++i) {
        if (hasValueBehind(words[i]))
            ++i;
        else if (words[i].rfind('-', 0) != 0)
            command.push_back(words[i]);
    }
    return command;
}

}  // namespace

bool isForFleet(const std::vector<std::string>& words) {
    const auto end = std::find(words.begin(), words.end(), "--");
    const bool hasOption = std::any_of(words.begin(), end, [](const std::string& word) {
        return isAmong(word.substr(0, word.find('=')), kFleetOptions);
    });
    if (hasOption) return true;
    const std::vector<std::string> command = commandWords(words);
    const std::size_t verb = !command.empty() && command.front() == "help" ? 1 : 0;
    return command.size() > verb && isAmong(command[verb], kFleetVerbs);
}

std::vector<FleetWord> fleetVerbsOffered() {
    return offered(kFleetVerbs);
}

std::vector<FleetWord> fleetOptionsOffered() {
    return offered(kFleetOptions);
}

void becomeFleetProgram(char* const* argv) {
    becomeProgram(kFleetProgram, argv);
}

}  // namespace ctl
