/// A client that speaks TLS on loopback, and can do everything wrong.
#pragma once

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <openssl/ssl.h>
#include <sys/socket.h>
#include <sys/time.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <utility>

#include "system/file_descriptor.h"

namespace fleet_test {

/// A TCP connection whose operations wait for 20 seconds at most.
class TcpClient {
public:
    /// `from` is its own address, and `receiveBytes` what the system holds for it; the system
    /// chooses what is not given.
    explicit TcpClient(std::uint16_t port, const std::string& address = "127.0.0.1",
                       const std::string& from = "", int receiveBytes = 0) {
        const bool isV6 = address.find(':') != std::string::npos;
        socket_ =
            sys::FileDescriptor(::socket(isV6 ? AF_INET6 : AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
        constexpr timeval kWait{20, 0};
        constexpr int kYes = 1;
        ::setsockopt(socket_.get(), SOL_SOCKET, SO_RCVTIMEO, &kWait, sizeof kWait);
        ::setsockopt(socket_.get(), SOL_SOCKET, SO_SNDTIMEO, &kWait, sizeof kWait);
        ::setsockopt(socket_.get(), IPPROTO_TCP, TCP_NODELAY, &kYes, sizeof kYes);
        if (receiveBytes > 0) {
            ::setsockopt(socket_.get(), SOL_SOCKET, SO_RCVBUF, &receiveBytes, sizeof receiveBytes);
        }
        if (!from.empty()) {
            const sockaddr_in own = addressV4(0, from);
            ::bind(socket_.get(), reinterpret_cast<const sockaddr*>(&own), sizeof own);
        }
        isConnected_ = isV6 ? connectV6(port, address) : connectV4(port, address);
    }

    bool isConnected() const { return isConnected_; }
    int descriptor() const { return socket_.get(); }
    void close() { socket_.reset(); }
    bool sendPlain(const std::string& bytes) {
        return ::send(socket_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL) ==
               static_cast<ssize_t>(bytes.size());
    }
    /// Whether the other side ends the connection in time, whatever it sends before.
    bool isEnded() {
        char piece[4096];
        ssize_t got = 0;
        while ((got = ::recv(socket_.get(), piece, sizeof piece, 0)) > 0) {
        }
        return got == 0 || errno == ECONNRESET;
    }

private:
    static sockaddr_in addressV4(std::uint16_t port, const std::string& address) {
        sockaddr_in at{};
        at.sin_family = AF_INET;
        at.sin_port = htons(port);
        ::inet_pton(AF_INET, address.c_str(), &at.sin_addr);
        return at;
    }
    bool connectV4(std::uint16_t port, const std::string& address) {
        const sockaddr_in at = addressV4(port, address);
        return ::connect(socket_.get(), reinterpret_cast<const sockaddr*>(&at), sizeof at) == 0;
    }
    bool connectV6(std::uint16_t port, const std::string& address) {
        sockaddr_in6 at{};
        at.sin6_family = AF_INET6;
        at.sin6_port = htons(port);
        ::inet_pton(AF_INET6, address.c_str(), &at.sin6_addr);
        return ::connect(socket_.get(), reinterpret_cast<const sockaddr*>(&at), sizeof at) == 0;
    }

    sys::FileDescriptor socket_;
    bool isConnected_ = false;
};

/// It takes any certificate, and tells which. A program that uses it ignores SIGPIPE.
class TlsClient {
public:
    explicit TlsClient(TcpClient connection, int mostVersion = TLS1_3_VERSION)
        : connection_(std::move(connection)),
          context_(SSL_CTX_new(TLS_client_method()), SSL_CTX_free),
          session_(nullptr, SSL_free) {
        SSL_CTX_set_security_level(context_.get(), 0);  // so that it could speak old versions
        SSL_CTX_set_min_proto_version(context_.get(), TLS1_VERSION);
        SSL_CTX_set_max_proto_version(context_.get(), mostVersion);
        session_.reset(SSL_new(context_.get()));
        SSL_set_fd(session_.get(), connection_.descriptor());
        isOpen_ = connection_.isConnected() && SSL_connect(session_.get()) == 1;
    }
    explicit TlsClient(std::uint16_t port) : TlsClient(TcpClient(port)) {}

    /// Whether the handshake was completed.
    bool isOpen() const { return isOpen_; }
    SSL* session() { return session_.get(); }
    TcpClient& connection() { return connection_; }

    /// False when the other side takes no more.
    bool send(const std::string& bytes) {
        return isOpen_ && SSL_write(session_.get(), bytes.data(), static_cast<int>(bytes.size())) ==
                              static_cast<int>(bytes.size());
    }
    /// Says that no more comes, and goes on reading.
    void endSending() { SSL_shutdown(session_.get()); }

    /// Exactly this many bytes; fewer if the connection ends.
    std::string read(std::size_t bytes) {
        while (buffer_.size() < bytes && fill(bytes - buffer_.size())) {
        }
        return take(bytes);
    }
    /// What comes up to `end` and with it; all if it does not come.
    std::string readUntil(const std::string& end) {
        std::size_t found = std::string::npos;
        while ((found = buffer_.find(end)) == std::string::npos && fill(4096)) {
        }
        return take(found == std::string::npos ? buffer_.size() : found + end.size());
    }
    std::string readAll() {
        while (fill(16384)) {
        }
        return take(buffer_.size());
    }
    /// Whether the other side has said that no more comes, which a broken connection has not.
    bool hasEndedWell() { return (SSL_get_shutdown(session_.get()) & SSL_RECEIVED_SHUTDOWN) != 0; }

    struct Answer {
        int status = 0;  ///< 0: none came
        std::string body;
    };
    Answer readAnswer() {
        const std::string head = readUntil("\r\n\r\n");
        if (head.size() < 12) return {};
        const std::string field = "Content-Length: ";
        const std::size_t at = head.find(field);
        const std::size_t length =
            at == std::string::npos ? 0 : std::strtoul(&head[at + field.size()], nullptr, 10);
        return {std::atoi(&head[9]), read(length)};
    }
    Answer get(const std::string& target) {
        send("GET " + target + " HTTP/1.1\r\nHost: x\r\n\r\n");
        return readAnswer();
    }
    Answer post(const std::string& target, const std::string& body) {
        send("POST " + target + " HTTP/1.1\r\nHost: x\r\nContent-Length: " +
             std::to_string(body.size()) + "\r\n\r\n" + body);
        return readAnswer();
    }

private:
    bool fill(std::size_t most) {
        char piece[16384];
        if (!isOpen_) return false;
        const int got = SSL_read(session_.get(), piece,
                                 static_cast<int>(most < sizeof piece ? most : sizeof piece));
        if (got <= 0) return false;
        buffer_.append(piece, static_cast<std::size_t>(got));
        return true;
    }
    std::string take(std::size_t bytes) {
        std::string taken = buffer_.substr(0, bytes);
        buffer_.erase(0, taken.size());
        return taken;
    }

    TcpClient connection_;
    std::unique_ptr<SSL_CTX, decltype(&SSL_CTX_free)> context_;
    std::unique_ptr<SSL, decltype(&SSL_free)> session_;
    bool isOpen_ = false;
    std::string buffer_;
};

}  // namespace fleet_test
