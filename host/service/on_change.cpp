#include "host/service/on_change.h"

#include <utility>

namespace host {

OnChange::OnChange(std::chrono::milliseconds pause, std::function<bool()> act)
    : pause_(pause), act_(std::move(act)), thread_([this] { work(); }) {}

OnChange::~OnChange() {
    stop();
}

void OnChange::changed() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        if (changed_) return;
        changed_ = true;
    }
    woken_.notify_all();
}

void OnChange::stop() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        stopping_ = true;
    }
    woken_.notify_all();
    if (thread_.joinable()) thread_.join();
}

void OnChange::work() {
    auto next = std::chrono::steady_clock::now();
    std::unique_lock<std::mutex> lock(lock_);
    for (;;) {
        // The pause comes before a call and not behind it: without a change nobody is woken.
        woken_.wait(lock, [this] { return changed_ || stopping_; });
        woken_.wait_until(lock, next, [this] { return stopping_; });
        if (stopping_) return;
        changed_ = false;
        lock.unlock();
        const bool succeeded = act_();
        next = std::chrono::steady_clock::now() + pause_;
        lock.lock();
        if (!succeeded) changed_ = true;
    }
}

}  // namespace host
