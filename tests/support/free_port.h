/// Ports for programs that are told beforehand where to listen.
#pragma once

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdint>
#include <random>

/// A port that nobody listens on, below those that the system gives to outgoing connections, which
/// could take it before the program does.
inline std::uint16_t freePort() {
    std::random_device dice;
    std::uniform_int_distribution<std::uint16_t> ports(12000, 31999);
    for (;;) {
        const std::uint16_t port = ports(dice);
        const int descriptor = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(port);
        const bool isFree =
            ::bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
        ::close(descriptor);
        if (isFree) return port;
    }
}
