#include "ncs/listener.h"
#include "system/loopback_peer.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <sys/types.h>

#include <cerrno>
#include <optional>
#include <system_error>

namespace ncs {
namespace {

int domainOf(int socket) {
    int domain = 0;
    socklen_t size = sizeof domain;
    checked(::getsockopt(socket, SOL_SOCKET, SO_DOMAIN, &domain, &size), "listening socket");
    return domain;
}

std::optional<uid_t> userOfUnixPeer(int accepted) {
    ucred peer{};
    socklen_t size = sizeof peer;
    if (::getsockopt(accepted, SOL_SOCKET, SO_PEERCRED, &peer, &size) != 0) return std::nullopt;
    return peer.uid;
}

}  // namespace

int checked(int result, const char* what) {
    if (result == -1) throw std::system_error(errno, std::generic_category(), what);
    return result;
}

Listener::Listener(int listeningSocket, std::string portText, Admission admission)
    : Source(Kind::Listener),
      socket(listeningSocket),
      port(std::move(portText)),
      isUnix(domainOf(listeningSocket) == AF_UNIX),
      judge(std::move(admission)) {
    const int flags = checked(::fcntl(socket, F_GETFL), "listening socket");
    checked(::fcntl(socket, F_SETFL, flags | O_NONBLOCK), "listening socket");
}

bool Listener::admits(int accepted) const {
    if (!isUnix) {
        // Clients wait for answers, which are small.
        const int on = 1;
        ::setsockopt(accepted, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    }
    if (isUnix && judge) return judge(accepted);
    const std::optional<uid_t> user =
        isUnix ? userOfUnixPeer(accepted) : sys::ownerOfLoopbackPeer(accepted);
    return user && (*user == ::geteuid() || *user == 0);
}

Descriptor loopbackSocket(std::uint16_t& port) {
    Descriptor made(
        checked(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0), "TCP socket"));
    const int on = 1;
    checked(::setsockopt(made.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on), "TCP socket");
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    auto* const generic = reinterpret_cast<sockaddr*>(&address);
    checked(::bind(made.get(), generic, sizeof address), "TCP port");
    checked(::listen(made.get(), SOMAXCONN), "TCP port");
    socklen_t size = sizeof address;
    checked(::getsockname(made.get(), generic, &size), "TCP port");
    port = ntohs(address.sin_port);
    return made;
}

}  // namespace ncs
