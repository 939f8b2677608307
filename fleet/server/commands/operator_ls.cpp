#include <CLI/CLI.hpp>
#include <memory>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/commands/operator_text.h"
#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/trust/trust_database.h"

namespace fleet {

Action declareOperatorList(CLI::App& app) {
    const auto isWaitingOnly = std::make_shared<bool>(false);
    app.add_flag("--waiting", *isWaitingOnly, "Only keys that wait to be certified");
    return [isWaitingOnly](Surroundings& around) {
        TrustDatabase trust(FleetDirectory(around.directory).trustDatabase());
        const Operators operators(trust.connection());
        for (const OperatorKey& key : *isWaitingOnly ? operators.waiting() : operators.all())
            around.out << lineOf(key) << '\n';
        return kDone;
    };
}

}  // namespace fleet
