/// The console on a port of this machine.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>

#include "ctl/console/console_handler.h"
#include "http/server.h"
#include "http/server_counts.h"
#include "system/file_descriptor.h"

namespace console {

/// Listens on 127.0.0.1 only.
class ConsoleServer {
public:
    /// Port 0 is any that is free; the backend outlives the server. Throws ctl::Failure if the port
    /// cannot be had, and std::runtime_error.
    ConsoleServer(ConsoleSettings settings, Backend& backend, std::uint16_t port);
    ConsoleServer(const ConsoleServer&) = delete;
    ConsoleServer& operator=(const ConsoleServer&) = delete;

    std::uint16_t port() const { return port_; }
    /// The link that opens the console, once.
    std::string link() const;

    /// Serves on the calling thread until the server has ended.
    void run() { server_.run(); }
    /// Makes run() return as soon as it can. Any thread.
    void stop() { server_.stop(); }
    /// Calls `begins` when `descriptor` becomes readable, lets what changes something end within
    /// some seconds, and then run() returns. Before run().
    void endWhenReadable(int descriptor, std::function<void()> begins);

private:
    const sys::FileDescriptor listener_;
    const std::uint16_t port_;
    ConsoleHandler handler_;
    http::ServerCounts counts_;
    http::HttpServer server_;
};

}  // namespace console
