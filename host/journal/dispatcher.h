/// Hands the tasks that wait in the journal to the plug-in, one at a time.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <optional>
#include <thread>

#include "host/journal/journal.h"
#include "host/outcomes/task_list.h"
#include "host/process/children/leftovers.h"

namespace host {

/// Takes the tasks in the order of their acceptance, the next one when the one before is over. That
/// a task is handed over is durable before the plug-in is called. One that must have begun earlier
/// expires instead.
///
/// Any thread may call.
class Dispatcher {
public:
    /// Calls the plug-in, on the dispatcher's thread. Returns how the task ends if the plug-in did
    /// not get it. Throws NotKept, after which it is tried again, and StepBack.
    using HandOver = std::function<std::optional<Task>(const Task& task)>;

    /// All of them outlive this object. Nothing is handed over before start().
    Dispatcher(Journal& journal, TaskList& tasks, HandOver handOver);
    /// Calls stop(), and waits for a hand-over in progress.
    ~Dispatcher();
    Dispatcher(const Dispatcher&) = delete;
    Dispatcher& operator=(const Dispatcher&) = delete;

    /// Begins as soon as nothing of an earlier run is alive; after `patience` that is killed. The
    /// leftovers outlive this object.
    void start(const Leftovers& leftovers, std::chrono::seconds patience);
    /// Hands over nothing more. Does not wait.
    void stop();
    /// A task has been entered.
    void wake();

private:
    void awaitEndOf(const Leftovers& leftovers, std::chrono::seconds patience);
    void work();
    /// False when nothing waits.
    bool handOverNext();
    void handOver(const Task& task);
    bool isLate(const Task& task);
    bool pause(std::chrono::milliseconds time);

    Journal& journal_;
    TaskList& tasks_;
    const HandOver handOver_;
    WallClock::time_point latest_{};  ///< of the thread alone: its time never goes back

    mutable std::mutex lock_;  // around everything below
    std::condition_variable changed_;
    bool stopping_ = false;
    bool entered_ = false;
    bool inHand_ = false;

    std::thread thread_;
};

}  // namespace host
