#include "fleet/server/commands/command_line.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <exception>
#include <map>
#include <ostream>
#include <utility>

#include "fleet/server/commands/command_table.h"

namespace fleet {
namespace {

constexpr const char* kDirectory = "/var/lib/zavfleetd/keys";

const char* helpOfGroup(const std::string& group) {
    if (group == "keys") return "The fleet's own keys";
    if (group == "operator") return "Those who may give orders";
    return "Keys that count no longer";
}

/// The subcommands with their arguments, and the action of the one that was chosen.
class Commands {
public:
    explicit Commands(CLI::App& app) {
        app.require_subcommand(1);
        for (const Command& command : commandTable()) {
            CLI::App* const parsed =
                parentOf(app, command.group)->add_subcommand(command.name, command.help);
            actions_.emplace_back(parsed, command.declare(*parsed));
        }
    }

    const Action& chosen() const {
        const auto found = std::find_if(actions_.begin(), actions_.end(),
                                        [](const auto& entry) { return entry.first->parsed(); });
        return found->second;
    }

private:
    CLI::App* parentOf(CLI::App& app, const std::string& group) {
        if (group.empty()) return &app;
        CLI::App*& parent = groups_[group];
        if (parent == nullptr) {
            parent = app.add_subcommand(group, helpOfGroup(group));
            parent->require_subcommand(1);
        }
        return parent;
    }

    std::map<std::string, CLI::App*> groups_;
    std::vector<std::pair<CLI::App*, Action>> actions_;
};

int carriedOut(const Action& action, Surroundings surroundings) {
    try {
        return action(surroundings);
    } catch (const std::exception& error) {
        surroundings.err << "zavfleetd: " << error.what() << '\n';
        return kFailed;
    }
}

}  // namespace

int runCommandLine(std::vector<std::string> words, Moment now, std::ostream& out,
                   std::ostream& err) {
    CLI::App app("The centre of a fleet", "zavfleetd");
    std::string directory = kDirectory;
    app.add_option("--directory", directory, "The centre's keys and what it knows of the fleet")
        ->capture_default_str();
    const Commands commands(app);
    std::reverse(words.begin(), words.end());  // as CLI11 wants them
    try {
        app.parse(words);
    } catch (const CLI::ParseError& error) {
        const int status = app.exit(error, out, err);
        return status == 0 ? kDone : kMisused;
    }
    return carriedOut(commands.chosen(), {directory, now, out, err});
}

}  // namespace fleet
