/// A host whose every word is written by the test.
#pragma once

#include <sys/socket.h>
#include <sys/un.h>

#include <cstring>
#include <functional>
#include <string>
#include <thread>
#include <utility>

#include "ctl/client/chunks.h"
#include "support/scratch_dir.h"

namespace ctl_test {

/// One accepted connection.
class Peer {
public:
    explicit Peer(int descriptor) : socket_(descriptor) {}

    /// Reads a request up to the end of its body.
    std::string request() const {
        std::string text;
        while (text.size() < lengthOf(text)) {
            char piece[4096];
            const ssize_t length = ::recv(socket_.get(), piece, sizeof piece, 0);
            if (length <= 0) break;
            text.append(piece, static_cast<std::size_t>(length));
        }
        return text;
    }
    void send(const std::string& bytes) const {
        ::send(socket_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
    }
    void answer(int status, const std::string& body) const {
        send("HTTP/1.1 " + std::to_string(status) +
             " Reason\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body);
    }
    void beginStream() const {
        send("HTTP/1.1 200 OK\r\nContent-Type: text/event-stream\r\nConnection: close\r\n\r\n");
    }

private:
    /// How long the request is to be, as far as its beginning says.
    static std::size_t lengthOf(const std::string& text) {
        const std::size_t head = text.find("\r\n\r\n");
        if (head == std::string::npos) return std::string::npos;
        const std::string name = "Content-Length: ";
        const std::size_t field = text.find(name);
        return head + 4 +
               (field < head ? std::stoul(text.substr(field + name.size())) : std::size_t{0});
    }

    Descriptor socket_;
};

/// Listens on a socket of its own and plays a part in a thread.
class CannedHost {
public:
    using Part = std::function<void(CannedHost&)>;

    explicit CannedHost(Part part) : listener_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path().c_str(), sizeof address.sun_path - 1);
        ::bind(listener_.get(), reinterpret_cast<sockaddr*>(&address), sizeof address);
        ::listen(listener_.get(), 4);
        thread_ = std::thread([this, part = std::move(part)] { part(*this); });
    }
    ~CannedHost() { join(); }
    CannedHost(const CannedHost&) = delete;
    CannedHost& operator=(const CannedHost&) = delete;

    std::string path() const { return scratch_.path("host.sock"); }
    /// Waits until the part is over. What it has seen may be read after that.
    void join() {
        if (thread_.joinable()) thread_.join();
    }
    /// The next connection; for the part alone.
    Peer accept() const { return Peer(::accept(listener_.get(), nullptr, nullptr)); }

private:
    ScratchDir scratch_;
    Descriptor listener_;
    std::thread thread_;
};

}  // namespace ctl_test
