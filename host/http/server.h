/// The host's HTTP interface on a listening socket.
#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "host/api/router.h"
#include "host/http/server_limits.h"

namespace host {

/// One thread does all input and output; samples run on a pool of worker threads, so that one that
/// takes long holds up nobody else. A server without connections sleeps until a client comes.
class HttpServer {
public:
    /// `listener` stays the caller's and is non-blocking. Throws StartError.
    HttpServer(int listener, Router router, std::string home, const ServerLimits& limits = {});
    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    /// Serves on the calling thread until the server has ended or been stopped.
    void run();
    /// Makes run() return as soon as it can. Any thread.
    void stop();
    /// Ends the server: no connection and no request is taken from now on, the task in hand and
    /// requests under way are waited for, at most for `grace`, their answers and events sent, and
    /// run() returns. After that the executor may be held, so the process is to end. Any thread.
    void end(std::chrono::milliseconds grace);
    /// Calls end() when `descriptor`, which stays the caller's, becomes readable. Before run().
    void endWhenReadable(int descriptor, std::chrono::milliseconds grace);

private:
    struct Implementation;
    const std::unique_ptr<Implementation> implementation_;
};

}  // namespace host
