/// A host that serves any number of connections, each with the same lie.
#pragma once

#include <sys/socket.h>
#include <sys/un.h>

#include <cstring>
#include <functional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "ctl/client/chunks.h"
#include "support/scratch_dir.h"

namespace ctl_test {

/// One connection of a lying host.
class Victim {
public:
    explicit Victim(int descriptor) : socket_(descriptor) {}

    /// Waits for something of the request, which is its first line at least; lies need no more.
    std::string hear() const {
        char piece[65536];
        const ssize_t length = ::recv(socket_.get(), piece, sizeof piece, 0);
        return {piece, length > 0 ? static_cast<std::size_t>(length) : 0};
    }
    /// False when the client has gone.
    bool send(const std::string& bytes) const {
        std::size_t done = 0;
        while (done < bytes.size()) {
            const ssize_t sent =
                ::send(socket_.get(), bytes.data() + done, bytes.size() - done, MSG_NOSIGNAL);
            if (sent <= 0) return false;
            done += static_cast<std::size_t>(sent);
        }
        return true;
    }
    void sendWithoutEnd(const std::string& bytes) const {
        while (send(bytes))
            continue;
    }
    /// Sends a byte and keeps the client waiting for the next until it goes.
    void drip(char byte) const {
        send(std::string(1, byte));
        awaitEnd();
    }
    void awaitEnd() const {
        char piece[65536];
        while (::recv(socket_.get(), piece, sizeof piece, 0) > 0)
            continue;
    }

private:
    Descriptor socket_;
};

class LyingHost {
public:
    using Lie = std::function<void(const Victim&)>;

    explicit LyingHost(Lie lie)
        : lie_(std::move(lie)), listener_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path().c_str(), sizeof address.sun_path - 1);
        ::bind(listener_.get(), reinterpret_cast<sockaddr*>(&address), sizeof address);
        ::listen(listener_.get(), 16);
        acceptor_ = std::thread([this] { serve(); });
    }
    ~LyingHost() {
        ::shutdown(listener_.get(), SHUT_RDWR);
        acceptor_.join();
    }
    LyingHost(const LyingHost&) = delete;
    LyingHost& operator=(const LyingHost&) = delete;

    std::string path() const { return scratch_.path("host.sock"); }

private:
    /// Ends when the listener is shut down, and with the last of the connections.
    void serve() {
        std::vector<std::thread> lies;
        for (;;) {
            const int accepted = ::accept4(listener_.get(), nullptr, nullptr, SOCK_CLOEXEC);
            if (accepted == -1) break;
            lies.emplace_back([this, accepted] { lie_(Victim(accepted)); });
        }
        for (std::thread& lie : lies)
            lie.join();
    }

    const Lie lie_;
    ScratchDir scratch_;
    Descriptor listener_;
    std::thread acceptor_;
};

}  // namespace ctl_test
