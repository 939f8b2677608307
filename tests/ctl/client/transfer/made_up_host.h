/// A host as far as a client of the file transfer sees it: it does what a test says.
#pragma once

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <cstring>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "ctl/client/chunks.h"
#include "support/scratch_dir.h"

namespace ctl_test {

/// The host's end of a connection.
class HostConnection {
public:
    HostConnection(int accepted, int number) : socket_(accepted), number_(number) {}

    /// Connections are counted from 0.
    int number() const { return number_; }
    /// The next packet of the client; empty at the end.
    std::string packet() const {
        std::string bytes = take(16);
        if (bytes.size() < 16) return "";
        return bytes + take((numberAt(bytes, 8) & 0xFFFF) - 16);
    }
    /// The data of the client's next request, whose fragments are put together; empty at the end.
    std::string request() const {
        std::string data;
        for (;;) {
            const std::string fragment = packet();
            if (fragment.empty()) return "";
            data += fragment.substr(24);
            if ((fragment[3] & 2) != 0) return data;
        }
    }
    void send(const std::string& bytes) const {
        ::send(socket_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
    }
    /// Sends a single byte; false when the client has gone.
    bool trySend(const char* byte) const {
        return ::send(socket_.get(), byte, 1, MSG_NOSIGNAL) == 1;
    }
    /// Takes a bind and accepts it, with the largest fragment that is taken.
    void bind(unsigned largest) const {
        packet();
        std::string ack("\5\0\x0c\3\x10\0\0\0\x38\0\0\0\1\0\0\0\0\x10", 18);
        ack += static_cast<char>(largest & 0xFFU);
        ack += static_cast<char>(largest >> 8);
        ack += std::string("\1\0\0\0\0\0\0\0\1\0\0\0\0\0\0\0", 16) + std::string(20, '\0');
        send(ack);
    }
    /// Answers with a packet of that type: 2 for a response, 3 for a fault.
    void answer(unsigned type, std::uint32_t value) const {
        std::string bytes("\5\0\0\3\x10\0\0\0\x1c\0\0\0\2\0\0\0\4\0\0\0\0\0\0\0", 24);
        bytes[2] = static_cast<char>(type);
        for (unsigned i = 0; i < 4; ++i)
            bytes += static_cast<char>(value >> (8 * i) & 0xFFU);
        send(bytes);
    }

private:
    std::string take(std::size_t count) const {
        std::string bytes(count, '\0');
        std::size_t got = 0;
        while (got < count) {
            const ssize_t length = ::recv(socket_.get(), &bytes[got], count - got, 0);
            if (length <= 0) break;
            got += static_cast<std::size_t>(length);
        }
        bytes.resize(got);
        return bytes;
    }

    Descriptor socket_;
    int number_;
};

/// Plays its part on each connection, on a thread of its own.
class MadeUpHost {
public:
    using Part = std::function<void(HostConnection&)>;

    /// Waits for as many connections and no more.
    explicit MadeUpHost(Part part, int connections = 1)
        : listener_(::socket(AF_UNIX, SOCK_STREAM, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path().c_str(), sizeof address.sun_path - 1);
        EXPECT_EQ(::bind(listener_.get(), reinterpret_cast<sockaddr*>(&address), sizeof address),
                  0);
        EXPECT_EQ(::listen(listener_.get(), connections), 0);
        for (int i = 0; i < connections; ++i)
            threads_.emplace_back([this, part, i] {
                HostConnection connection(::accept(listener_.get(), nullptr, nullptr), i);
                part(connection);
            });
    }
    ~MadeUpHost() { join(); }
    MadeUpHost(const MadeUpHost&) = delete;
    MadeUpHost& operator=(const MadeUpHost&) = delete;

    std::string path() const { return scratch_.path("host.rpc"); }
    /// Waits until the parts are played.
    void join() {
        for (std::thread& thread : threads_) {
            if (thread.joinable()) thread.join();
        }
    }

private:
    ScratchDir scratch_;
    Descriptor listener_;
    std::vector<std::thread> threads_;
};

}  // namespace ctl_test
