/// The labels of hosts' own configurations, as they have told them.
#pragma once

#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <utility>

#include "fleet/bus/messages/selector.h"

namespace fleet {

/// Any thread.
class ToldLabels {
public:
    void set(const std::string& host, Labels labels) {
        const std::lock_guard lock(mutex_);
        Labels& known = labels_[host];
        if (known == labels) return;
        known = std::move(labels);
        ++version_;
    }
    void setAll(std::map<std::string, Labels> labels) {
        const std::lock_guard lock(mutex_);
        labels_ = std::move(labels);
        ++version_;
    }

    /// Changes with each change of what is in it.
    std::uint64_t version() const {
        const std::lock_guard lock(mutex_);
        return version_;
    }
    /// By the hosts' bus keys, of all that have told some.
    std::map<std::string, Labels> all() const {
        const std::lock_guard lock(mutex_);
        return labels_;
    }

private:
    mutable std::mutex mutex_;
    std::map<std::string, Labels> labels_;
    std::uint64_t version_ = 0;
};

}  // namespace fleet
