/// Connections of tests to servers of their own.
#pragma once

#include <chrono>
#include <memory>
#include <stdexcept>
#include <utility>

#include "fleet/bus/nats/connection.h"
#include "support/fleet/nats_server.h"

namespace connecting {

/// Long enough for any answer of a server on this machine; a test that needs it all has failed.
inline constexpr std::chrono::seconds kPatience(60);

inline fleet::ConnectionOptions optionsFor(const NatsServer& server) {
    fleet::ConnectionOptions options;
    options.urls = {server.url()};
    options.reconnectWait = std::chrono::milliseconds(1);
    options.reconnectJitter = std::chrono::milliseconds(0);
    return options;
}

inline std::unique_ptr<fleet::Connection> connected(const fleet::ConnectionOptions& options) {
    fleet::Connection::Result result = fleet::Connection::connect(options);
    if (!result.connection) throw std::runtime_error(result.text);
    return std::move(result.connection);
}

inline std::unique_ptr<fleet::Connection> connectedTo(const NatsServer& server) {
    return connected(optionsFor(server));
}

}  // namespace connecting
