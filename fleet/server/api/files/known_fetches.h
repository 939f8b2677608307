/// Who may fetch which file, for a while.
#pragma once

#include <cstddef>
#include <map>
#include <mutex>
#include <string>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// A file comes in many pieces; the centre's thread looks at the host's orders for the first one
/// and then every half a minute. Any thread.
class KnownFetches {
public:
    static constexpr Moment kKnownTime = std::chrono::seconds(30);
    static constexpr std::size_t kMost = 20'000;

    bool isKnown(const std::string& fetching, Moment now) const {
        const std::lock_guard lock(mutex_);
        const auto found = until_.find(fetching);
        return found != until_.end() && found->second > now;
    }
    void note(const std::string& fetching, Moment now) {
        const std::lock_guard lock(mutex_);
        if (until_.size() >= kMost) until_.clear();
        until_[fetching] = now + kKnownTime;
    }

private:
    mutable std::mutex mutex_;
    std::map<std::string, Moment> until_;
};

}  // namespace fleet
