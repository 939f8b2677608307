/// The part of a host's list of tasks that an operator may see.
#pragma once

#include <functional>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

/// Asks the host for its newest tasks, `most` of them, behind the cursor `after` if that is not "".
/// Returns a document with the members "tasks" and "next".
using AskTasks = std::function<nlohmann::json(Number most, const std::string& after)>;

/// Such a document with at most so many tasks for the certificate's products, or for none. It looks
/// for them behind those for others, though not without end. Throws what `ask` throws.
nlohmann::json allowedTasks(const AskTasks& ask, Number most, const Certificate& certificate);

}  // namespace fleet
