/// Whom the host serves.
#pragma once

#include <string>

#include "host/process/system/groups.h"
#include "http/door.h"

namespace host {

/// The peer of a connected Unix socket, as it was when it connected. The host's own user and root
/// may act, whatever the mode of the socket file has become, and so may members of that group;
/// members of the other one may read. A group counts whether it is the peer's own or one of its
/// further ones. Everybody else, and a peer that the kernel does not name, has no access.
http::Peer peerOf(int connection, const AccessGroups& groups = {});

/// A sentence that tells those who are turned away whom the host serves.
std::string servedUsers(const AccessGroups& groups);

/// Lets in those whom the host serves.
http::Door doorFor(const AccessGroups& groups = {});

}  // namespace host
