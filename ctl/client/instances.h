/// The instances of the host's agents.
#pragma once

#include <nlohmann/json_fwd.hpp>

#include "ctl/client/host_client.h"

namespace ctl {

/// Those that run, should run or could, each as {"product", "instance", "target", "state", "user",
/// "pid"}; null when the host, or its home, has no way to tell. Waits for fifteen seconds at most,
/// because it is asked beside something else. Throws Failure.
nlohmann::json listInstances(const HostClient& client, Deadline deadline);

}  // namespace ctl
