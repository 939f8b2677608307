/// Ends the commands of a task that somebody wants to be over.
#pragma once

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <mutex>
#include <thread>

namespace host {

/// While it exists, what the plug-in's own threads run is ended: the command in hand, and what the
/// commands have started since the last one of them was taken, get SIGTERM, and SIGKILL when their
/// time is over. Each further command is killed at its start: to end one alone would let the
/// plug-in go on with the next. What has made a session of its own is left alone.
///
/// There is one at a time. Any thread may make it; one thread calls finish().
class CommandEnding {
public:
    /// How long a process may take to end after SIGTERM.
    static constexpr std::chrono::seconds kPatience{10};

    explicit CommandEnding(std::chrono::milliseconds patience = kPatience);
    ~CommandEnding();
    CommandEnding(const CommandEnding&) = delete;
    CommandEnding& operator=(const CommandEnding&) = delete;

    /// The task starts nothing more. Waits until what it has started has ended, and lets commands
    /// run again. Returns whether a signal reached any of it.
    bool finish();

private:
    void work();
    bool look(int signal, class Descendants& descendants);

    const std::chrono::steady_clock::time_point until_;
    std::atomic<bool> reached_{false};

    std::mutex lock_;  // around what follows
    std::condition_variable changed_;
    bool finishing_ = false;

    std::thread thread_;  ///< last, so that it finds everything else
};

}  // namespace host
