#include "host/process/end_signals.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdint>

#include "host/process/start_error.h"

namespace host {
namespace {

volatile int signalDescriptor = -1;
volatile pid_t ownProcess = -1;

extern "C" void onEndSignal(int) {
    // A child between fork and exec shares the descriptor, but its signals are its own.
    if (::getpid() != ownProcess) return;
    const int error = errno;
    const std::uint64_t one = 1;
    if (::write(signalDescriptor, &one, sizeof one) < 0) errno = error;
    errno = error;
}

}  // namespace

int catchEndSignals() {
    signalDescriptor = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (signalDescriptor < 0) throw StartError("out of file descriptors");
    ownProcess = ::getpid();
    struct sigaction action {};
    action.sa_handler = onEndSignal;
    action.sa_flags = SA_RESTART;
    sigemptyset(&action.sa_mask);
    ::sigaction(SIGTERM, &action, nullptr);
    ::sigaction(SIGINT, &action, nullptr);
    return signalDescriptor;
}

}  // namespace host
