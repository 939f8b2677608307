/// The host's HTTP interface over its Unix socket.
#pragma once

#include <chrono>
#include <deque>
#include <functional>
#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/event_parser.h"

namespace ctl {

using Deadline = std::chrono::steady_clock::time_point;

/// One condition of a query.
struct Condition {
    std::string column;
    std::string op;  ///< =, !=, <, <=, >, >= or like
    std::string value;
};

/// Called about once a second while the program waits.
using Ticker = std::function<void()>;

/// A request that the host answers. Every operation throws Failure: kNoHost when nobody listens,
/// the connection breaks or the answer makes no sense, kWrongUsage when the host refuses the
/// request, kNoOutcome when the deadline passes.
class HostClient {
public:
    explicit HostClient(std::string socketPath) : socketPath_(std::move(socketPath)) {}

    nlohmann::json get(const std::string& target, Deadline deadline) const;
    /// The answer's rows.
    nlohmann::json query(const std::string& table, const std::vector<Condition>& where,
                         Deadline deadline, const Ticker& tick = {}) const;
    const std::string& socketPath() const { return socketPath_; }

private:
    std::string socketPath_;
};

/// A live subscription.
class EventStream {
public:
    /// Returns when the subscription is live. `where` holds column and value pairs.
    EventStream(const std::string& socketPath, const std::string& table,
                const std::vector<std::pair<std::string, std::string>>& where, Deadline deadline);
    ~EventStream();
    EventStream(const EventStream&) = delete;
    EventStream& operator=(const EventStream&) = delete;

    enum class Result { Event, Ended, TimedOut };
    /// Waits for the next event. Ended: the host closed the stream or went away.
    Result next(Deadline deadline, ServerEvent& event, const Ticker& tick = {});

private:
    struct Connection;
    std::unique_ptr<Connection> connection_;
    EventParser parser_;
    std::deque<ServerEvent> pending_;
};

}  // namespace ctl
