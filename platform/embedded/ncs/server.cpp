// The runtime's threads. All of them wait on one epoll descriptor. A thread that wakes up serves
// the source that woke it, and each source wakes one thread at a time (EPOLLONESHOT). Nothing is
// polled: a timer runs only while there is a connection with a deadline.

#include <pthread.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/timerfd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <mutex>
#include <string>
#include <system_error>
#include <thread>
#include <unordered_map>
#include <vector>

#include "embedded/mutex.h"
#include "embedded/ncs_host.h"
#include "ncs/connection.h"
#include "ncs/listener.h"
#include "ncs/memory.h"

namespace ncs {
namespace {

/// How long accepting pauses if the process is out of descriptors or memory.
constexpr Milliseconds kAcceptPause = 500;

/// Blocks all signals but faults while it exists, so that threads made meanwhile leave them to
/// other threads.
class SignalsBlocked {
public:
    SignalsBlocked() {
        sigset_t all;
        ::sigfillset(&all);
        for (const int fault : {SIGSEGV, SIGBUS, SIGFPE, SIGILL})
            ::sigdelset(&all, fault);
        ::pthread_sigmask(SIG_SETMASK, &all, &before_);
    }
    ~SignalsBlocked() { ::pthread_sigmask(SIG_SETMASK, &before_, nullptr); }
    SignalsBlocked(const SignalsBlocked&) = delete;
    SignalsBlocked& operator=(const SignalsBlocked&) = delete;

private:
    sigset_t before_{};
};

}  // namespace

class Server::Implementation {
public:
    Implementation(const Limits& limits, CallWatch* callWatch);
    ~Implementation() { stop(); }
    Implementation(const Implementation&) = delete;
    Implementation& operator=(const Implementation&) = delete;

    void listen(int socket, const std::string& port, Admission admission);
    std::uint16_t listenOnLoopback(std::uint16_t port);
    void stop();
    Counts counts() const;

private:
    int watch(int operation, int descriptor, Source& source, std::uint32_t events) const;
    void rearm(int descriptor, Source& source, std::uint32_t event) const;
    void work();
    void accept(Listener& listener);
    void admit(int socket, const Listener& listener);
    void serve(Connection& connection);
    void close(Connection& connection);
    void runTimer();
    void wakeBy(Milliseconds deadline);
    void setTimer(Milliseconds deadline) ZAV_REQUIRES(lock_);

    const Limits limits_;
    SharedState shared_;
    const Descriptor poll_;
    const Descriptor timer_;
    const Descriptor stopEvent_;
    Source timerSource_{Source::Kind::Timer};
    Source stopSource_{Source::Kind::Stop};
    std::atomic<Milliseconds> wakeUp_{kNever};  ///< changed under the lock

    mutable embedded::Mutex lock_;
    std::unordered_map<Connection*, std::unique_ptr<Connection>> connections_ ZAV_GUARDED_BY(lock_);
    std::vector<std::unique_ptr<Listener>> listeners_ ZAV_GUARDED_BY(lock_);
    std::vector<Descriptor> ownSockets_ ZAV_GUARDED_BY(lock_);
    std::vector<std::thread> threads_ ZAV_GUARDED_BY(lock_);
    Counts counts_ ZAV_GUARDED_BY(lock_);
};

Server::Implementation::Implementation(const Limits& limits, CallWatch* callWatch)
    : limits_(limits),
      shared_(limits.stubBytes, limits.totalStubBytes, callWatch),
      poll_(checked(::epoll_create1(EPOLL_CLOEXEC), "epoll_create1")),
      timer_(
          checked(::timerfd_create(CLOCK_MONOTONIC, TFD_CLOEXEC | TFD_NONBLOCK), "timerfd_create")),
      stopEvent_(checked(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK), "eventfd")) {
    checked(watch(EPOLL_CTL_ADD, timer_.get(), timerSource_, EPOLLIN | EPOLLONESHOT), "epoll_ctl");
    checked(watch(EPOLL_CTL_ADD, stopEvent_.get(), stopSource_, EPOLLIN), "epoll_ctl");
    const SignalsBlocked blocked;
    try {
        for (unsigned i = 0; i < limits_.workers; ++i) {
            threads_.emplace_back([this] { work(); });
        }
    } catch (...) {
        stop();
        throw;
    }
}

