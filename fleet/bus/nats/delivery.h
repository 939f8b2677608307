/// Hands messages from the client library's threads to a callback. Included by this folder's
/// sources only.
#pragma once

#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <utility>

#include "fleet/bus/nats/client.h"
#include "fleet/bus/nats/status.h"

namespace fleet {

/// Between a subscription and the library's thread. Whoever of the two is the last one frees it.
class Delivery {
public:
    using Receiver = std::function<void(const BusMessage&)>;

    explicit Delivery(Receiver receiver) : receiver_(std::move(receiver)) {}

    /// Runs the callback, unless stop() has been called. One thread at a time.
    void deliver(natsMsg* message) {
        {
            const std::lock_guard lock(mutex_);
            if (stopped_) return;
            running_ = true;
        }
        receiver_(messageOf(message));
        {
            const std::lock_guard lock(mutex_);
            running_ = false;
        }
        changed_.notify_all();
    }

    /// Waits for a callback that runs; none begins any more.
    void stop() {
        std::unique_lock lock(mutex_);
        stopped_ = true;
        changed_.wait(lock, [this] { return !running_; });
    }

    /// For the library: the closure is a pointer to a shared pointer, which the second one frees.
    static void onMessage(natsConnection*, natsSubscription*, natsMsg* message, void* delivery) {
        const NatsMessage owned(message);
        (*static_cast<std::shared_ptr<Delivery>*>(delivery))->deliver(message);
    }
    static void onComplete(void* delivery) {
        const std::unique_ptr<std::shared_ptr<Delivery>> last(
            static_cast<std::shared_ptr<Delivery>*>(delivery));
    }

private:
    const Receiver receiver_;
    std::mutex mutex_;
    std::condition_variable changed_;
    bool running_ = false;
    bool stopped_ = false;
};

}  // namespace fleet
