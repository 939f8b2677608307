#include <CLI/CLI.hpp>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/commands/texts.h"
#include "fleet/server/keys/trust/endings.h"
#include "fleet/server/keys/trust/trust_database.h"

namespace fleet {

Action declareDoctor(CLI::App&) {
    return [](Surroundings& around) {
        const FleetDirectory directory(around.directory);
        TrustDatabase trust(directory.trustDatabase());
        const auto endings = endingsOf(directory, trust.connection(), around.now);
        for (const Ending& ending : endings) {
            const bool isOver = ending.until <= around.now;
            around.out << ending.what << (isOver ? " ended on " : " ends on ")
                       << textOfMoment(ending.until) << ": " << ending.help << '\n';
        }
        return endings.empty() ? kDone : kFailed;
    };
}

}  // namespace fleet