int Server::Implementation::watch(int operation, int descriptor, Source& source,
                                  std::uint32_t events) const {
    epoll_event event{};
    event.events = events;
    event.data.ptr = &source;
    return ::epoll_ctl(poll_.get(), operation, descriptor, &event);
}

/// Rearms a source that is registered already, which needs no memory.
void Server::Implementation::rearm(int descriptor, Source& source, std::uint32_t event) const {
    watch(EPOLL_CTL_MOD, descriptor, source, event | EPOLLONESHOT);
}

void Server::Implementation::work() {
    ::pthread_setname_np(::pthread_self(), "ncs");
    for (;;) {
        epoll_event event{};
        if (::epoll_wait(poll_.get(), &event, 1, -1) != 1) continue;
        Source& source = *static_cast<Source*>(event.data.ptr);
        switch (source.kind) {
            case Source::Kind::Stop:
                return;
            case Source::Kind::Timer:
                runTimer();
                break;
            case Source::Kind::Listener:
                accept(static_cast<Listener&>(source));
                break;
            case Source::Kind::Connection:
                serve(static_cast<Connection&>(source));
                break;
        }
    }
}

void Server::Implementation::listen(int socket, const std::string& port, Admission admission) {
    auto listener = std::make_unique<Listener>(socket, port, std::move(admission));
    const embedded::MutexLock lock(lock_);
    listeners_.push_back(std::move(listener));
    checked(watch(EPOLL_CTL_ADD, socket, *listeners_.back(), EPOLLIN | EPOLLONESHOT), "epoll_ctl");
}

std::uint16_t Server::Implementation::listenOnLoopback(std::uint16_t port) {
    Descriptor made = loopbackSocket(port);
    listen(made.get(), std::to_string(port), {});
    const embedded::MutexLock lock(lock_);
    ownSockets_.push_back(std::move(made));
    return port;
}

