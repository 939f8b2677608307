#include "request/connection.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <stdexcept>

namespace request {

namespace {

template <typename Address>
int connectTo(int family, const Address& address) {
    const int descriptor = ::socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (::connect(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        ::close(descriptor);
        throw std::runtime_error("cannot connect");
    }
    return descriptor;
}

}  // namespace

Connection::Connection(const std::string& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    if (path.size() >= sizeof address.sun_path) throw std::runtime_error("name too long");
    std::memcpy(address.sun_path, path.c_str(), path.size());
    descriptor_ = connectTo(AF_UNIX, address);
}

Connection::Connection(std::uint16_t port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    descriptor_ = connectTo(AF_INET, address);
    const int on = 1;
    ::setsockopt(descriptor_, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
}

Connection::~Connection() {
    ::close(descriptor_);
}

void Connection::send(const std::string& bytes) {
    for (std::size_t sent = 0; sent < bytes.size();) {
        const ssize_t count =
            ::send(descriptor_, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
        if (count <= 0) throw std::runtime_error("cannot send");
        sent += static_cast<std::size_t>(count);
    }
}

bool Connection::receive(std::string& bytes) {
    char piece[16384];
    const ssize_t count = ::recv(descriptor_, piece, sizeof piece, 0);
    if (count < 0) throw std::runtime_error("cannot receive");
    bytes.append(piece, static_cast<std::size_t>(count));
    return count > 0;
}

std::string Connection::receiveAll() {
    std::string bytes;
    while (receive(bytes)) {
    }
    return bytes;
}

}  // namespace request
