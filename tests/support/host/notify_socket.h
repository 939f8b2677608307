/// What a service manager would hear: the receiving end of the notify protocol.
#pragma once

#include <gtest/gtest.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstddef>
#include <string>

class NotifySocket {
public:
    /// At a path, or with '@' in front in the abstract name space.
    explicit NotifySocket(const std::string& address)
        : descriptor_(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
        sockaddr_un name{};
        name.sun_family = AF_UNIX;
        address.copy(name.sun_path, sizeof name.sun_path - 1);
        const bool isAbstract = address.front() == '@';
        if (isAbstract) name.sun_path[0] = '\0';
        const auto length = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) +
                                                   address.size() + (isAbstract ? 0U : 1U));
        EXPECT_EQ(::bind(descriptor_, reinterpret_cast<const sockaddr*>(&name), length), 0);
    }
    ~NotifySocket() { ::close(descriptor_); }
    NotifySocket(const NotifySocket&) = delete;
    NotifySocket& operator=(const NotifySocket&) = delete;

    /// The next message; "" if none comes in time.
    std::string next(std::chrono::milliseconds limit = std::chrono::seconds(60)) const {
        pollfd readable{descriptor_, POLLIN, 0};
        if (::poll(&readable, 1, static_cast<int>(limit.count())) != 1) return "";
        char text[4096];
        const ssize_t length = ::recv(descriptor_, text, sizeof text, 0);
        return length < 0 ? "" : std::string(text, static_cast<std::size_t>(length));
    }
    /// Reads messages until one begins so; that one, or "" if none comes in time.
    std::string await(const std::string& beginning) const {
        for (std::string message = next(); !message.empty(); message = next()) {
            if (message.rfind(beginning, 0) == 0) return message;
        }
        return "";
    }

private:
    const int descriptor_;
};
