#include "host/http/peer.h"

#include <sys/socket.h>
#include <unistd.h>

namespace host {

Peer peerOf(int connection) {
    ucred found{};
    socklen_t length = sizeof found;
    if (::getsockopt(connection, SOL_SOCKET, SO_PEERCRED, &found, &length) != 0) return {};
    const bool trusted = found.uid == ::geteuid() || found.uid == 0;
    return {found.pid, found.uid, found.gid, trusted ? Access::Act : Access::None};
}

}  // namespace host
