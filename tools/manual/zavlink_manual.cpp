// Writes the manual pages of the link: zavlink_manual TEMPLATES DIRECTORY DATE

#include <CLI/CLI.hpp>
#include <string>

#include "fleet/link/enrol/enrol_command.h"
#include "tools/manual/cli_options.h"
#include "tools/manual/mdoc.h"
#include "tools/manual/pages.h"

namespace manual {

void writePages(const std::string& templates, const std::string& directory,
                const std::string& date) {
    CLI::App enrolment;
    fleet::describeEnrolment(enrolment);
    write(directory + "/zavlink.8",
          filled(templates + "/zavlink.8.in", {{"DATE", date}, {"ENROL", optionList(enrolment)}}));
    write(directory + "/zavlink.toml.5",
          filled(templates + "/zavlink.toml.5.in", {{"DATE", date}}));
}

}  // namespace manual
