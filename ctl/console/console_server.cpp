#include "ctl/console/console_server.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>

#include <cerrno>
#include <system_error>
#include <utility>

#include "ctl/client/failure.h"

namespace console {
namespace {

constexpr std::chrono::seconds kGrace{5};
constexpr std::size_t kMostConnections = 128;
constexpr std::size_t kWorkers = 16;

void setOption(int socket, int level, int option) {
    constexpr int kOn = 1;
    ::setsockopt(socket, level, option, &kOn, sizeof kOn);
}

[[noreturn]] void refusePort(std::uint16_t port) {
    throw ctl::Failure(ctl::kWrongUsage, "cannot listen on 127.0.0.1 port " + std::to_string(port) +
                                             ": " + std::generic_category().message(errno));
}

sys::FileDescriptor listenOn(std::uint16_t port) {
    sys::FileDescriptor listener(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
    if (!listener) refusePort(port);
    // Connections of the console before this one may still be ending.
    setOption(listener.get(), SOL_SOCKET, SO_REUSEADDR);
    // Connections have it from here: events are small, and are wanted at once.
    setOption(listener.get(), IPPROTO_TCP, TCP_NODELAY);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (::bind(listener.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
        ::listen(listener.get(), SOMAXCONN) != 0) {
        refusePort(port);
    }
    return listener;
}

std::uint16_t portOf(const sys::FileDescriptor& listener) {
    sockaddr_in address{};
    socklen_t length = sizeof address;
    if (::getsockname(listener.get(), reinterpret_cast<sockaddr*>(&address), &length) != 0) {
        refusePort(0);
    }
    return ntohs(address.sin_port);
}

http::ServerLimits limits() {
    http::ServerLimits limits;
    limits.connections = kMostConnections;
    limits.workers = kWorkers;
    return limits;
}

}  // namespace

ConsoleServer::ConsoleServer(ConsoleSettings settings, Backend& backend, std::uint16_t port)
    : listener_(listenOn(port)),
      port_(portOf(listener_)),
      handler_(settings, backend, port_),
      server_(listener_.get(), doorFor(std::move(settings.browsers)), handler_, counts_, limits()) {
}

std::string ConsoleServer::link() const {
    return "http://127.0.0.1:" + std::to_string(port_) + handler_.opening();
}

void ConsoleServer::endWhenReadable(int descriptor, std::function<void()> begins) {
    server_.endWhenReadable(descriptor, kGrace, std::move(begins));
}

}  // namespace console
