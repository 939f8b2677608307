/// Whether the host guards its users.
#pragma once

#include "ctl/client/deadline.h"
#include "ctl/client/host_address.h"

namespace ctl {

/// False for a host that was started unguarded, to be seen as it is: the program's own checks stand
/// back then too. True also for a host that does not say. Throws Failure as HostClient does.
bool isGuarded(const HostAddress& host, Deadline deadline);

}  // namespace ctl
