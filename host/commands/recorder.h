/// Makes a list of commands from the trace lines of one thread.
#pragma once

#include <sys/types.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <deque>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "embedded/mutex.h"
#include "embedded/ras1_listener.h"
#include "host/commands/command.h"
#include "host/process/children/pipe_writers.h"
#include "secrets/masked.h"

namespace host {

/// What has been heard on a thread. The texts of the commands are masked: they hold no values of
/// passwords and the like, and no configuration.
struct Heard {
    std::vector<Command> commands;  ///< in their order; of very many only the last ones
    /// RETVAL of the last request that was answered.
    std::optional<int> answer;
    /// What the inventory program printed is no inventory.
    bool noInventory = false;
    /// The last command's whole standard output as it came, if it was asked for.
    std::string output;
    bool outputComplete = true;  ///< false: the output was longer than it is kept
    /// The commands wrote more than they may, and were ended.
    bool tooMuchOutput = false;
};

/// From now on, when the plug-in gives up a command because its time is over, what that command has
/// started is killed too: the plug-in kills its own child only. The process must have adopted its
/// orphans. Any thread.
void endWhatGivenUpCommandsStarted();

/// So many bytes may the commands of one task write; 16 MiB if nothing is set. Any thread.
void limitOutput(std::uint64_t bytes);

class Recorder {
public:
    using OutputSink = std::function<void(const OutputPiece& piece)>;

    /// Keeps up to `outputBytes` of the last command's standard output. `sink` gets what commands
    /// write, piece by piece, on the recorder's thread and without a lock.
    explicit Recorder(std::size_t outputBytes = 0, OutputSink sink = {})
        : outputBytes_(outputBytes), sink_(std::move(sink)) {}
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

    /// From now on each command that the thread starts is killed at its start. Any thread.
    void endCommands();
    /// No more. Returns whether that was the end of any. Any thread.
    bool letCommandsRun();
    /// Calls `look` with the process of the command in hand, which nobody reaps meanwhile; with 0
    /// if there is none. It must not trace. Any thread.
    void withCommandInHand(const std::function<void(pid_t command)>& look) const;
    /// When the time of the command in hand is over; nothing if there is none. Any thread.
    std::optional<std::chrono::steady_clock::time_point> deadline() const;
    /// The adopted orphans when the first command since the last take() started; nothing if there
    /// was none. Any thread.
    std::optional<std::vector<pid_t>> orphansBeforeFirst() const;

private:
    /// Read and written by a child between fork and exec, too.
    struct Ending {
        std::atomic<bool> wanted{false};   ///< somebody wants the commands to be over
        std::atomic<bool> tooMuch{false};  ///< they wrote too much
        std::atomic<bool> reached{false};  ///< that was the end of one
    };

    /// What a child says between fork and exec. Others may read it while the child writes.
    struct ChildNotes {
        std::atomic<pid_t> pid{0};
        std::atomic<std::int64_t> started{0};  ///< nanoseconds since the epoch
        std::atomic<int> notExecuted{0};       ///< errno
        std::atomic<bool> notConnected{false};
        std::atomic<std::uint64_t> out{0};  ///< the number of the pipe that its output goes to
        std::atomic<std::uint64_t> err{0};
    };

    bool hearInChild(const ras1::HeardLine& line, std::string_view text);
    void hearRunner(std::string_view text);
    void hearProcess(const ras1::HeardLine& line, std::string_view text);
    void begin(std::string_view line);
    void keep(std::string_view piece, bool isError);
    void keepWhole(std::string_view piece) ZAV_REQUIRES(lock_);
    std::optional<OutputPiece> store(std::string_view piece, bool isError, std::string& shown);
    void count(std::size_t bytes);
    void endForOutput();
    void endWriters();
    std::set<ino_t> pipesOfCommand() const;
    void waitForEnd(pid_t pid, bool onlyLook);
    void close(std::string_view status);
    /// The command in hand with what its child has said.
    Command withNotes(const Command& command) const;
    pid_t commandInHand() const ZAV_REQUIRES(lock_);

    const std::size_t outputBytes_;
    const OutputSink sink_;

    // Of the thread alone.
    std::chrono::steady_clock::time_point began_{};
    std::chrono::seconds timeout_{0};
    std::vector<pid_t> orphansBefore_;  ///< that were there when the command began
    std::uint64_t written_ = 0;         ///< bytes since the last take()
    std::uint64_t mostRead_ = 0;        ///< of them, once they are too many

    ChildNotes notes_;
    Ending ending_;
    mutable embedded::Mutex lock_;  // never held in a child, nor while waiting
    std::deque<Command> commands_ ZAV_GUARDED_BY(lock_);
    bool open_ ZAV_GUARDED_BY(lock_) = false;  ///< the last command has not ended
    /// Of the last command; nothing before its time-out is known.
    std::optional<std::chrono::steady_clock::time_point> deadline_ ZAV_GUARDED_BY(lock_);
    bool hidesOutput_ ZAV_GUARDED_BY(lock_) = false;  ///< its output is a configuration
    secrets::Masker out_ ZAV_GUARDED_BY(lock_);       ///< of its texts, as far as they have come
    secrets::Masker err_ ZAV_GUARDED_BY(lock_);
    bool reaped_ ZAV_GUARDED_BY(lock_) = true;  ///< its process may have been reaped
    pid_t thread_ ZAV_GUARDED_BY(lock_) = 0;    ///< the thread's number in the system
    std::vector<pid_t> orphansBeforeFirst_ ZAV_GUARDED_BY(lock_);
    Heard others_ ZAV_GUARDED_BY(lock_);  ///< all but the commands
};

}  // namespace host
