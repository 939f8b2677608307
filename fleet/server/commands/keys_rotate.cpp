#include <CLI/CLI.hpp>
#include <memory>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/commands/texts.h"
#include "fleet/server/keys/setup/rotate_keys.h"

namespace fleet {
namespace {

struct RotateArguments {
    std::string root;
    long long validDays = 730;
};

int rotate(const RotateArguments& arguments, Surroundings& around) {
    const FleetDirectory directory(around.directory);
    const bool isBusHere = rotateKeys(directory, readRootFile(arguments.root), around.now,
                                      around.now + daysOf(arguments.validDays));
    around.err << "The new keys are used once zavfleetd is started again.\n";
    if (isBusHere) {
        around.err << "Have the bus's server reload its certificate.\n";
    } else {
        around.err << "Copy " << directory.serverFile()
                   << " to the servers of the bus and have them reload it.\n";
    }
    return kDone;
}

}  // namespace

Action declareKeysRotate(CLI::App& app) {
    const auto arguments = std::make_shared<RotateArguments>();
    app.add_option("--root", arguments->root, "The file with the root")->required();
    app.add_option("--valid", arguments->validDays, "Days until the certificates end")
        ->capture_default_str();
    return [arguments](Surroundings& around) { return rotate(*arguments, around); };
}

}  // namespace fleet