void Server::Implementation::accept(Listener& listener) {
    for (;;) {
        const int socket =
            ::accept4(listener.socket, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
        if (socket != -1) {
            admit(socket, listener);
            continue;
        }
        if (errno == EINTR || errno == ECONNABORTED) continue;
        if (errno == EAGAIN || errno == EWOULDBLOCK) break;
        // Out of descriptors or memory: the connection stays in the queue. Accepting again at once
        // would make this thread spin.
        {
            const embedded::MutexLock lock(lock_);
            listener.paused = true;
        }
        wakeBy(now() + kAcceptPause);
        return;
    }
    rearm(listener.socket, listener, EPOLLIN);
}

/// Makes a connection from an accepted socket, or closes the socket.
void Server::Implementation::admit(int socket, const Listener& listener) {
    Descriptor accepted(socket);
    const bool isWelcome = listener.admits(socket);
    const embedded::MutexLock lock(lock_);
    if (!isWelcome || connections_.size() >= limits_.connections) {
        ++counts_.refused;
        return;
    }
    try {
        auto made =
            std::make_unique<Connection>(std::move(accepted), listener.port, shared_, limits_);
        Connection& connection = *made;
        connections_[&connection] = std::move(made);
        connection.deadline = connection.deadlineFor(Connection::Next::Read);
        if (connection.deadline < wakeUp_) setTimer(connection.deadline);
        if (watch(EPOLL_CTL_ADD, socket, connection, EPOLLIN | EPOLLONESHOT) == -1) {
            connections_.erase(&connection);
            return;
        }
        ++counts_.accepted;
    } catch (const std::bad_alloc&) {
        ++counts_.refused;
    }
}

void Server::Implementation::serve(Connection& connection) {
    std::unique_lock<std::mutex> turn(connection.turn);
    connection.deadline = kNever;
    const Connection::Next next = connection.serve();
    if (next == Connection::Next::Close) {
        turn.unlock();  // no other thread waits for it: the socket is not armed
        close(connection);
        return;
    }
    const Milliseconds deadline = connection.deadlineFor(next);
    connection.deadline = deadline;
    wakeBy(deadline);
    const std::uint32_t event = next == Connection::Next::Write ? EPOLLOUT : EPOLLIN;
    // From here on the connection may wake another thread, which waits for the end of this turn.
    rearm(connection.socket(), connection, event);
}

/// Destroys the connection without the lock, because the watch hears of its end.
void Server::Implementation::close(Connection& connection) {
    std::unique_ptr<Connection> ended;
    bool isLast = false;
    {
        const embedded::MutexLock lock(lock_);
        const auto found = connections_.find(&connection);
        ended = std::move(found->second);
        connections_.erase(found);
        isLast = connections_.empty();
    }
    ended.reset();
    if (isLast) releaseKeptBlocks();
}

void Server::Implementation::wakeBy(Milliseconds deadline) {
    if (deadline >= wakeUp_) return;
    const embedded::MutexLock lock(lock_);
    if (deadline < wakeUp_) setTimer(deadline);
}

void Server::Implementation::setTimer(Milliseconds deadline) {
    wakeUp_ = deadline;
    itimerspec when{};
    when.it_value.tv_sec = static_cast<time_t>(deadline / 1000);
    when.it_value.tv_nsec = static_cast<long>(deadline % 1000) * 1'000'000 + 1;
    ::timerfd_settime(timer_.get(), TFD_TIMER_ABSTIME, &when, nullptr);
}

/// Shuts down the connections that have waited too long. The thread that this wakes closes them.
void Server::Implementation::runTimer() {
    std::uint64_t expirations = 0;
    [[maybe_unused]] const ssize_t got = ::read(timer_.get(), &expirations, sizeof expirations);
    const embedded::MutexLock lock(lock_);
    // This comes first: a deadline that was set before is seen below, and a thread that sets one
    // later also sets the timer.
    wakeUp_ = kNever;
    const Milliseconds time = now();
    Milliseconds next = kNever;
    for (const auto& entry : connections_) {
        Connection& connection = *entry.first;
        const Milliseconds deadline = connection.deadline;
        if (deadline <= time) {
            connection.deadline = kNever;
            ++counts_.timedOut;
            ::shutdown(connection.socket(), SHUT_RDWR);
        } else {
            next = std::min(next, deadline);
        }
    }
    for (const auto& listener : listeners_) {
        if (!listener->paused) continue;
        listener->paused = false;
        rearm(listener->socket, *listener, EPOLLIN);
    }
    if (next != kNever) setTimer(next);
    rearm(timer_.get(), timerSource_, EPOLLIN);
}

void Server::Implementation::stop() {
    std::vector<std::thread> threads;
    {
        const embedded::MutexLock lock(lock_);
        threads.swap(threads_);
    }
    const std::uint64_t one = 1;
    [[maybe_unused]] const ssize_t put = ::write(stopEvent_.get(), &one, sizeof one);
    for (std::thread& thread : threads)
        thread.join();
    std::unordered_map<Connection*, std::unique_ptr<Connection>> ended;
    {
        const embedded::MutexLock lock(lock_);
        for (const auto& listener : listeners_) {
            ::epoll_ctl(poll_.get(), EPOLL_CTL_DEL, listener->socket, nullptr);
        }
        listeners_.clear();
        ownSockets_.clear();
        ended.swap(connections_);
    }
    ended.clear();
    releaseKeptBlocks();
}

Counts Server::Implementation::counts() const {
    const embedded::MutexLock lock(lock_);
    Counts counts = counts_;
    counts.connections = static_cast<unsigned>(connections_.size());
    counts.calls = shared_.calls;
    counts.faults = shared_.faults;
    return counts;
}

Server::Server(const Limits& limits, CallWatch* watch)
    : implementation_(std::make_unique<Implementation>(limits, watch)) {}

Server::~Server() = default;

void Server::listen(int socket, Admission admission) {
    implementation_->listen(socket, "", std::move(admission));
}

std::uint16_t Server::listenOnLoopback(std::uint16_t port) {
    return implementation_->listenOnLoopback(port);
}

void Server::stop() {
    implementation_->stop();
}

Counts Server::counts() const {
    return implementation_->counts();
}

}  // namespace ncs
