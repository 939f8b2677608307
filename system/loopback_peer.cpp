#include "system/loopback_peer.h"

#include <linux/inet_diag.h>
#include <linux/netlink.h>
#include <linux/sock_diag.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>

#include <cerrno>
#include <cstring>

#include "system/file_descriptor.h"

namespace sys {
namespace {

/// A request for one connection, as the kernel reads it.
struct DiagnosisRequest {
    nlmsghdr head{};
    inet_diag_req_v2 body{};
};

/// The connection as its other end sees it. Nothing if the socket has no such ends.
std::optional<inet_diag_sockid> otherEnd(int accepted) {
    sockaddr_in own{};
    sockaddr_in peer{};
    socklen_t ownSize = sizeof own;
    socklen_t peerSize = sizeof peer;
    if (::getsockname(accepted, reinterpret_cast<sockaddr*>(&own), &ownSize) != 0 ||
        ::getpeername(accepted, reinterpret_cast<sockaddr*>(&peer), &peerSize) != 0 ||
        own.sin_family != AF_INET || peer.sin_family != AF_INET) {
        return std::nullopt;
    }
    inet_diag_sockid id{};
    id.idiag_sport = peer.sin_port;
    id.idiag_dport = own.sin_port;
    id.idiag_src[0] = peer.sin_addr.s_addr;
    id.idiag_dst[0] = own.sin_addr.s_addr;
    id.idiag_cookie[0] = INET_DIAG_NOCOOKIE;
    id.idiag_cookie[1] = INET_DIAG_NOCOOKIE;
    return id;
}

bool ask(int netlink, const inet_diag_sockid& id) {
    DiagnosisRequest request;
    request.head.nlmsg_len = sizeof request;
    request.head.nlmsg_type = SOCK_DIAG_BY_FAMILY;
    request.head.nlmsg_flags = NLM_F_REQUEST;
    request.body.sdiag_family = AF_INET;
    request.body.sdiag_protocol = IPPROTO_TCP;
    request.body.idiag_states = ~0U;
    request.body.id = id;
    sockaddr_nl kernel{};
    kernel.nl_family = AF_NETLINK;
    return ::sendto(netlink, &request, sizeof request, 0,
                    reinterpret_cast<const sockaddr*>(&kernel),
                    sizeof kernel) == static_cast<ssize_t>(sizeof request);
}

/// The kernel answers before the request returns, so there is nothing to wait for.
std::optional<inet_diag_msg> answerOf(int netlink) {
    alignas(nlmsghdr) char buffer[4096];
    ssize_t size;
    do {
        size = ::recv(netlink, buffer, sizeof buffer, MSG_DONTWAIT);
    } while (size == -1 && errno == EINTR);
    nlmsghdr head{};
    if (size < static_cast<ssize_t>(NLMSG_LENGTH(sizeof(inet_diag_msg)))) return std::nullopt;
    std::memcpy(&head, buffer, sizeof head);
    if (head.nlmsg_type != SOCK_DIAG_BY_FAMILY) return std::nullopt;
    inet_diag_msg message{};
    std::memcpy(&message, buffer + NLMSG_HDRLEN, sizeof message);
    return message;
}

}  // namespace

std::optional<uid_t> ownerOfLoopbackPeer(int accepted) {
    const std::optional<inet_diag_sockid> id = otherEnd(accepted);
    if (!id) return std::nullopt;
    const FileDescriptor netlink(::socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_SOCK_DIAG));
    if (!netlink || !ask(netlink.get(), *id)) return std::nullopt;
    const std::optional<inet_diag_msg> found = answerOf(netlink.get());
    // Without such a connection the kernel names whoever listens on its port. And a socket that no
    // process holds any more is shown as root's.
    if (!found || found->idiag_state == TCP_LISTEN || found->idiag_inode == 0 ||
        found->id.idiag_sport != id->idiag_sport || found->id.idiag_dport != id->idiag_dport) {
        return std::nullopt;
    }
    return found->idiag_uid;
}

}  // namespace sys
