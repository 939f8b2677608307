/// Values that a live host knows.
#pragma once

#include <vector>

#include "ctl/client/deadline.h"
#include "ctl/completion/wanted.h"

namespace ctl {

/// Those that begin as the wanted word does, without its lead. None when the host cannot be asked
/// until the deadline: somebody who types is told nothing of it. Words that a shell could not
/// insert as they are, which hold control characters, are left out. Never throws Failure.
std::vector<Candidate> offersFor(const Wanted& wanted, Deadline deadline);

}  // namespace ctl
