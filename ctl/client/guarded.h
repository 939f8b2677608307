/// Whether the host guards its users.
#pragma once

#include "ctl/client/address/host_address.h"
#include "ctl/client/deadline.h"

namespace ctl {

/// False for a host that was started unguarded, to be seen as it is: the program's own checks stand
/// back then too. True also for a host that does not say. Throws Failure as HostClient does.
bool isGuarded(const HostAddress& host, Deadline deadline);

}  // namespace ctl
