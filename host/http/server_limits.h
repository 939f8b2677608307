/// What a server allows its clients.
#pragma once

#include <chrono>
#include <cstddef>

#include "host/outcomes/event_queue.h"

namespace host {

struct ServerLimits {
    std::size_t connections = 256;      ///< served at a time; beyond them 503
    std::size_t refusals = 64;          ///< being told so at a time; beyond them closed at once
    std::size_t workers = 32;           ///< samples at a time
    std::size_t waitingRequests = 128;  ///< waiting for a worker; beyond them 503
    unsigned headBytes = 16 * 1024;     ///< request line and fields
    unsigned bodyBytes = 1024 * 1024;
    std::chrono::milliseconds requestTime{30'000};  ///< from its first byte to its last
    std::chrono::milliseconds idleTime{60'000};     ///< between requests
    std::chrono::milliseconds answerTime{30'000};   ///< for the client to take an answer
    std::chrono::milliseconds lingerTime{2'000};    ///< for the client to read the last answer
    EventQueue::Limits events;
};

}  // namespace host
