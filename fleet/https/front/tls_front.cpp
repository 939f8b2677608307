#include "fleet/https/front/tls_front.h"

#include <pthread.h>

#include <boost/asio/post.hpp>
#include <cerrno>
#include <csignal>
#include <exception>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

#include "fleet/https/front/front_connection.h"
#include "fleet/https/front/front_core.h"
#include "fleet/https/front/front_error.h"
#include "fleet/https/front/server_identity.h"
#include "fleet/https/front/tcp_listener.h"

namespace fleet {
namespace {

namespace net = boost::asio;
using Error = boost::system::error_code;

/// How long accepting pauses when the process is out of descriptors or memory.
constexpr std::chrono::milliseconds kAcceptPause{100};

/// Signals are for other threads. A client that has gone must not end the process either: OpenSSL
/// writes to sockets in a way that raises SIGPIPE.
void blockAllSignals() {
    sigset_t all;
    ::sigfillset(&all);
    ::pthread_sigmask(SIG_SETMASK, &all, nullptr);
}

}  // namespace

struct TlsFront::Implementation {
    Implementation(const FrontSettings& settings, Take take)
        : core(settings.limits, std::move(take)),
          identity(settings.identityFile),
          listener(core.io),
          timer(core.io),
          goesOn(core.io.get_executor()) {
        sys::FileDescriptor opened = listenOn(settings.address, settings.port);
        port = portOf(opened);
        listener.assign(opened.get());
        opened.release();
        core.onPlaceFree = [this] { onPlaceFree(); };
    }

    void run();
    void awaitClient();
    void acceptAll();
    void pause();
    void admit(AcceptedClient client);
    void onPlaceFree();
    void beginEnd(std::chrono::milliseconds grace);
    bool isFull() const { return core.connections.size() >= core.limits.connections; }

    FrontCore core;
    ServerIdentity identity;
    FrontDescriptor listener;
    FrontTimer timer;
    const net::executor_work_guard<net::io_context::executor_type> goesOn;
    std::uint16_t port = 0;
    bool isWaitingForAPlace = false;
    bool isEnding = false;
    std::thread thread;
};

void TlsFront::Implementation::run() {
    blockAllSignals();
    awaitClient();
    while (!core.io.stopped()) {
        try {
            core.io.run();
        } catch (const std::exception&) {
            // Memory ran out. What was being done for one client stops.
        }
    }
}

void TlsFront::Implementation::awaitClient() {
    listener.async_wait(FrontDescriptor::wait_read, [this](Error error) {
        if (!error && !isEnding) acceptAll();
    });
}

void TlsFront::Implementation::acceptAll() {
    while (!isFull()) {
        AcceptedClient client = acceptClient(listener.native_handle());
        if (client.connection) {
            admit(std::move(client));
        } else if (errno == EAGAIN || errno == EWOULDBLOCK) {
            return awaitClient();
        } else if (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM) {
            // The listener stays readable, so waiting for it would spin.
            return pause();
        }
        // Otherwise one client's connection broke before it was accepted.
    }
    isWaitingForAPlace = true;
}

void TlsFront::Implementation::pause() {
    timer.expires_after(kAcceptPause);
    timer.async_wait([this](Error error) {
        if (!error && !isEnding) acceptAll();
    });
}

void TlsFront::Implementation::admit(AcceptedClient client) {
    core.counts.accepted.add();
    const auto count = core.origins.find(client.origin);
    if (count != core.origins.end() && count->second >= core.limits.fromOneOrigin) {
        return core.counts.turnedAway.add();
    }
    std::shared_ptr<FrontConnection> connection;
    try {
        TlsSession tls = identity.sessionOn(client.connection.get());
        if (!tls) return;
        connection = std::make_shared<FrontConnection>(core, std::move(client.connection),
                                                       std::move(tls), std::move(client.origin));
        connection->begin();
    } catch (const std::exception&) {
        // Memory is short. The client may try again.
        if (connection) connection->drop();
    }
}

void TlsFront::Implementation::onPlaceFree() {
    if (isEnding && core.connections.empty()) return core.io.stop();
    if (!isEnding && std::exchange(isWaitingForAPlace, false)) awaitClient();
}

void TlsFront::Implementation::beginEnd(std::chrono::milliseconds grace) {
    isEnding = true;
    Error ignored;
    listener.close(ignored);
    timer.expires_after(grace);
    timer.async_wait([this](Error error) {
        if (!error) core.io.stop();
    });
    std::vector<std::shared_ptr<FrontConnection>> open;
    for (const auto& entry : core.connections)
        open.push_back(entry.second);
    for (const auto& connection : open) {
        if (connection->isInHandshake()) connection->drop();
    }
    if (core.connections.empty()) core.io.stop();
}

TlsFront::TlsFront(const FrontSettings& settings, Take take)
    : implementation_(std::make_unique<Implementation>(settings, std::move(take))) {
    try {
        implementation_->thread = std::thread([this] { implementation_->run(); });
    } catch (const std::system_error& error) {
        throw FrontError(std::string("cannot start a thread: ") + error.what());
    }
}

TlsFront::~TlsFront() {
    implementation_->core.io.stop();
    if (implementation_->thread.joinable()) implementation_->thread.join();
}

std::uint16_t TlsFront::port() const {
    return implementation_->port;
}

const FrontCounts& TlsFront::counts() const {
    return implementation_->core.counts;
}

void TlsFront::end(std::chrono::milliseconds grace) {
    Implementation& implementation = *implementation_;
    net::post(implementation.core.io, [&implementation, grace] { implementation.beginEnd(grace); });
    implementation.thread.join();
}

}  // namespace fleet
