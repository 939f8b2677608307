/// An HTTP interface on a listening socket, or on connections that somebody else has accepted.
#pragma once

#include <chrono>
#include <functional>
#include <memory>

#include "http/door.h"
#include "http/handler.h"
#include "http/server_counts.h"
#include "http/server_limits.h"
#include "system/file_descriptor.h"

namespace http {

/// One thread does all input and output. Jobs run on a pool of worker threads, so that one that
/// takes long delays nobody else. A server without connections sleeps until a client comes.
class HttpServer {
public:
    /// `listener` is a non-blocking socket, a Unix one or one of TCP, that stays the caller's, or
    /// -1 for a server that gets all its connections from adopt(); handler and counts outlive the
    /// server. Throws std::runtime_error.
    HttpServer(int listener, Door door, Handler& handler, ServerCounts& counts,
               const ServerLimits& limits = {});
    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    /// Serves on the calling thread until the server has ended or been stopped.
    void run();
    /// Serves a client on this connected stream socket, like one that the listener brought:
    /// the door is asked about it, and the limits count it. A server that is about to end, or has
    /// ended, closes it. Any thread. Throws std::bad_alloc; then it is closed as well.
    void adopt(sys::FileDescriptor connection);
    /// Makes run() return as soon as it can. Any thread.
    void stop();
    /// Ends the server. It takes no connection and no request from now on. It waits until the
    /// handler is quiet, at most for `grace`, sends what answers and events are left, and then
    /// run() returns. Any thread.
    void end(std::chrono::milliseconds grace);
    /// Calls `begins`, which must not block and must not throw, and then end() when `descriptor`,
    /// which stays the caller's, becomes readable. Before run().
    void endWhenReadable(int descriptor, std::chrono::milliseconds grace,
                         std::function<void()> begins = {});
    /// The listener stays open for whoever takes over: when the server ends, clients that connect
    /// wait instead of being refused. Before run().
    void leaveListenerOpen();
    /// Calls `act` on the thread of run() each time that this time has passed, until run() returns.
    /// `act` must not block and must not throw. Before run(), at most once.
    void every(std::chrono::milliseconds time, std::function<void()> act);
    /// Calls `act` on the thread of run() whenever `descriptor`, which stays the caller's, is
    /// readable, and `delay` has passed since it became so: what happens meanwhile costs no call of
    /// its own. `act` makes it unreadable, must not block and must not throw. Before run().
    void whenReadable(int descriptor, std::chrono::milliseconds delay, std::function<void()> act);

private:
    struct Implementation;
    const std::unique_ptr<Implementation> implementation_;
};

}  // namespace http
