#include <CLI/CLI.hpp>
#include <memory>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/commands/invitation_line.h"
#include "fleet/server/commands/texts.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "fleet/server/keys/trust/names.h"
#include "fleet/server/keys/trust/trust_database.h"

namespace fleet {
namespace {

struct EnrolArguments {
    std::string name;
    std::string labels;
    std::string valid = "1h";
    bool replaces = false;
};

int enrol(const EnrolArguments& arguments, Surroundings& around) {
    const FleetDirectory directory(around.directory);
    TrustDatabase trust(directory.trustDatabase());
    const std::string token = HostEnrolment(trust.connection())
                                  .invite({arguments.name, labelsOf(arguments.labels),
                                           arguments.replaces, durationOf(arguments.valid)},
                                          around.now);
    around.out << invitationLine(directory, token) << '\n';
    return kDone;
}

}  // namespace

Action declareEnrol(CLI::App& app) {
    const auto arguments = std::make_shared<EnrolArguments>();
    app.add_option("NAME", arguments->name, "The host's name, for people")->required();
    app.add_option("--labels", arguments->labels, "Labels that the centre gives it: k=v,k=v");
    app.add_option("--valid", arguments->valid, "How long the line is good, such as 1h or 7d")
        ->capture_default_str();
    app.add_flag("--replace", arguments->replaces,
                 "A host of that name is there; revoke it once the new one has come");
    return [arguments](Surroundings& around) { return enrol(*arguments, around); };
}

}  // namespace fleet
