#include "host/service/status_reporter.h"

#include <exception>
#include <utility>

namespace host {

StatusReporter::StatusReporter(const Notifier& notifier, Status status,
                               std::chrono::milliseconds every)
    : notifier_(notifier), status_(std::move(status)), every_(every) {
    if (notifier_.isWanted()) thread_ = std::thread([this] { work(); });
}

StatusReporter::~StatusReporter() {
    stop();
}

void StatusReporter::stop() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        stopping_ = true;
    }
    changed_.notify_all();
    if (thread_.joinable()) thread_.join();
}

void StatusReporter::work() {
    std::unique_lock<std::mutex> lock(lock_);
    while (!stopping_) {
        lock.unlock();
        report();
        lock.lock();
        changed_.wait_for(lock, every_, [this] { return stopping_; });
    }
}

void StatusReporter::report() {
    try {
        std::string status = status_();
        if (status == last_) return;
        // What the receiver had no room for is sent at the next look.
        if (notifier_.tell("STATUS=" + status + "\n")) last_ = std::move(status);
    } catch (const std::exception&) {
        // The journal cannot be read now; requests say so to those whom it concerns.
    }
}

}  // namespace host
