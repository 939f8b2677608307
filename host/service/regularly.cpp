#include "host/service/regularly.h"

#include <utility>

namespace host {

Regularly::Regularly(std::chrono::milliseconds every, std::function<void()> act)
    : every_(every), act_(std::move(act)), thread_([this] { work(); }) {}

Regularly::~Regularly() {
    stop();
}

void Regularly::stop() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        stopping_ = true;
    }
    changed_.notify_all();
    if (thread_.joinable()) thread_.join();
}

void Regularly::work() {
    std::unique_lock<std::mutex> lock(lock_);
    while (!stopping_) {
        lock.unlock();
        act_();
        lock.lock();
        changed_.wait_for(lock, every_, [this] { return stopping_; });
    }
}

}  // namespace host
