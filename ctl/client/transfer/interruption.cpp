#include "ctl/client/transfer/interruption.h"

#include <sys/socket.h>

#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>

namespace ctl {
namespace {

constexpr std::array<int, 3> kSignals = {SIGINT, SIGTERM, SIGHUP};

// The handler may use nothing else.
std::atomic<int> caught{0};
std::array<std::atomic<int>, 8> sockets = {-1, -1, -1, -1, -1, -1, -1, -1};
static_assert(std::atomic<int>::is_always_lock_free);

struct sigaction formerActions[kSignals.size()];

extern "C" void onInterruption(int signal) {
    const int error = errno;
    caught = signal;
    for (const std::atomic<int>& socket : sockets) {
        const int descriptor = socket;
        if (descriptor >= 0) ::shutdown(descriptor, SHUT_WR);
    }
    errno = error;
}

bool exchange(int expected, int wanted) {
    for (std::atomic<int>& socket : sockets) {
        int found = expected;
        if (socket.compare_exchange_strong(found, wanted)) return true;
    }
    return false;
}

}  // namespace

Interruption::Interruption() {
    caught = 0;
    struct sigaction action {};
    action.sa_handler = onInterruption;
    action.sa_flags = static_cast<int>(SA_RESETHAND);
    sigemptyset(&action.sa_mask);
    for (std::size_t i = 0; i < kSignals.size(); ++i) {
        ::sigaction(kSignals[i], nullptr, &formerActions[i]);
        // A signal that was ignored when the program started stays ignored.
        if (formerActions[i].sa_handler != SIG_IGN) ::sigaction(kSignals[i], &action, nullptr);
    }
}

Interruption::~Interruption() {
    for (std::size_t i = 0; i < kSignals.size(); ++i)
        ::sigaction(kSignals[i], &formerActions[i], nullptr);
}

void Interruption::interrupt(int signal) {
    onInterruption(signal);
}

int Interruption::signal() {
    return caught;
}

void Interruption::watch(int socket) {
    exchange(-1, socket);
    // The signal may have come before the socket was known.
    if (caught != 0) ::shutdown(socket, SHUT_WR);
}

void Interruption::forget(int socket) {
    exchange(socket, -1);
}

}  // namespace ctl
