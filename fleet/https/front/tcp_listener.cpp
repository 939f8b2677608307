#include "fleet/https/front/tcp_listener.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>

#include <cerrno>
#include <cstring>
#include <optional>
#include <system_error>

#include "fleet/https/front/front_error.h"

namespace fleet {
namespace {

/// A storm of clients waits here while the handshakes of the first ones go on.
constexpr int kBacklog = 4096;
constexpr int kSilenceSeconds = 60;  ///< after which a client is asked whether it is still there
constexpr int kProbeSeconds = 15;
constexpr int kProbes = 4;
/// For what was sent and is not acknowledged, or not taken.
constexpr int kUnacknowledgedMilliseconds = 120'000;
/// The network of an IPv6 address; one client has as many addresses in it as it likes.
constexpr std::size_t kNetworkBytes = 8;

union SocketAddress {
    sockaddr any;
    sockaddr_in v4;
    sockaddr_in6 v6;
};

[[noreturn]] void refuseAddress(const std::string& address, std::uint16_t port,
                                const std::string& why) {
    throw FrontError("cannot listen on " + (address.empty() ? "port " : address + " port ") +
                     std::to_string(port) + ": " + why);
}

void set(int socket, int level, int option, int value) {
    ::setsockopt(socket, level, option, &value, sizeof value);
}

/// Nothing if the text is no address of either kind.
std::optional<SocketAddress> addressOf(const std::string& text, std::uint16_t port) {
    SocketAddress address{};
    if (::inet_pton(AF_INET, text.c_str(), &address.v4.sin_addr) == 1) {
        address.v4.sin_family = AF_INET;
        address.v4.sin_port = htons(port);
        return address;
    }
    address = {};
    if (::inet_pton(AF_INET6, text.c_str(), &address.v6.sin6_addr) == 1) {
        address.v6.sin6_family = AF_INET6;
        address.v6.sin6_port = htons(port);
        return address;
    }
    return std::nullopt;
}

/// None, with errno, if the machine does not allow it.
sys::FileDescriptor listenAt(const SocketAddress& address) {
    const int family = address.any.sa_family;
    sys::FileDescriptor listener(::socket(family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!listener) return {};
    // Connections of the process before this one may still be ending.
    set(listener.get(), SOL_SOCKET, SO_REUSEADDR, 1);
    if (family == AF_INET6) set(listener.get(), IPPROTO_IPV6, IPV6_V6ONLY, 0);
    const socklen_t length = family == AF_INET ? sizeof address.v4 : sizeof address.v6;
    if (::bind(listener.get(), &address.any, length) != 0) return {};
    if (::listen(listener.get(), kBacklog) != 0) return {};
    return listener;
}

bool isWithoutIpv6(int error) {
    return error == EAFNOSUPPORT || error == EADDRNOTAVAIL;
}

std::string originOf(const SocketAddress& address) {
    if (address.any.sa_family == AF_INET) {
        return std::string(reinterpret_cast<const char*>(&address.v4.sin_addr),
                           sizeof address.v4.sin_addr);
    }
    const auto* const bytes = reinterpret_cast<const char*>(&address.v6.sin6_addr);
    if (IN6_IS_ADDR_V4MAPPED(&address.v6.sin6_addr)) return std::string(bytes + 12, 4);
    return std::string(bytes, kNetworkBytes);
}

void prepareClient(int connection) {
    set(connection, IPPROTO_TCP, TCP_NODELAY, 1);
    set(connection, SOL_SOCKET, SO_KEEPALIVE, 1);
    set(connection, IPPROTO_TCP, TCP_KEEPIDLE, kSilenceSeconds);
    set(connection, IPPROTO_TCP, TCP_KEEPINTVL, kProbeSeconds);
    set(connection, IPPROTO_TCP, TCP_KEEPCNT, kProbes);
    set(connection, IPPROTO_TCP, TCP_USER_TIMEOUT, kUnacknowledgedMilliseconds);
}

}  // namespace

sys::FileDescriptor listenOn(const std::string& address, std::uint16_t port) {
    const auto wanted = addressOf(address.empty() ? "::" : address, port);
    if (!wanted) refuseAddress(address, port, "\"" + address + "\" is no IP address");
    sys::FileDescriptor listener = listenAt(*wanted);
    if (!listener && address.empty() && isWithoutIpv6(errno)) {
        listener = listenAt(*addressOf("0.0.0.0", port));
    }
    if (!listener) refuseAddress(address, port, std::generic_category().message(errno));
    return listener;
}

std::uint16_t portOf(const sys::FileDescriptor& listener) {
    SocketAddress address{};
    socklen_t length = sizeof address;
    if (::getsockname(listener.get(), &address.any, &length) != 0) {
        throw FrontError("the port is not known: " + std::generic_category().message(errno));
    }
    return ntohs(address.any.sa_family == AF_INET ? address.v4.sin_port : address.v6.sin6_port);
}

AcceptedClient acceptClient(int listener) {
    SocketAddress address{};
    socklen_t length = sizeof address;
    AcceptedClient client;
    client.connection = sys::FileDescriptor(
        ::accept4(listener, &address.any, &length, SOCK_CLOEXEC | SOCK_NONBLOCK));
    if (!client.connection) return client;
    client.origin = originOf(address);
    prepareClient(client.connection.get());
    return client;
}

}  // namespace fleet
