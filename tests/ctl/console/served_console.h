/// A console that is served in this process, and a browser in front of it.
#pragma once

#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "ctl/console/browser.h"
#include "ctl/console/console_server.h"
#include "ctl/console/host/host_backend.h"

namespace console_test {

/// A page of a few bytes. What is said to be compressed is not.
inline std::vector<console::PageFile> smallPage() {
    return {{"/index.html", "text/html; charset=utf-8", "<!doctype html>", "small html"},
            {"/app.js", "text/javascript; charset=utf-8", "run()", "small js"}};
}

inline console::ConsoleSettings smallConsole() {
    console::ConsoleSettings settings;
    settings.page = smallPage();
    return settings;
}

inline console::HostSettings hostAt(const std::string& socket) {
    console::HostSettings settings;
    settings.host = {socket, socket + ".rpc", std::chrono::seconds(20)};
    return settings;
}

/// A server on a thread of its own.
class RunningConsole {
public:
    RunningConsole(std::unique_ptr<console::Backend> backend, console::ConsoleSettings settings)
        : backend_(std::move(backend)),
          server_(std::move(settings), *backend_, 0),
          serving_([this] { server_.run(); }) {}
    ~RunningConsole() {
        server_.stop();
        serving_.join();
    }
    RunningConsole(const RunningConsole&) = delete;
    RunningConsole& operator=(const RunningConsole&) = delete;

    std::string link() const { return server_.link(); }

private:
    const std::unique_ptr<console::Backend> backend_;
    console::ConsoleServer server_;
    std::thread serving_;
};

class ServedConsole : private RunningConsole, public Browser {
public:
    explicit ServedConsole(std::unique_ptr<console::Backend> backend,
                           console::ConsoleSettings settings = smallConsole())
        : RunningConsole(std::move(backend), std::move(settings)), Browser(link()) {}
    explicit ServedConsole(console::HostSettings host,
                           console::ConsoleSettings settings = smallConsole())
        : ServedConsole(std::make_unique<console::HostBackend>(std::move(host)),
                        std::move(settings)) {}
    explicit ServedConsole(const std::string& socket) : ServedConsole(hostAt(socket)) {}
};

}  // namespace console_test
