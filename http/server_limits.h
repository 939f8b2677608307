/// What a server allows its clients.
#pragma once

#include <chrono>
#include <cstddef>

namespace http {

struct ServerLimits {
    std::size_t connections = 256;  ///< served at a time; further ones get 503
    /// Of those the ones of clients that may only read, so that such clients shut nobody out.
    std::size_t readers = 128;
    std::size_t refusals = 64;          ///< told so with time to read; further ones in passing
    std::size_t workers = 32;           ///< jobs at a time
    std::size_t waitingRequests = 128;  ///< waiting for a worker; further ones get 503
    unsigned headBytes = 16 * 1024;     ///< request line and fields
    unsigned bodyBytes = 1024 * 1024;
    /// From a request's first byte to its last; for each piece of a body that is handed over so.
    std::chrono::milliseconds requestTime{30'000};
    std::chrono::milliseconds idleTime{60'000};    ///< between requests
    std::chrono::milliseconds answerTime{30'000};  ///< for the client to take an answer
    std::chrono::milliseconds lingerTime{2'000};   ///< for the client to read the last answer
    std::chrono::milliseconds heartbeat{15'000};   ///< between signs of life on an idle stream
    /// For the client to take a piece of a stream; 0: as long as it likes.
    std::chrono::milliseconds streamTime{0};
};

}  // namespace http
