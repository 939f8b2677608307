#include "ctl/client/resumed_events.h"

#include <algorithm>
#include <thread>

#include "ctl/client/failure.h"

namespace ctl {
namespace {

constexpr const char* kTable = "KAGDYST";
/// Between two looks for the host.
constexpr std::chrono::milliseconds kReconnectPause{200};

}  // namespace

ResumedEvents::ResumedEvents(Wish wish, Deadline deadline) : wish_(std::move(wish)) {
    stream_ =
        std::make_unique<EventStream>(wish_.socket, kTable, wish_.where, deadline, wish_.after);
}

EventStream::Result ResumedEvents::next(Deadline deadline, ServerEvent& event) {
    for (;;) {
        const EventStream::Result result = stream_->next(deadline, event);
        if (result != EventStream::Result::Ended) return result;
        if (stream_->position().empty()) return result;
        if (onLoss) onLoss();
        if (!reconnect(deadline)) return result;
    }
}

/// False when the host was not found in time.
bool ResumedEvents::reconnect(Deadline deadline) {
    const std::string position = stream_->position();
    const Deadline until = std::min(deadline, deadlineIn(wish_.patience));
    while (std::chrono::steady_clock::now() < until) {
        try {
            stream_ =
                std::make_unique<EventStream>(wish_.socket, kTable, wish_.where, until, position);
            return true;
        } catch (const Failure& failure) {
            if (failure.status() != kNoHost && failure.status() != kNoOutcome) throw;
        }
        std::this_thread::sleep_for(kReconnectPause);
    }
    return false;
}

}  // namespace ctl
