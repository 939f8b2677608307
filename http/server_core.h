/// What the connections of a server share. Everything here belongs to the I/O thread, except where
/// a member says otherwise.
#pragma once

#include <algorithm>
#include <boost/asio/basic_waitable_timer.hpp>
#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/post.hpp>
#include <boost/beast/core/basic_stream.hpp>
#include <chrono>
#include <memory>
#include <unordered_map>
#include <utility>

#include "http/handler.h"
#include "http/responder.h"
#include "http/server_counts.h"
#include "http/server_limits.h"
#include "http/worker_pool.h"

namespace http {

/// A client's connection, with time-outs: a Unix socket or one of TCP.
using Stream = boost::beast::basic_stream<boost::asio::generic::stream_protocol,
                                          boost::asio::io_context::executor_type>;
using Timer = boost::asio::basic_waitable_timer<std::chrono::steady_clock,
                                                boost::asio::wait_traits<std::chrono::steady_clock>,
                                                boost::asio::io_context::executor_type>;

/// A connection in the server's books.
class Connection {
public:
    virtual ~Connection() = default;
    /// True when nothing is under way that a client still waits for.
    virtual bool quiet() const = 0;
    /// The server ends soon: a connection that does nothing closes, one that waits stops waiting.
    virtual void prepareForEnd() = 0;
    /// Of a client that may only read.
    virtual bool onlyReads() const = 0;
};

struct ServerCore {
    /// Handler and counts outlive the server.
    ServerCore(Handler& application, ServerCounts& serverCounts, const ServerLimits& serverLimits)
        : limits(serverLimits),
          handler(application),
          counts(serverCounts),
          mailbox(std::make_shared<Mailbox>(
              [this](std::function<void()> run) { boost::asio::post(io, std::move(run)); })),
          pool(limits.workers, limits.waitingRequests) {}
    ~ServerCore() { mailbox->close(); }
    ServerCore(const ServerCore&) = delete;
    ServerCore& operator=(const ServerCore&) = delete;

    void add(std::shared_ptr<Connection> connection) {
        Connection* const key = connection.get();
        connections.emplace(key, std::move(connection));
        counts.connections.set(connections.size());
    }
    void remove(Connection* connection) {
        connections.erase(connection);
        counts.connections.set(connections.size());
    }

    /// Connections of clients that may only read.
    std::size_t readers() const {
        return static_cast<std::size_t>(
            std::count_if(connections.begin(), connections.end(),
                          [](const auto& entry) { return entry.second->onlyReads(); }));
    }

    boost::asio::io_context io{1};  // any thread may post
    const ServerLimits limits;
    Handler& handler;
    ServerCounts& counts;                    // any thread
    const std::shared_ptr<Mailbox> mailbox;  // any thread

    std::unordered_map<Connection*, std::shared_ptr<Connection>> connections;
    std::size_t refusals = 0;  ///< connections among them that are only told to go away
    bool ending = false;

    WorkerPool pool;  // any thread; last, so that its jobs end before what they use
};

}  // namespace http
