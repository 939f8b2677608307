/// What a task's commands write, on its way to one reader.
#pragma once

#include <array>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "embedded/mutex.h"
#include "host/api/tasks/output_position.h"
#include "host/outcomes/task.h"
#include "host/tables/code_page.h"

namespace host {

/// Bounded: the thread that hears commands never waits for a reader. What does not fit is lost, and
/// an event says how much that was.
///
/// Any thread may push; one thread takes.
class OutputQueue {
public:
    /// As text in the wire's form, before one reader has taken it.
    static constexpr std::size_t kMostBytes = std::size_t{1} << 20;

    /// `codePage` is the one that commands write, and outlives this object. `run` is that of the
    /// host. A reader who stands at `after` gets what is behind it, or all if that is a position in
    /// another run.
    OutputQueue(const CodePage& codePage, std::int64_t run,
                std::optional<OutputPosition> after = std::nullopt);

    /// What has come so far. Pieces that were pushed before are left out as far as they are in it.
    /// A task that is over has all of it.
    void begin(const Task& task);
    /// A piece that was heard.
    void push(const OutputPiece& piece);
    /// Nothing more comes but what this task, which is over, has and the reader has not.
    void end(const Task& over);

    /// From now on calls `wake`, without a lock, when an empty queue gets something; and once here
    /// if there is something.
    void onContent(std::function<void()> wake);
    /// All that has come since the last call, as events.
    std::string take();
    bool empty() const;
    /// Whether everything has been taken and nothing more comes.
    bool over() const;

private:
    struct Held {
        std::uint64_t command;
        bool isError;
        std::string text;
        std::uint64_t end;
    };
    void findPlace(const Task& task) ZAV_REQUIRES(lock_);
    void addKept(const Command& command) ZAV_REQUIRES(lock_);
    void pass(const OutputPiece& piece) ZAV_REQUIRES(lock_);
    void add(bool isError, std::string_view text) ZAV_REQUIRES(lock_);
    void addEvent(bool isError, std::string_view text) ZAV_REQUIRES(lock_);
    void addEnd() ZAV_REQUIRES(lock_);
    void wake();

    const CodePage& codePage_;
    const std::int64_t run_;
    const std::optional<OutputPosition> after_;

    mutable embedded::Mutex lock_;
    bool begun_ ZAV_GUARDED_BY(lock_) = false;
    std::vector<Held> held_ ZAV_GUARDED_BY(lock_);  ///< that came before begin()
    /// By command and output, how many of its bytes have been passed on.
    std::map<std::pair<std::uint64_t, bool>, std::uint64_t> seen_ ZAV_GUARDED_BY(lock_);
    /// Behind all that has been passed on or left out, whatever the reader was given of it.
    OutputPosition position_ ZAV_GUARDED_BY(lock_);
    /// What the reader has had before, of each output.
    std::array<std::uint64_t, 2> had_ ZAV_GUARDED_BY(lock_){};
    /// The task's first commands, of which begin() had all: the journal keeps no numbers.
    std::size_t unnumbered_ ZAV_GUARDED_BY(lock_) = 0;
    std::string ready_ ZAV_GUARDED_BY(lock_);     ///< events
    std::size_t lost_ ZAV_GUARDED_BY(lock_) = 0;  ///< bytes that did not fit
    /// Of each output the first bytes of a character whose end has not come.
    std::array<std::string, 2> cut_ ZAV_GUARDED_BY(lock_);
    bool endTaken_ ZAV_GUARDED_BY(lock_) = false;
    std::optional<Task> over_ ZAV_GUARDED_BY(lock_);
    std::shared_ptr<const std::function<void()>> wake_ ZAV_GUARDED_BY(lock_);
};

}  // namespace host
