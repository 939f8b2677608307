/// What a front allows its clients.
#pragma once

#include <chrono>
#include <cstddef>

namespace fleet {

struct FrontLimits {
    std::size_t connections = 2048;  ///< at a time; further clients wait to be accepted
    /// Of those the ones from one IPv4 address or one IPv6 network of 64 bits, so that nobody shuts
    /// the others out; further ones are closed at once.
    std::size_t fromOneOrigin = 512;
    std::chrono::milliseconds handshakeTime{30'000};
    std::chrono::milliseconds drainTime{30'000};  ///< for the client to take what the server left
};

}  // namespace fleet
