/// An answer to a client that the server has no room for.
#pragma once

#include "http/reply.h"

namespace http {

/// Sends the reply with further fields, and ends the connection's sending side, without waiting for
/// anything: what does not fit into the socket at once is not sent. The caller closes the
/// descriptor. The client can read the answer even if what it sends itself arrives nowhere.
void turnAway(int connection, const Reply& reply, const Fields& fields);

}  // namespace http
