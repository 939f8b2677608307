/// Those who read the events of the fleet.
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "fleet/server/api/events/event_log.h"
#include "fleet/server/api/sessions/session_proof.h"
#include "http/event_source.h"

namespace fleet {

/// Who reads, and as long as what.
struct EventReaderRight {
    std::string key;       ///< of the operator
    std::string selector;  ///< the hosts that they may see
    SessionProof session{};
};

/// Each reader takes from the log when its connection has room, so one that is slow holds up nobody
/// and costs nothing. One that is so slow that the log has dropped what it has not read is cut.
/// Any thread.
class EventReaders {
public:
    static constexpr std::size_t kMost = 256;
    static constexpr std::size_t kMostOfKey = 16;

    /// The log outlives this object; sources that were opened do not outlive the log.
    explicit EventReaders(EventLog& log) : log_(log) {}

    /// A stream behind the event with the identifier `after`, or behind the newest one if that is
    /// empty. Null if there are too many. Throws routes::BadRequest if `after` is no identifier.
    std::unique_ptr<http::EventSource> open(const EventReaderRight& right,
                                            const std::string& after);
    /// There are new events.
    void wake();
    /// Ends the streams whose readers have lost their right.
    void endUnless(const std::function<bool(const EventReaderRight&)>& counts);
    bool isEmpty();

private:
    class Reader;
    class Source;
    std::vector<std::shared_ptr<Reader>> readers();
    std::vector<std::shared_ptr<Reader>> alive();

    EventLog& log_;
    std::mutex mutex_;
    std::vector<std::weak_ptr<Reader>> readers_;
};

}  // namespace fleet
