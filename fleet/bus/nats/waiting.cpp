#include "fleet/bus/nats/waiting.h"

#include <utility>

namespace fleet {

std::uint64_t Waiting::begin(const std::string& subject) {
    const std::lock_guard lock(mutex_);
    Request& request = requests_[++next_];
    request.subject = subject;
    request.failure = noAnswers_;
    return next_;
}

BusStatus Waiting::await(std::uint64_t number, Deadline deadline, BusMessage& answer) {
    std::unique_lock lock(mutex_);
    const auto request = requests_.find(number);
    if (request == requests_.end()) return BusStatus::noAnswer("no such request");
    request->second.isAwaited = true;
    changed_.wait_until(lock, deadline,
                        [&] { return request->second.answer || request->second.failure; });
    Request over = std::move(request->second);
    requests_.erase(request);
    if (over.answer) {
        answer = std::move(*over.answer);
        return {};
    }
    return over.failure ? *over.failure : BusStatus::noAnswer("no answer in time");
}

void Waiting::drop(std::uint64_t number) {
    const std::lock_guard lock(mutex_);
    requests_.erase(number);
}

void Waiting::answer(std::uint64_t number, BusMessage message) {
    {
        const std::lock_guard lock(mutex_);
        const auto request = requests_.find(number);
        if (request == requests_.end()) return;
        request->second.answer = std::move(message);
        // Of many that were asked together, the others are found answered when their turn comes.
        if (!request->second.isAwaited) return;
    }
    changed_.notify_all();
}

void Waiting::fail(const std::string& subject, const BusStatus& status) {
    {
        const std::lock_guard lock(mutex_);
        for (auto& [number, request] : requests_) {
            if (request.subject == subject) request.failure = status;
        }
    }
    changed_.notify_all();
}

void Waiting::failAll(const BusStatus& status) {
    {
        const std::lock_guard lock(mutex_);
        for (auto& [number, request] : requests_)
            request.failure = status;
    }
    changed_.notify_all();
}

void Waiting::answersDoNotCome(const BusStatus& status) {
    {
        const std::lock_guard lock(mutex_);
        noAnswers_ = status;
    }
    failAll(status);
}

void Waiting::answersComeAgain() {
    const std::lock_guard lock(mutex_);
    noAnswers_.reset();
}

}  // namespace fleet
