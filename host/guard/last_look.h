/// What the guards saw of the machine for the request that they were asked about last.
#pragma once

#include <chrono>
#include <mutex>
#include <optional>
#include <vector>

#include "host/guard/command_request.h"

namespace host {

/// A task that waits is looked at when it comes and again right before it is handed over, since
/// what ran in between may have changed what there is. When nothing ran in between, the first look
/// still holds, and the home's programs need not run twice for one command. Only the last look is
/// kept: tasks that come in numbers wait for each other anyway. Any thread.
class LastLook {
public:
    using Clock = std::chrono::steady_clock;

    /// Longer than a hand-over takes when nothing is in its way; what others do on the machine
    /// meanwhile could happen as well right after a second look.
    static constexpr std::chrono::seconds kHolds{1};

    /// Every guard has let the request pass, and those of the machine looked at `when` or later,
    /// while no task was at work.
    void keep(const CommandRequest& request, Clock::time_point when);
    /// A request is about to be handed over. Whether the kept look was at this very one, and still
    /// holds `now`: whatever is handed over may change what there is, so no other was within a
    /// second before the look, or is since.
    bool take(const CommandRequest& request, Clock::time_point now);

private:
    struct Look {
        std::vector<oxa::Predicate> conditions;
        bool force;
        Clock::time_point when;
    };

    std::mutex lock_;
    std::optional<Look> look_;
    std::optional<Clock::time_point> taken_;
};

}  // namespace host
