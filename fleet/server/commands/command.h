/// A subcommand of zavfleetd.
#pragma once

#include <functional>
#include <iosfwd>
#include <string>

#include "fleet/bus/messages/values.h"

namespace CLI {
class App;
}

namespace fleet {

/// What every subcommand has to do with.
struct Surroundings {
    std::string directory;  ///< the centre's configuration directory, see FleetDirectory
    Moment now{};
    std::ostream& out;  ///< the result, and nothing else: scripts read it
    std::ostream& err;  ///< what people should know besides
};

/// Carries a subcommand out. Returns the exit status; throws KeysError and sqlite::DatabaseError,
/// whose texts are for the administrator.
using Action = std::function<int(Surroundings&)>;

struct Command {
    const char* group;  ///< the word before its name; "" if there is none
    const char* name;
    const char* help;
    /// Declares its arguments; the action has their values once they were read.
    Action (*declare)(CLI::App& app);
};

}  // namespace fleet
