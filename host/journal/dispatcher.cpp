#include "host/journal/dispatcher.h"

#include <algorithm>
#include <cstdio>
#include <utility>

namespace host {
namespace {

constexpr std::chrono::milliseconds kRetry{1000};
/// Between two looks at what is left of an earlier run.
constexpr std::chrono::milliseconds kLook{100};

}  // namespace

Dispatcher::Dispatcher(Journal& journal, TaskList& tasks, HandOver handOver)
    : journal_(journal), tasks_(tasks), handOver_(std::move(handOver)) {}

Dispatcher::~Dispatcher() {
    stop();
    if (thread_.joinable()) thread_.join();
}

void Dispatcher::start(const Leftovers& leftovers, std::chrono::seconds patience) {
    thread_ = std::thread([this, &leftovers, patience] {
        awaitEndOf(leftovers, patience);
        work();
    });
}

void Dispatcher::awaitEndOf(const Leftovers& leftovers, std::chrono::seconds patience) {
    const auto until = std::chrono::steady_clock::now() + patience;
    while (!leftovers.gone()) {
        if (std::chrono::steady_clock::now() >= until) leftovers.end();
        if (!pause(kLook)) return;
    }
}

void Dispatcher::stop() {
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
            std::fprintf(stderr, "zavhost: the next task waits: %s\n", error.what());
            if (!pause(kRetry)) return;
        }
        std::unique_lock<std::mutex> lock(lock_);
        while (!stopping_ && (inHand_ || (!found && !entered_)))
            changed_.wait(lock);
    }
}

bool Dispatcher::handOverNext() {
    const std::optional<Task> task = journal_.nextInLine();
    if (!task) return false;
    try {
        handOver(*task);
    } catch (const StepBack&) {
        // It was cancelled at the last moment: the next one, then.
    }
    return true;
}

void Dispatcher::handOver(const Task& task) {
    if (isLate(task)) {
        Task expired = task;
        expired.state = TaskState::Expired;
        expired.ended = WallClock::now();
        expired.reason = "its turn came after the time until which it could begin";
        tasks_.end(expired);
        return;
    }
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

bool Dispatcher::isLate(const Task& task) {
    latest_ = std::max(latest_, WallClock::now());
    return task.expires && latest_ > *task.expires;
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
