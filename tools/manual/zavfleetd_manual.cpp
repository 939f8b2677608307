// Writes the manual page of the centre: zavfleetd_manual TEMPLATES DIRECTORY DATE

#include <CLI/CLI.hpp>
#include <string>

#include "fleet/server/commands/command_table.h"
#include "tools/manual/cli_options.h"
#include "tools/manual/mdoc.h"
#include "tools/manual/pages.h"

namespace manual {
namespace {

std::string wordsOf(const fleet::Command& command) {
    const std::string group = command.group;
    return group.empty() ? command.name : group + ' ' + command.name;
}

std::string synopses() {
    std::string lines;
    for (const fleet::Command& command : fleet::commandTable()) {
        CLI::App app;
        command.declare(app);
        lines +=
            ".Nm\n.Op Fl -directory Ar DIRECTORY\n.Cm " + wordsOf(command) + synopsisOf(app) + '\n';
    }
    return lines;
}

std::string commands() {
    std::string sections;
    for (const fleet::Command& command : fleet::commandTable()) {
        CLI::App app;
        command.declare(app);
        sections += ".Ss " + wordsOf(command) + '\n' + sentences(command.help) + optionList(app);
    }
    return sections;
}

}  // namespace

void writePages(const std::string& templates, const std::string& directory,
                const std::string& date) {
    write(directory + "/zavfleetd.8",
          filled(templates + "/zavfleetd.8.in",
                 {{"DATE", date}, {"SYNOPSIS", synopses()}, {"COMMANDS", commands()}}));
}

}  // namespace manual
