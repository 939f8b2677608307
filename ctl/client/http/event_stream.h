/// Events as the host sends them: a live subscription to a table, or what another path streams.
#pragma once

#include <deque>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/deadline.h"
#include "ctl/client/http/event_parser.h"

namespace ctl {

class EventStream {
public:
    enum class Result { Event, Ended, TimedOut };

    /// Returns when the subscription is live: rows that come from now on are delivered. `where`
    /// holds pairs of a column and the value that it must have. `after` is the identifier of the
    /// event to continue behind; empty: from now on. Throws Failure as HostClient does.
    EventStream(const std::string& socketPath, const std::string& table,
                const std::vector<std::pair<std::string, std::string>>& where, Deadline deadline,
                const std::string& after = {});
    /// The events of any other path, such as "/v1/tasks/1/output?follow=1".
    EventStream(const std::string& socketPath, const std::string& target, Deadline deadline);
    ~EventStream();
    EventStream(const EventStream&) = delete;
    EventStream& operator=(const EventStream&) = delete;

    /// Waits for the next event. Ended means that the host closed the stream or went away. After
    /// TimedOut the stream is closed.
    Result next(Deadline deadline, ServerEvent& event, const Ticker& tick = {});

    /// Whether next() has an event without waiting for the host.
    bool hasNext() const { return !pending_.empty(); }

    /// The identifier to continue behind: that of the last event that next() gave, or of the
    /// stream's beginning. Empty when the host gives none.
    const std::string& position() const { return position_; }

private:
    struct Connection;
    std::unique_ptr<Connection> connection_;
    EventParser parser_;
    std::deque<ServerEvent> pending_;
    std::string position_;
};

}  // namespace ctl
