/// The latest events of the fleet, for those who read them as a stream.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/messages/selector.h"

namespace fleet {

/// What is told to those who may see the host that it is about; to everybody if it is about none.
struct FleetEvent {
    struct Subject {
        std::string name;
        Labels labels;
    };
    std::string name;  ///< of the kind of event
    std::string data;  ///< a JSON document in one line
    std::optional<Subject> host{};
};

/// Where a reader is: behind the event of this number, which one run of the centre has given.
struct EventPlace {
    std::string run;
    std::uint64_t number = 0;
};

/// As clients name it, "RUN-NUMBER".
std::string eventIdOf(const EventPlace& place);
/// Reads such a text; nothing when it is not one.
std::optional<EventPlace> eventPlaceIn(std::string_view text);

/// The newest events, with numbers that rise by one. Any thread.
class EventLog {
public:
    struct Limits {
        std::size_t events = 20'000;
        std::size_t bytes = std::size_t{16} << 20;  ///< of their documents
    };
    struct Numbered {
        std::uint64_t number = 0;
        std::shared_ptr<const FleetEvent> event;
    };

    EventLog() : EventLog(Limits{}) {}
    explicit EventLog(const Limits& limits);

    /// Drops the oldest ones where there is no room.
    void add(std::vector<FleetEvent> events);

    const std::string& run() const { return run_; }
    /// The newest event's number; 0 before the first one.
    std::uint64_t last() const;
    /// The number of the oldest event that is kept, or that of the next one.
    std::uint64_t first() const;
    /// Those behind that number, or from first() on if that is later; at most so many.
    std::vector<Numbered> after(std::uint64_t number, std::size_t most) const;

private:
    const Limits limits_;
    const std::string run_;
    mutable std::mutex mutex_;
    std::deque<std::shared_ptr<const FleetEvent>> events_;
    std::uint64_t last_ = 0;
    std::size_t bytes_ = 0;
};

}  // namespace fleet
