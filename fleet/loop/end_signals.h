/// The signals with which a service is asked to end.
#pragma once

#include <pthread.h>

#include <csignal>
#include <functional>
#include <thread>
#include <utility>

namespace fleet {

/// SIGTERM and SIGINT, blocked in all threads, so that one of them waits for these. Who writes to
/// somebody who has gone gets an error in the place of SIGPIPE. Made before any other thread.
class EndSignals {
public:
    EndSignals() {
        ::signal(SIGPIPE, SIG_IGN);
        ::sigemptyset(&signals_);
        ::sigaddset(&signals_, SIGTERM);
        ::sigaddset(&signals_, SIGINT);
        ::pthread_sigmask(SIG_BLOCK, &signals_, nullptr);
    }

    const sigset_t& set() const { return signals_; }

private:
    sigset_t signals_{};
};

/// Waits for one of the signals until it is destroyed.
class EndWaiter {
public:
    /// `end` is called once, on a thread of the waiter's own: when a signal has come, or when the
    /// waiter is destroyed.
    EndWaiter(const EndSignals& signals, std::function<void()> end)
        : thread_([set = signals.set(), end = std::move(end)] {
              int signal = 0;
              ::sigwait(&set, &signal);
              end();
          }) {}
    ~EndWaiter() {
        ::pthread_kill(thread_.native_handle(), SIGINT);
        thread_.join();
    }
    EndWaiter(const EndWaiter&) = delete;
    EndWaiter& operator=(const EndWaiter&) = delete;

private:
    std::thread thread_;
};

}  // namespace fleet
