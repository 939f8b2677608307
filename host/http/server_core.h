/// What the connections of a server share. Everything here belongs to the I/O thread, except where
/// a member says otherwise.
#pragma once

#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/beast/core/basic_stream.hpp>
#include <chrono>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "host/api/router.h"
#include "host/http/server_limits.h"
#include "host/http/worker_pool.h"
#include "host/outcomes/task_watch.h"

namespace host {

/// A client's connection, with time-outs.
using Stream = boost::beast::basic_stream<boost::asio::local::stream_protocol,
                                          boost::asio::io_context::executor_type>;

/// A connection in the server's books.
class Connection {
public:
    virtual ~Connection() = default;
    /// True when nothing is under way that a client still waits for.
    virtual bool quiet() const = 0;
    /// The server ends soon: a connection without a request is closed.
    virtual void prepareForEnd() = 0;
};

struct ServerCore {
    ServerCore(Router serverRouter, std::string serverHome, const ServerLimits& serverLimits)
        : limits(serverLimits),
          router(std::move(serverRouter)),
          home(std::move(serverHome)),
          watch(router.tables()),
          pool(limits.workers, limits.waitingRequests) {}
    /// What is torn down here may wait for the lock of a table whose executor is held.
    ~ServerCore() { watch.release(); }
    ServerCore(const ServerCore&) = delete;
    ServerCore& operator=(const ServerCore&) = delete;

    void add(std::shared_ptr<Connection> connection) {
        Connection* const key = connection.get();
        connections.emplace(key, std::move(connection));
    }
    void remove(Connection* connection) { connections.erase(connection); }

    boost::asio::io_context io{1};  // any thread may post
    const ServerLimits limits;
    const Router router;
    const std::string home;
    const std::chrono::steady_clock::time_point started = std::chrono::steady_clock::now();
    TaskWatch watch;  // any thread

    std::unordered_map<Connection*, std::shared_ptr<Connection>> connections;
    std::size_t refusals = 0;  ///< connections among them that are only told to go away
    std::size_t streams = 0;   ///< connections among them that are event streams
    bool ending = false;
    /// Subscriptions of streams that closed while the server ends, when their table may be locked.
    std::vector<std::unique_ptr<oxa::Subscription>> retired;

    WorkerPool pool;  // any thread; last, so that its jobs end before what they use
};

}  // namespace host
