/// A console that is served, and a browser in front of it.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "ctl/console/console_server.h"
#include "http/tcp_client.h"

namespace console_test {

/// A page of a few bytes. What is said to be compressed is not.
inline std::vector<console::PageFile> smallPage() {
    return {{"/index.html", "text/html; charset=utf-8", "<!doctype html>", "small html"},
            {"/app.js", "text/javascript; charset=utf-8", "run()", "small js"}};
}

inline console::ConsoleSettings settingsFor(const std::string& socket) {
    console::ConsoleSettings settings;
    settings.host = {socket, socket + ".rpc", std::chrono::seconds(20)};
    settings.page = smallPage();
    return settings;
}

class ServedConsole {
public:
    explicit ServedConsole(const std::string& socket) : ServedConsole(settingsFor(socket)) {}
    explicit ServedConsole(console::ConsoleSettings settings)
        : server_(std::move(settings), 0), serving_([this] { server_.run(); }) {}
    ~ServedConsole() {
        server_.stop();
        serving_.join();
    }
    ServedConsole(const ServedConsole&) = delete;
    ServedConsole& operator=(const ServedConsole&) = delete;

    std::uint16_t port() const { return server_.port(); }
    std::string origin() const { return "http://" + host(); }
    std::string host() const { return "127.0.0.1:" + std::to_string(port()); }
    /// The target of the link.
    std::string opening() const { return server_.link().substr(origin().size()); }

    RawClient connect() const { return http_test::tcpClient(port()); }
    RawClient::Answer ask(const std::string& request) const {
        RawClient client = connect();
        client.send(request);
        return client.readAnswer();
    }

    /// A GET with these lines, each with its end, behind that of the host.
    std::string get(const std::string& target, const std::string& lines = "") const {
        return "GET " + target + " HTTP/1.1\r\nHost: " + host() + "\r\n" + lines + "\r\n";
    }
    /// A request of the page's own with a body.
    std::string send(const std::string& method, const std::string& target,
                     const std::string& body) const {
        return method + " " + target + " HTTP/1.1\r\nHost: " + host() + "\r\nOrigin: " + origin() +
               "\r\nX-Zav-Console: 1\r\n" + cookie_ +
               "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
    }

    /// Follows the link. The line with the cookie that it gave.
    const std::string& open() {
        const std::string head = ask(get(opening())).head;
        const std::string field = "Set-Cookie: ";
        const std::size_t begin = head.find(field) + field.size();
        cookie_ = "Cookie: " + head.substr(begin, head.find(';', begin) - begin) + "\r\n";
        return cookie_;
    }
    /// The line of open().
    const std::string& cookie() const { return cookie_; }

private:
    console::ConsoleServer server_;
    std::thread serving_;
    std::string cookie_;
};

}  // namespace console_test
