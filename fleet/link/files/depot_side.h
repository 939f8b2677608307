/// Puts files into the host's depot.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/messages/order.h"
#include "fleet/link/core/answers.h"
#include "fleet/link/files/spool.h"

namespace fleet {

/// Sends files from the spool to the host on this machine, as an operator's push would, and has the
/// host compute their sums. One thread at a time; may take long.
class DepotSide {
public:
    /// `hostSocket` is the host's; the one for files has ".rpc" behind its name.
    explicit DepotSide(std::string hostSocket) : hostSocket_(std::move(hostSocket)) {}

    /// A file that is no longer what it was when it was fetched is forgotten.
    PrepareAnswer place(const std::vector<OrderFile>& files, Spool& spool) const;

private:
    const std::string hostSocket_;
};

}  // namespace fleet
