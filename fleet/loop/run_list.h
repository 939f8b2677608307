/// Things that each work on a thread of their own until they have ended.
#pragma once

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <functional>
#include <list>
#include <memory>
#include <thread>
#include <utility>
#include <vector>

namespace fleet {

/// What runs, with its threads. Run has a stop(), for any thread, that has it end soon. One thread
/// at a time.
template <typename Run>
class RunList {
public:
    RunList() = default;
    /// Stops all of them, and waits for their ends.
    ~RunList() {
        stopAll();
        for (Entry& entry : entries_)
            entry.thread.join();
    }
    RunList(const RunList&) = delete;
    RunList& operator=(const RunList&) = delete;

    /// Has `work` done with it on a thread that keeps it until then. `work` may throw nothing.
    /// Throws std::system_error if the system has no thread for it; then nothing has begun.
    template <typename Work>
    void start(std::shared_ptr<Run> run, Work work) {
        const auto hasEnded = std::make_shared<std::atomic<bool>>(false);
        Entry entry{run, hasEnded, {}};
        entries_.push_back(std::move(entry));
        try {
            entries_.back().thread =
                std::thread([run = std::move(run), hasEnded, work = std::move(work)] {
                    work(*run);
                    *hasEnded = true;
                });
        } catch (...) {
            entries_.pop_back();
            throw;
        }
    }

    /// Lets go of those that have ended, and returns them.
    std::vector<std::shared_ptr<Run>> removeEnded() {
        std::vector<std::shared_ptr<Run>> ended;
        for (auto entry = entries_.begin(); entry != entries_.end();) {
            if (!*entry->hasEnded) {
                ++entry;
                continue;
            }
            entry->thread.join();
            ended.push_back(std::move(entry->run));
            entry = entries_.erase(entry);
        }
        return ended;
    }

    /// Of those that have not been removed.
    std::size_t size() const { return entries_.size(); }
    bool haveAllEnded() const {
        return std::all_of(entries_.begin(), entries_.end(),
                           [](const Entry& entry) { return entry.hasEnded->load(); });
    }

    void stopAll() {
        for (const Entry& entry : entries_)
            entry.run->stop();
    }

private:
    struct Entry {
        std::shared_ptr<Run> run;
        std::shared_ptr<std::atomic<bool>> hasEnded;
        std::thread thread;
    };

    std::list<Entry> entries_;
};

/// Stops the run, if it is still there: for those who may be kept for longer than the run lasts.
template <typename Run>
std::function<void()> stopperOf(const std::shared_ptr<Run>& run) {
    return [held = std::weak_ptr<Run>(run)] {
        if (const auto alive = held.lock()) alive->stop();
    };
}

}  // namespace fleet
