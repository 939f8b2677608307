/// Who is at the other end of a connection, and what they may do.
#pragma once

#include <sys/types.h>

#include <string>

#include "host/process/system/groups.h"

namespace host {

/// What a client may do, each level including the ones before it.
enum class Access {
    None,
    Read,  ///< look at things
    Act,   ///< change things on this machine
};

/// The process that opened the connection, as the kernel knows it.
struct Peer {
    pid_t process = 0;
    uid_t user = 0;
    gid_t group = 0;
    Access access = Access::None;
    std::string reason{};  ///< what gives it that access, in words; empty: nothing does
};

/// The peer of a connected Unix socket, as it was when it connected. The host's own user and root
/// may act, whatever the mode of the socket file has become, and so may members of that group;
/// members of the other one may read. A group counts whether it is the peer's own or one of its
/// further ones. Everybody else, and a peer that the kernel does not name, has no access.
Peer peerOf(int connection, const AccessGroups& groups = {});

/// Whom the host serves, for those whom it does not: a sentence.
std::string servedUsers(const AccessGroups& groups);

}  // namespace host
