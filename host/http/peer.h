/// Who is at the other end of a connection, and what they may do.
#pragma once

#include <sys/types.h>

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
};

/// The peer of a connected Unix socket. The host's own user and root may act, whatever the mode of
/// the socket file has become; everybody else, and a peer that the kernel does not name, has no
/// access.
Peer peerOf(int connection);

}  // namespace host
