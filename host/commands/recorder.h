/// Makes a list of commands from the trace lines of one thread.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <deque>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "embedded/mutex.h"
#include "embedded/ras1_listener.h"
#include "host/commands/command.h"

namespace host {

/// What has been heard on a thread.
struct Heard {
    std::vector<Command> commands;  ///< in their order; of very many only the last ones
    /// RETVAL of the last request that was answered.
    std::optional<int> answer;
    /// What the inventory program printed is no inventory.
    bool noInventory = false;
    /// The last command's whole standard output, if it was asked for.
    std::string output;
    bool outputComplete = true;  ///< false: the output was longer than it is kept
};

/// From now on, when the plug-in gives up a command because its time is over, what that command has
/// started is killed too: the plug-in kills its own child only. The process must have adopted its
/// orphans. Any thread.
void endWhatGivenUpCommandsStarted();

class Recorder {
public:
    /// Keeps up to `outputBytes` of the last command's standard output.
    explicit Recorder(std::size_t outputBytes = 0) : outputBytes_(outputBytes) {}
    Recorder(const Recorder&) = delete;
    Recorder& operator=(const Recorder&) = delete;

    /// Takes one line of the thread. When the plug-in begins to wait for a process, waits for its
    /// end up to the command's own time limit, and the plug-in still reaps it. In a child between
    /// fork and exec only stores into this object.
    void hear(const ras1::HeardLine& line) noexcept;

    /// What has been heard since the last call; forgets it. On the recorder's own thread.
    Heard take();
    /// The commands since the last take(), the running one among them. Any thread.
    std::vector<Command> commands() const;

private:
    /// What a child says between fork and exec. Others may read it while the child writes.
    struct ChildNotes {
        std::atomic<pid_t> pid{0};
        std::atomic<std::int64_t> started{0};  ///< nanoseconds since the epoch
        std::atomic<int> notExecuted{0};       ///< errno
        std::atomic<bool> notConnected{false};
    };

    bool hearInChild(const ras1::HeardLine& line, std::string_view text);
    void hearRunner(std::string_view text);
    void hearProcess(const ras1::HeardLine& line, std::string_view text);
    void begin(std::string_view line);
    void keepOutput(std::string_view piece);
    void waitForEnd(pid_t pid, bool onlyLook);
    void close(std::string_view status);
    /// The command in hand with what its child has said.
    Command withNotes(const Command& command) const;

    const std::size_t outputBytes_;

    // Of the thread alone.
    std::chrono::steady_clock::time_point began_{};
    std::chrono::seconds timeout_{0};
    std::vector<pid_t> orphansBefore_;  ///< that were there when the command began

    ChildNotes notes_;
    mutable embedded::Mutex lock_;  // never held in a child, nor while waiting
    std::deque<Command> commands_ ZAV_GUARDED_BY(lock_);
    bool open_ ZAV_GUARDED_BY(lock_) = false;  ///< the last command has not ended
    Heard others_ ZAV_GUARDED_BY(lock_);       ///< all but the commands
};

}  // namespace host
