/// An HTTPS server whose every word is written by the test.
#pragma once

#include <netinet/in.h>
#include <openssl/ssl.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>

#include "fleet/server/keys/tls/certificate_authority.h"
#include "support/scratch_dir.h"
#include "system/file_descriptor.h"

namespace fleet_test {

/// No operation of the server waits for longer.
constexpr timeval kServerWait{20, 0};

inline fleet::Moment wallTime() {
    return std::chrono::duration_cast<fleet::Moment>(
        std::chrono::system_clock::now().time_since_epoch());
}

/// One accepted connection.
class TlsPeer {
public:
    TlsPeer(SSL_CTX* context, int accepted)
        : socket_(accepted), session_(SSL_new(context), SSL_free) {
        ::setsockopt(accepted, SOL_SOCKET, SO_RCVTIMEO, &kServerWait, sizeof kServerWait);
        SSL_set_fd(session_.get(), accepted);
        isOpen_ = accepted >= 0 && SSL_accept(session_.get()) == 1;
    }

    /// Whether the client has taken the server for the one it wants.
    bool isOpen() const { return isOpen_; }
    /// Reads a request up to the end of its body; "" at the end of the connection.
    std::string request() {
        std::string text;
        while (isOpen_ && text.size() < lengthOf(text)) {
            char piece[4096];
            const int length = SSL_read(session_.get(), piece, sizeof piece);
            if (length <= 0) return {};
            text.append(piece, static_cast<std::size_t>(length));
        }
        return text;
    }
    /// False when the client has gone.
    bool send(const std::string& bytes) {
        return isOpen_ &&
               SSL_write(session_.get(), bytes.data(), static_cast<int>(bytes.size())) > 0;
    }
    void answer(int status, const std::string& body, const std::string& more = "") {
        send("HTTP/1.1 " + std::to_string(status) + " Reason\r\n" + more +
             "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body);
    }
    void endSession() { SSL_shutdown(session_.get()); }

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

    sys::FileDescriptor socket_;
    std::unique_ptr<SSL, decltype(&SSL_free)> session_;
    bool isOpen_ = false;
};

/// Listens on loopback and plays a part in a thread.
class TlsServer {
public:
    using Part = std::function<void(TlsServer&)>;

    TlsServer(const fleet::ServerCertificate& certificate, Part part)
        : context_(SSL_CTX_new(TLS_server_method()), SSL_CTX_free),
          listener_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        ::signal(SIGPIPE, SIG_IGN);  // a client may have gone
        const std::string chain = scratch_.write("chain.pem", certificate.chain);
        const std::string key = scratch_.write("key.pem", std::string(certificate.key.view()));
        if (SSL_CTX_use_certificate_chain_file(context_.get(), chain.c_str()) != 1 ||
            SSL_CTX_use_PrivateKey_file(context_.get(), key.c_str(), SSL_FILETYPE_PEM) != 1) {
            throw std::runtime_error("the server cannot use its certificate");
        }
        listen();
        thread_ = std::thread([this, part = std::move(part)] { part(*this); });
    }
    ~TlsServer() { join(); }
    TlsServer(const TlsServer&) = delete;
    TlsServer& operator=(const TlsServer&) = delete;

    std::string port() const { return std::to_string(port_); }
    std::string url() const { return "https://127.0.0.1:" + port(); }
    SSL_CTX* context() { return context_.get(); }
    /// The next connection; for the part alone. It is not open if none comes.
    TlsPeer accept() {
        return {context_.get(), ::accept4(listener_.get(), nullptr, nullptr, SOCK_CLOEXEC)};
    }
    /// No connection comes from now on.
    void stop() { ::shutdown(listener_.get(), SHUT_RDWR); }
    /// Waits until the part is over. What it has seen may be read after that.
    void join() {
        if (thread_.joinable()) thread_.join();
    }

private:
    void listen() {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t length = sizeof address;
        ::setsockopt(listener_.get(), SOL_SOCKET, SO_RCVTIMEO, &kServerWait, sizeof kServerWait);
        if (::bind(listener_.get(), reinterpret_cast<sockaddr*>(&address), length) != 0 ||
            ::listen(listener_.get(), 4) != 0 ||
            ::getsockname(listener_.get(), reinterpret_cast<sockaddr*>(&address), &length) != 0) {
            throw std::runtime_error("the server cannot listen");
        }
        port_ = ntohs(address.sin_port);
    }

    const ScratchDir scratch_;
    const std::unique_ptr<SSL_CTX, decltype(&SSL_CTX_free)> context_;
    const sys::FileDescriptor listener_;
    unsigned port_ = 0;
    std::thread thread_;
};

}  // namespace fleet_test
