#include "host/peers/peer_of.h"

#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <vector>

namespace host {
namespace {

/// The groups that a peer is a member of beside its own. None if the kernel does not say: then only
/// its own counts.
std::vector<gid_t> furtherGroupsOf(int connection) {
    std::vector<gid_t> groups(64);
    for (;;) {
        auto length = static_cast<socklen_t>(groups.size() * sizeof(gid_t));
        if (::getsockopt(connection, SOL_SOCKET, SO_PEERGROUPS, groups.data(), &length) == 0) {
            groups.resize(length / sizeof(gid_t));
            return groups;
        }
        // The length is now the one that is needed.
        if (errno != ERANGE || length <= groups.size() * sizeof(gid_t)) return {};
        groups.resize(length / sizeof(gid_t));
    }
}

bool isMember(const std::optional<Group>& group, gid_t own, const std::vector<gid_t>& further) {
    if (!group) return false;
    return own == group->number ||
           std::find(further.begin(), further.end(), group->number) != further.end();
}

void judge(http::Peer& peer, int connection, const AccessGroups& groups) {
    peer.access = http::Access::Act;
    if (peer.user == 0) {
        peer.reason = "root";
    } else if (peer.user == ::geteuid()) {
        peer.reason = "the host's own user";
    } else {
        const std::vector<gid_t> further =
            groups.any() ? furtherGroupsOf(connection) : std::vector<gid_t>();
        const bool acts = isMember(groups.act, peer.group, further);
        const bool reads = !acts && isMember(groups.read, peer.group, further);
        peer.access = acts ? http::Access::Act : reads ? http::Access::Read : http::Access::None;
        if (acts) peer.reason = "a member of the group " + groups.act->name;
        if (reads) peer.reason = "a member of the read-only group " + groups.read->name;
    }
}

}  // namespace

http::Peer peerOf(int connection, const AccessGroups& groups) {
    ucred found{};
    socklen_t length = sizeof found;
    if (::getsockopt(connection, SOL_SOCKET, SO_PEERCRED, &found, &length) != 0) return {};
    http::Peer peer{found.pid, found.uid, found.gid, http::Access::None, ""};
    judge(peer, connection, groups);
    return peer;
}

http::Door doorFor(const AccessGroups& groups) {
    return {[groups](int connection) { return peerOf(connection, groups); }, servedUsers(groups)};
}

std::string servedUsers(const AccessGroups& groups) {
    if (!groups.any()) return "this host serves its own user only";
    std::string text = "this host serves root, its own user";
    if (groups.act && groups.read) {
        return text + ", the group " + groups.act->name + " and, for reading, the group " +
               groups.read->name + " only";
    }
    if (groups.act) return text + " and the group " + groups.act->name + " only";
    return text + " and, for reading, the group " + groups.read->name + " only";
}

}  // namespace host
