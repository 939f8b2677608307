/// Outcomes as they come, over lost connections and new starts of the host.
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/deadline.h"
#include "ctl/client/http/event_stream.h"

namespace ctl {

/// Connects again when the connection goes away, and continues behind the last event that came. A
/// host that gives its events no identifiers is not asked again: what was missed would be missing.
class ResumedEvents {
public:
    /// What to follow.
    struct Wish {
        std::string socket;
        std::vector<std::pair<std::string, std::string>> where;  ///< see EventStream
        std::string after;  ///< identifier of the event to continue behind; empty: from now on
        /// How long to look for a host that has gone away.
        std::chrono::milliseconds patience{0};
    };

    /// Returns when the subscription is live. Throws Failure as HostClient does.
    ResumedEvents(Wish wish, Deadline deadline);

    /// Called when a connection was lost and the host is looked for.
    std::function<void()> onLoss;

    /// Waits for the next event. Ended means that the host went away and was not found again in
    /// time; TimedOut, that the deadline came while there was one. Throws Failure when it is found
    /// and refuses.
    EventStream::Result next(Deadline deadline, ServerEvent& event);

private:
    bool reconnect(Deadline deadline);

    Wish wish_;
    std::unique_ptr<EventStream> stream_;
};

}  // namespace ctl
