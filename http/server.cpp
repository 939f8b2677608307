#include "http/server.h"

#include <fcntl.h>
#include <sys/socket.h>

#include <algorithm>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/posix/stream_descriptor.hpp>
#include <boost/asio/post.hpp>
#include <cerrno>
#include <exception>
#include <stdexcept>
#include <string_view>
#include <utility>
#include <vector>

#include "http/server_core.h"
#include "http/session.h"
#include "http/turned_away.h"
#include "system/file_descriptor.h"

namespace http {
namespace {

namespace net = boost::asio;
using Clock = std::chrono::steady_clock;
using Error = boost::system::error_code;

/// How long accepting pauses when the process is out of descriptors.
constexpr std::chrono::milliseconds kAcceptPause{100};
/// How often a server that is ending checks whether everything is done.
constexpr std::chrono::milliseconds kEndPoll{10};
/// How long clients have to take what is left for them once nothing else is under way.
constexpr std::chrono::milliseconds kFlushTime{1'000};

int duplicate(int descriptor) {
    const int copy = ::fcntl(descriptor, F_DUPFD_CLOEXEC, 0);
    if (copy < 0) throw std::runtime_error("out of file descriptors");
    return copy;
}

int familyOf(int connection) {
    int family = AF_UNIX;
    socklen_t length = sizeof family;
    ::getsockopt(connection, SOL_SOCKET, SO_DOMAIN, &family, &length);
    return family;
}

}  // namespace

using Descriptor = net::posix::basic_stream_descriptor<net::io_context::executor_type>;

/// Something beside clients that the I/O thread attends to.
struct Watched {
    Watched(net::io_context& io, int descriptor, std::chrono::milliseconds wait,
            std::function<void()> action)
        : readable(io, descriptor), timer(io), delay(wait), act(std::move(action)) {}

    void await() {
        readable.async_wait(net::posix::descriptor_base::wait_read, [this](Error error) {
            if (error) return;
            if (delay.count() == 0) return attend();
            timer.expires_after(delay);
            timer.async_wait([this](Error cancelled) {
                if (!cancelled) attend();
            });
        });
    }
    void attend() {
        act();
        await();
    }

    Descriptor readable;
    Timer timer;
    const std::chrono::milliseconds delay;
    const std::function<void()> act;
};

struct HttpServer::Implementation {
    Implementation(int listenerDescriptor, Door clientsDoor, Handler& handler, ServerCounts& counts,
                   const ServerLimits& limits)
        : door(std::move(clientsDoor)),
          core(handler, counts, limits),
          goesOn(core.io.get_executor()),
          listener(core.io),
          signal(core.io),
          timer(core.io),
          regular(core.io) {
        if (listenerDescriptor >= 0) listener.assign(duplicate(listenerDescriptor));
    }

    void awaitConnection();
    void acceptAll();
    void admit(sys::FileDescriptor connection);
    void refuse(sys::FileDescriptor connection, const Peer& peer, unsigned status,
                std::string_view text);
    std::shared_ptr<HttpSession> sessionOn(sys::FileDescriptor connection, const Peer& peer);
    void closeListener();
    void beginEnd(std::chrono::milliseconds grace);
    void pollEnd();
    void pollFlush(Clock::time_point deadline);
    void awaitRegular();
    template <typename Next>
    void after(std::chrono::milliseconds time, Next next);

