/// Changes the accounts of a running server.
#pragma once

#include <string>

#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/status.h"

namespace fleet {

/// Gives the server a newer token of an account. Connections of users whose keys it revokes are
/// cut. The connection must be a user's of the server's own account. Waits for the server; for any
/// thread. The server that answers passes it on to the others of a cluster.
///
/// A token that the operator, whose public key is `root`, has not signed is Refused here. The
/// server would keep it, and from its next start let nobody of that account in. So whoever can
/// connect to the server's own account can lock others out, although he can let nobody in.
BusStatus updateAccount(Connection& system, const std::string& token, const std::string& root,
                        Connection::Milliseconds deadline);

}  // namespace fleet
