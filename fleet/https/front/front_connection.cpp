#include "fleet/https/front/front_connection.h"

#include <openssl/err.h>
#include <sys/socket.h>

#include <cerrno>
#include <exception>
#include <utility>

namespace fleet {
namespace {

using Error = boost::system::error_code;
constexpr auto kReadable = FrontDescriptor::wait_read;
constexpr auto kWritable = FrontDescriptor::wait_write;

/// What the system holds for a server or a front that does not read.
constexpr int kHeldBytes = 64 * 1024;

bool isMomentary(int error) {
    return error == EAGAIN || error == EWOULDBLOCK || error == EINTR;
}

/// Two connected ends that do not block; none when the process is out of descriptors.
std::pair<sys::FileDescriptor, sys::FileDescriptor> connectedPair() {
    int ends[2];
    if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, ends) != 0) return {};
    for (const int end : ends)
        ::setsockopt(end, SOL_SOCKET, SO_SNDBUF, &kHeldBytes, sizeof kHeldBytes);
    return {sys::FileDescriptor(ends[0]), sys::FileDescriptor(ends[1])};
}

}  // namespace

FrontConnection::FrontConnection(FrontCore& core, sys::FileDescriptor client, TlsSession tls,
                                 std::string origin)
    : core_(core),
      client_(core.io, client.get()),
      server_(core.io),
      tls_(std::move(tls)),
      origin_(std::move(origin)),
      timer_(core.io) {
    client.release();
}

void FrontConnection::begin() {
    ++core_.origins[origin_];
    isOpen_ = true;
    core_.connections.emplace(this, shared_from_this());
    core_.counts.connections.set(core_.connections.size());
    limitTime(core_.limits.handshakeTime);
    await(client_, kReadable, &FrontConnection::shakeHands);
}

void FrontConnection::drop() {
    if (!isOpen_) return;
    isOpen_ = false;
    if (isInHandshake()) core_.counts.failedHandshakes.add();
    timer_.cancel();
    Error ignored;
    client_.close(ignored);
    server_.close(ignored);
    core_.forget(this, origin_);
}

/// A step that fails for want of memory costs this connection only.
void FrontConnection::await(FrontDescriptor& end, FrontDescriptor::wait_type kind, Step next) {
    end.async_wait(kind, [self = shared_from_this(), next](Error error) {
        if (!self->isOpen_) return;
        if (error) return self->drop();
        try {
            (self.get()->*next)();
        } catch (const std::exception&) {
            self->drop();
        }
    });
}

/// Goes on when the client's side can, after a call to OpenSSL that did nothing.
void FrontConnection::awaitClient(int result, Step next) {
    const int wanted = SSL_get_error(tls_.get(), result);
    if (wanted == SSL_ERROR_WANT_READ) return await(client_, kReadable, next);
    if (wanted == SSL_ERROR_WANT_WRITE) return await(client_, kWritable, next);
    drop();
}

void FrontConnection::limitTime(std::chrono::milliseconds time) {
    timer_.expires_after(time);
    timer_.async_wait([weak = weak_from_this()](Error error) {
        const auto self = weak.lock();
        if (!error && self) self->drop();
    });
}

void FrontConnection::shakeHands() {
    ERR_clear_error();
    const int result = SSL_accept(tls_.get());
    if (result != 1) return awaitClient(result, &FrontConnection::shakeHands);
    timer_.cancel();
    connectServer();
}

void FrontConnection::connectServer() {
    auto [ours, theirs] = connectedPair();
    if (!ours) return drop();
    server_.assign(ours.get());
    ours.release();
    core_.take(std::move(theirs));
    // Nobody reads the server's end while the client takes nothing.
    await(server_, FrontDescriptor::wait_error, &FrontConnection::limitEnd);
    await(server_, kReadable, &FrontConnection::readServer);
    readClient();
}

/// The server is over, or sends no more: so is the connection, soon.
void FrontConnection::limitEnd() {
    if (std::exchange(isEndLimited_, true)) return;
    limitTime(core_.limits.drainTime);
}

void FrontConnection::readClient() {
    ERR_clear_error();
    const int got = SSL_read(tls_.get(), core_.piece.data(), static_cast<int>(core_.piece.size()));
    if (got > 0) return passInward({core_.piece.data(), static_cast<std::size_t>(got)});
    if (SSL_get_error(tls_.get(), got) == SSL_ERROR_ZERO_RETURN) return endInward();
    awaitClient(got, &FrontConnection::readClient);
}

/// `piece` may be what is left in inward_.
void FrontConnection::passInward(std::string_view piece) {
    const Sent sent = isServerGone_ ? Sent::All : sendToServer(piece);
    if (sent == Sent::Part) {
        inward_ = std::string(piece);
        return await(server_, kWritable, &FrontConnection::passRestInward);
    }
    if (sent == Sent::Gone) isServerGone_ = true;
    inward_ = {};
    await(client_, kReadable, &FrontConnection::readClient);
}

/// Takes what was sent off the piece.
FrontConnection::Sent FrontConnection::sendToServer(std::string_view& piece) {
    const ssize_t sent =
        ::send(server_.native_handle(), piece.data(), piece.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
    if (sent < 0) return isMomentary(errno) ? Sent::Part : Sent::Gone;
    piece.remove_prefix(static_cast<std::size_t>(sent));
    return piece.empty() ? Sent::All : Sent::Part;
}

void FrontConnection::endInward() {
    isInwardOver_ = true;
    ::shutdown(server_.native_handle(), SHUT_WR);
    endIfBothAreOver();
}

void FrontConnection::readServer() {
    const ssize_t got =
        ::recv(server_.native_handle(), core_.piece.data(), core_.piece.size(), MSG_DONTWAIT);
    if (got > 0) return passOutward({core_.piece.data(), static_cast<std::size_t>(got)});
    if (got < 0 && isMomentary(errno)) {
        return await(server_, kReadable, &FrontConnection::readServer);
    }
    // Closed with or without having read all that the client sent.
    limitEnd();
    endOutward();
}

/// `piece` may be what is left in outward_.
void FrontConnection::passOutward(std::string_view piece) {
    while (!piece.empty()) {
        ERR_clear_error();
        const int sent = SSL_write(tls_.get(), piece.data(), static_cast<int>(piece.size()));
        if (sent <= 0) {
            outward_ = std::string(piece);
            return awaitClient(sent, &FrontConnection::passRestOutward);
        }
        piece.remove_prefix(static_cast<std::size_t>(sent));
    }
    outward_ = {};
    await(server_, kReadable, &FrontConnection::readServer);
}

/// Says that nothing more comes. Then the client reads what it has, and closes: closing before it
/// would reset the connection, and lose what is on the way.
void FrontConnection::endOutward() {
    ERR_clear_error();
    const int result = SSL_shutdown(tls_.get());
    if (result < 0) return awaitClient(result, &FrontConnection::endOutward);
    ::shutdown(client_.native_handle(), SHUT_WR);
    isOutwardOver_ = true;
    endIfBothAreOver();
}

void FrontConnection::endIfBothAreOver() {
    if (isInwardOver_ && isOutwardOver_) drop();
}

}  // namespace fleet
