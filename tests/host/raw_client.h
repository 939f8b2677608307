/// A client that writes and reads bytes on a Unix socket, well-formed or not.
#pragma once

#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <string>
#include <utility>

#include "support/host/program.h"
#include "system/file_descriptor.h"

class RawClient {
public:
    /// Longer than any wait that a test asks the host for.
    static constexpr std::chrono::seconds kPatience{120};

    explicit RawClient(const std::string& path)
        : descriptor_(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        path.copy(address.sun_path, sizeof address.sun_path - 1);
        connected_ = ::connect(descriptor_, reinterpret_cast<const sockaddr*>(&address),
                               sizeof address) == 0;
    }
    /// On a connection that is there already.
    explicit RawClient(sys::FileDescriptor connection)
        : descriptor_(connection.release()), connected_(descriptor_ >= 0) {}
    RawClient(RawClient&& other) noexcept
        : descriptor_(std::exchange(other.descriptor_, -1)),
          connected_(other.connected_),
          buffer_(std::move(other.buffer_)) {}
    ~RawClient() { close(); }

    bool connected() const { return connected_; }
    int descriptor() const { return descriptor_; }
    void close() {
        if (descriptor_ >= 0) ::close(std::exchange(descriptor_, -1));
    }
    void endSending() { ::shutdown(descriptor_, SHUT_WR); }

    /// False when the other side takes no more.
    bool send(const std::string& bytes) {
        std::size_t sent = 0;
        while (sent < bytes.size()) {
            const ssize_t count =
                ::send(descriptor_, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
            if (count < 0 && errno == EINTR) continue;
            if (count <= 0) return false;
            sent += static_cast<std::size_t>(count);
        }
        return true;
    }

    /// What has come when `end` has come with it, the connection has ended or the time is over.
    std::string readUntil(const std::string& end, std::chrono::milliseconds time = kPatience) {
        const auto deadline = std::chrono::steady_clock::now() + time;
        std::size_t found = std::string::npos;
        while ((found = buffer_.find(end)) == std::string::npos && fill(deadline)) {
        }
        const std::size_t length = found == std::string::npos ? buffer_.size() : found + end.size();
        return take(length);
    }
    std::string readAll(std::chrono::milliseconds time = kPatience) {
        const auto deadline = std::chrono::steady_clock::now() + time;
        while (fill(deadline)) {
        }
        return take(buffer_.size());
    }
    /// True when the other side closes within the time.
    bool isClosed(std::chrono::milliseconds time = kPatience) {
        const auto deadline = std::chrono::steady_clock::now() + time;
        while (!ended_ && fill(deadline)) {
        }
        return ended_;
    }

    struct Answer {
        int status = 0;  ///< 0: none came
        std::string head;
        std::string body;
    };
    /// One answer with a Content-Length.
    Answer readAnswer(std::chrono::milliseconds time = kPatience) {
        Answer answer;
        answer.head = readUntil("\r\n\r\n", time);
        if (answer.head.size() < 12) return answer;
        answer.status = std::atoi(answer.head.c_str() + 9);
        const std::string field = "Content-Length: ";
        const std::size_t at = answer.head.find(field);
        if (at == std::string::npos) return answer;
        const std::size_t length =
            std::strtoul(answer.head.c_str() + at + field.size(), nullptr, 10);
        const auto deadline = std::chrono::steady_clock::now() + time;
        while (buffer_.size() < length && fill(deadline)) {
        }
        answer.body = take(length);
        return answer;
    }

    Answer get(const std::string& target) {
        send("GET " + target + " HTTP/1.1\r\nHost: x\r\n\r\n");
        return readAnswer();
    }
    Answer post(const std::string& target, const std::string& body) {
        sendPost(target, body);
        return readAnswer();
    }
    void sendPost(const std::string& target, const std::string& body) {
        send("POST " + target + " HTTP/1.1\r\nHost: x\r\nContent-Length: " +
             std::to_string(body.size()) + "\r\n\r\n" + body);
    }

private:
    bool fill(std::chrono::steady_clock::time_point deadline) {
        const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
            deadline - std::chrono::steady_clock::now());
        pollfd entry{descriptor_, POLLIN, 0};
        if (left.count() <= 0 || ended_) return false;
        if (::poll(&entry, 1, static_cast<int>(left.count())) <= 0) return false;
        char piece[16384];
        const ssize_t count = ::recv(descriptor_, piece, sizeof piece, 0);
        if (count <= 0) {
            ended_ = true;
            return false;
        }
        buffer_.append(piece, static_cast<std::size_t>(count));
        return true;
    }
    std::string take(std::size_t length) {
        std::string taken = buffer_.substr(0, length);
        buffer_.erase(0, taken.size());
        return taken;
    }

    int descriptor_;
    bool connected_ = false;
    bool ended_ = false;
    std::string buffer_;
};