    const Door door;
    ServerCore core;
    /// Without a listener there may be nothing to wait for until somebody brings a connection.
    const net::executor_work_guard<net::io_context::executor_type> goesOn;
    Descriptor listener;
    Descriptor signal;
    std::vector<std::unique_ptr<Watched>> watched;
    Timer timer;
    Clock::time_point deadline;
    bool leavesListenerOpen = false;
    Timer regular;
    std::chrono::milliseconds regularTime{0};
    std::function<void()> regularAct;
};

void HttpServer::Implementation::awaitConnection() {
    listener.async_wait(net::posix::descriptor_base::wait_read, [this](Error error) {
        if (!error && !core.ending) acceptAll();
    });
}

/// Uses accept4, because the library's own accept makes descriptors that children inherit.
void HttpServer::Implementation::acceptAll() {
    while (true) {
        sys::FileDescriptor connection(
            ::accept4(listener.native_handle(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
        if (connection) {
            admit(std::move(connection));
        } else if (errno == EAGAIN || errno == EWOULDBLOCK) {
            return awaitConnection();
        } else if (errno != EINTR && errno != ECONNABORTED) {
            // Out of descriptors or memory. The listener stays readable, so waiting for it would
            // spin.
            return after(kAcceptPause, [this] {
                if (!core.ending) acceptAll();
            });
        }
    }
}

void HttpServer::Implementation::admit(sys::FileDescriptor connection) {
    core.counts.accepted.add();
    const Peer peer = door.peerOf(connection.get());
    if (peer.access == Access::None) {
        return refuse(std::move(connection), peer, 403, door.refusal);
    }
    if (core.connections.size() - core.refusals >= core.limits.connections) {
        return refuse(std::move(connection), peer, 503, "too many connections are open");
    }
    if (peer.access < Access::Act && core.readers() >= core.limits.readers) {
        return refuse(std::move(connection), peer, 503,
                      "too many connections are open for reading only");
    }
    if (const auto session = sessionOn(std::move(connection), peer)) session->serve();
}

/// Every client learns why. As many as the limit says may also send their request first.
void HttpServer::Implementation::refuse(sys::FileDescriptor connection, const Peer& peer,
                                        unsigned status, std::string_view text) {
    core.counts.refused.add();
    if (core.refusals >= core.limits.refusals) {
        return turnAway(connection.get(), errorReply(status, text), core.handler.commonFields());
    }
    if (const auto session = sessionOn(std::move(connection), peer)) session->refuse(status, text);
}

/// Null when the event loop does not take the connection.
std::shared_ptr<HttpSession> HttpServer::Implementation::sessionOn(sys::FileDescriptor connection,
                                                                   const Peer& peer) {
    Stream stream(core.io.get_executor());
    Error error;
    const net::generic::stream_protocol protocol(familyOf(connection.get()), 0);
    stream.socket().assign(protocol, connection.get(), error);
    if (error) return nullptr;
    connection.release();
    return std::make_shared<HttpSession>(core, std::move(stream), peer);
}

void HttpServer::Implementation::awaitRegular() {
    regular.expires_after(regularTime);
    regular.async_wait([this](Error error) {
        if (error) return;
        regularAct();
        awaitRegular();
    });
}

template <typename Next>
void HttpServer::Implementation::after(std::chrono::milliseconds time, Next next) {
    timer.expires_after(time);
    timer.async_wait([next](Error error) {
        if (!error) next();
    });
}

void HttpServer::Implementation::closeListener() {
    if (!listener.is_open()) return;
    // A client that connects now is refused at once instead of waiting in vain.
    if (!leavesListenerOpen) ::shutdown(listener.native_handle(), SHUT_RDWR);
    Error ignored;
    listener.close(ignored);
}

void HttpServer::Implementation::beginEnd(std::chrono::milliseconds grace) {
    if (core.ending) return;
    core.ending = true;
    deadline = Clock::now() + grace;
    closeListener();
    std::vector<std::shared_ptr<Connection>> open;
    for (const auto& entry : core.connections)
        open.push_back(entry.second);
    for (const auto& connection : open)
        connection->prepareForEnd();
    core.handler.prepareForEnd();
    pollEnd();
}

void HttpServer::Implementation::pollEnd() {
    const auto now = Clock::now();
    if (core.handler.quiet() || now >= deadline) {
        return pollFlush(std::min(deadline, now + kFlushTime));
    }
    after(kEndPoll, [this] { pollEnd(); });
}

void HttpServer::Implementation::pollFlush(Clock::time_point flushDeadline) {
    const bool done = std::all_of(core.connections.begin(), core.connections.end(),
                                  [](const auto& entry) { return entry.second->quiet(); });
    if (done || Clock::now() >= flushDeadline) return core.io.stop();
    after(kEndPoll, [this, flushDeadline] { pollFlush(flushDeadline); });
}

HttpServer::HttpServer(int listener, Door door, Handler& handler, ServerCounts& counts,
                       const ServerLimits& limits)
    : implementation_(
          std::make_unique<Implementation>(listener, std::move(door), handler, counts, limits)) {
    if (implementation_->listener.is_open()) implementation_->awaitConnection();
}

HttpServer::~HttpServer() = default;

void HttpServer::run() {
    net::io_context& io = implementation_->core.io;
    while (!io.stopped()) {
        try {
            io.run();
        } catch (const std::exception&) {
            // Memory ran out in one connection's handler. Only that connection stops.
        }
    }
}

void HttpServer::adopt(sys::FileDescriptor connection) {
    Implementation& implementation = *implementation_;
    net::post(implementation.core.io,
              [&implementation, connection = std::move(connection)]() mutable {
                  if (!implementation.core.ending) implementation.admit(std::move(connection));
              });
}

void HttpServer::stop() {
    implementation_->core.io.stop();
}

void HttpServer::end(std::chrono::milliseconds grace) {
    Implementation& implementation = *implementation_;
    net::post(implementation.core.io, [&implementation, grace] { implementation.beginEnd(grace); });
}

void HttpServer::leaveListenerOpen() {
    implementation_->leavesListenerOpen = true;
}

void HttpServer::every(std::chrono::milliseconds time, std::function<void()> act) {
    implementation_->regularTime = time;
    implementation_->regularAct = std::move(act);
    implementation_->awaitRegular();
}

void HttpServer::endWhenReadable(int descriptor, std::chrono::milliseconds grace,
                                 std::function<void()> begins) {
    Implementation& implementation = *implementation_;
    implementation.signal.assign(duplicate(descriptor));
    implementation.signal.async_wait(net::posix::descriptor_base::wait_read,
                                     [&implementation, grace, begins](Error error) {
                                         if (error) return;
                                         if (begins) begins();
                                         implementation.beginEnd(grace);
                                     });
}

void HttpServer::whenReadable(int descriptor, std::chrono::milliseconds delay,
                              std::function<void()> act) {
    auto& watched = implementation_->watched;
    watched.push_back(std::make_unique<Watched>(implementation_->core.io, duplicate(descriptor),
                                                delay, std::move(act)));
    watched.back()->await();
}

}  // namespace http
