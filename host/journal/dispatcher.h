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
/// a task is handed over is durable before the plug-in is called: it is recorded together with the
/// outcome of the one before, or by itself if there is none. One that must have begun earlier
/// expires instead.
///
/// Any thread may call.
class Dispatcher {
public:
    /// Calls the plug-in, on the dispatcher's thread. Returns how the task ends if the plug-in did
    /// not get it. Throws NotKept, after which it is tried again, StepBack
    /// and TooLate.
    using HandOver = std::function<std::optional<Task>(const Task& task)>;

    /// How an install ends that had begun in an earlier run and went on while the host was away; on
    /// the dispatcher's thread, when nothing of it lives. May throw, and is called again then.
    using Complete = std::function<Task(Task task)>;

    /// All of them outlive this object. Nothing is handed over before start().
    Dispatcher(Journal& journal, TaskList& tasks, HandOver handOver, Complete complete = {});
    /// Calls stop(), and waits for a hand-over in progress.
    ~Dispatcher();
    Dispatcher(const Dispatcher&) = delete;
    Dispatcher& operator=(const Dispatcher&) = delete;

    /// Begins as soon as nothing of an earlier run is alive, and an install that went on meanwhile
    /// is over; after `patience` that is killed. The leftovers outlive this object. `whenAlone` is
    /// called once in between, on the dispatcher's thread; what it throws is printed.
    void start(const Leftovers& leftovers, std::chrono::seconds patience,
               std::function<void()> whenAlone = {});
    /// Whether it waits for such an install.
    bool awaitsInstall() const;
    /// Hands over nothing more. Does not wait.
    void stop();
    /// A task has been entered.
    void wake();

private:
    void awaitEndOf(const Leftovers& leftovers, std::chrono::seconds patience);
    void endLeftovers(const Leftovers& leftovers, bool patienceIsOver);
    void callAlone(const std::function<void()>& call);
    void completeInstall();
    bool tryComplete();
    void work();
    /// False when nothing waits.
    bool handOverNext();
    void letWait();
    void handOver(const Task& task);
    void expire(Task task);
    bool pause(std::chrono::milliseconds time);

    Journal& journal_;
    TaskList& tasks_;
    const HandOver handOver_;
    const Complete complete_;
    /// Of the install that went on while the host was away; 0: there is none.
    std::int64_t install_ = 0;
    /// Of the thread alone: when what is left of a cancelled install has had its time.
    std::optional<std::chrono::steady_clock::time_point> killAt_;
    /// Of the thread alone: the task whose hand-over was recorded with an outcome; 0: none.
    std::int64_t recorded_ = 0;

    mutable std::mutex lock_;  // around everything below
    std::condition_variable changed_;
    bool stopping_ = false;
    bool entered_ = false;
    bool inHand_ = false;
    bool completing_ = false;

    std::thread thread_;
};

}  // namespace host
