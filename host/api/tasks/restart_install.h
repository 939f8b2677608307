/// Installs that may restart the host.
#pragma once

#include <string>

#include "host/api/services.h"
#include "host/outcomes/task.h"
#include "host/tables/query.h"

namespace host {

/// Whether the request is such an install.
bool mayRestart(const Query& query);

/// Before such an install is handed over: what an earlier one left must not be taken for its
/// result. Returns why it cannot be removed; empty when nothing of it is there.
std::string forgetOlderResult(const Services& services);

/// How an install that had begun in an earlier run ends, when nothing of it lives any more; asks
/// the plug-in for its result if there is one. Takes as long as the plug-in does. Throws
/// QueryFailed.
Task endOfRestartInstall(Services& services, Task task);

}  // namespace host
