/// A browser in front of a console.
#pragma once

#include <cstdint>
#include <string>

#include "http/tcp_client.h"

namespace console_test {

class Browser {
public:
    /// `link` is the one that the console has printed: "http://127.0.0.1:PORT/open?token=...".
    explicit Browser(const std::string& link)
        : origin_(link.substr(0, link.find("/open"))), opening_(link.substr(origin_.size())) {}

    std::uint16_t port() const {
        return static_cast<std::uint16_t>(std::stoi(origin_.substr(origin_.rfind(':') + 1)));
    }
    const std::string& origin() const { return origin_; }
    std::string host() const { return origin_.substr(std::string("http://").size()); }
    /// The target of the link.
    const std::string& opening() const { return opening_; }

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
        return method + " " + target + " HTTP/1.1\r\nHost: " + host() + "\r\nOrigin: " + origin_ +
               "\r\nX-Zav-Console: 1\r\n" + cookie_ +
               "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
    }

    /// Follows the link. The line with the cookie that it gave.
    const std::string& open() {
        const std::string head = ask(get(opening_)).head;
        const std::string field = "Set-Cookie: ";
        const std::size_t begin = head.find(field) + field.size();
        cookie_ = "Cookie: " + head.substr(begin, head.find(';', begin) - begin) + "\r\n";
        return cookie_;
    }
    /// The line of open().
    const std::string& cookie() const { return cookie_; }

private:
    const std::string origin_;
    const std::string opening_;
    std::string cookie_;
};

}  // namespace console_test
