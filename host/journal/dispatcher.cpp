#include "host/journal/dispatcher.h"

#include <algorithm>
#include <csignal>
#include <utility>

#include "host/commands/command_ending.h"
#include "host/process/log.h"

namespace host {
namespace {

constexpr std::chrono::milliseconds kHandOverRetry{1000};
/// Between two looks whether what came by a query is still in the way.
constexpr std::chrono::milliseconds kTurnPause{100};
/// Between two looks at what is left of an earlier run.
constexpr std::chrono::milliseconds kDispatchLook{100};

}  // namespace

Dispatcher::Dispatcher(Journal& journal, TaskList& tasks, HandOver handOver, Complete complete)
    : journal_(journal),
      tasks_(tasks),
      handOver_(std::move(handOver)),
      complete_(std::move(complete)) {
    const std::string& begun = journal_.recovered().begun;
    const std::optional<Task> install = begun.empty() ? std::nullopt : journal_.find(begun);
    if (!complete_ || !install) return;
    install_ = install->number;
    completing_ = true;
}

Dispatcher::~Dispatcher() {
    stop();
    if (thread_.joinable()) thread_.join();
}

void Dispatcher::start(const Leftovers& leftovers, std::chrono::seconds patience,
                       std::function<void()> whenAlone) {
    thread_ = std::thread([this, &leftovers, patience, whenAlone = std::move(whenAlone)] {
        awaitEndOf(leftovers, patience);
        callAlone(whenAlone);
        completeInstall();
        journal_.handOverWithOutcomes(true);
        work();
    });
}

void Dispatcher::awaitEndOf(const Leftovers& leftovers, std::chrono::seconds patience) {
    const auto until = std::chrono::steady_clock::now() + patience;
    while (!leftovers.gone()) {
        endLeftovers(leftovers, std::chrono::steady_clock::now() >= until);
        if (!pause(kDispatchLook)) return;
    }
}

/// Somebody may have cancelled the install to which they belong.
void Dispatcher::endLeftovers(const Leftovers& leftovers, bool patienceIsOver) {
    const auto now = std::chrono::steady_clock::now();
    if (install_ != 0 && !killAt_ && journal_.isToBeCancelled(install_)) {
        leftovers.end(SIGTERM);
        killAt_ = now + CommandEnding::kPatience;
    }
    if (patienceIsOver || (killAt_ && now >= *killAt_)) leftovers.end(SIGKILL);
}

void Dispatcher::callAlone(const std::function<void()>& call) {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        if (stopping_ || !call) return;
    }
    try {
        call();
    } catch (const std::exception& error) {
        say(Priority::Error, error.what());
    }
}

void Dispatcher::completeInstall() {
    while (install_ != 0 && !tryComplete()) {
        if (!pause(kHandOverRetry)) return;
    }
    const std::lock_guard<std::mutex> lock(lock_);
    completing_ = false;
}

/// True when the install is over, or it is time to stop.
bool Dispatcher::tryComplete() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        if (stopping_) return true;
    }
    try {
        const std::optional<Task> task = journal_.find(journal_.recovered().begun);
        if (task && !isOver(task->state)) tasks_.end(complete_(*task));
        return true;
    } catch (const std::exception& error) {
        say(Priority::Warning, std::string("the end of an install waits: ") + error.what());
        return false;
    }
}

bool Dispatcher::awaitsInstall() const {
    const std::lock_guard<std::mutex> lock(lock_);
    return completing_;
}

void Dispatcher::stop() {
    journal_.handOverWithOutcomes(false);
    {
        const std::lock_guard<std::mutex> lock(lock_);
        stopping_ = true;
    }
    changed_.notify_all();
}

void Dispatcher::wake() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        entered_ = true;
    }
    changed_.notify_all();
}

void Dispatcher::work() {
    for (;;) {
        {
            std::unique_lock<std::mutex> lock(lock_);
            if (stopping_) return;
            entered_ = false;
        }
        bool found = true;
        try {
            found = handOverNext();
        } catch (const std::exception& error) {
            say(Priority::Warning, std::string("the next task waits: ") + error.what());
            if (!pause(kHandOverRetry)) return;
        }
        std::unique_lock<std::mutex> lock(lock_);
        while (!stopping_ && (inHand_ || (!found && !entered_)))
            changed_.wait(lock);
    }
}

bool Dispatcher::handOverNext() {
    if (recorded_ == 0) recorded_ = journal_.takeHandedOver();
    const std::optional<Task> task =
        recorded_ != 0 ? journal_.byNumber(recorded_) : journal_.nextInLine();
    if (!task) return false;
    if (tasks_.mustWait(*task)) {
        letWait();
        return true;
    }
    try {
        // With its hand-over it was recorded that it was not too late.
        if (recorded_ == 0 && journal_.isTooLate(*task)) {
            expire(*task);
        } else {
            handOver(*task);
        }
    } catch (const TooLate&) {
        expire(*task);  // while the guards looked at it
    } catch (const StepBack&) {
        // It was cancelled at the last moment: the next one, then.
    }
    recorded_ = 0;
    return true;
}

/// In line, where it can be cancelled and expires.
void Dispatcher::letWait() {
    if (recorded_ != 0) {
        journal_.takeBack(recorded_);
        recorded_ = 0;
    }
    pause(kTurnPause);
}

void Dispatcher::expire(Task task) {
    task.state = TaskState::Expired;
    task.ended = journal_.latestTime();
    task.reason = "its turn came after the time until which it could begin";
    tasks_.end(task);
}

void Dispatcher::handOver(const Task& task) {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        inHand_ = true;
    }
    const auto isOver = [this](const Task&) {
        {
            const std::lock_guard<std::mutex> lock(lock_);
            inHand_ = false;
        }
        changed_.notify_all();
    };
    const std::uint64_t waiter = tasks_.awaitEnd(task.id, isOver);
    try {
        if (const std::optional<Task> ended = handOver_(task)) tasks_.end(*ended);
    } catch (...) {
        tasks_.cancel(waiter);
        isOver(task);
        throw;
    }
}

/// False when it is time to stop.
bool Dispatcher::pause(std::chrono::milliseconds time) {
    const auto until = std::chrono::steady_clock::now() + time;
    std::unique_lock<std::mutex> lock(lock_);
    while (!stopping_ && std::chrono::steady_clock::now() < until)
        changed_.wait_until(lock, until);
    return !stopping_;
}

}  // namespace host
