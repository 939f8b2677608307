#include "host/process/system/signal_descriptor.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdint>

#include "host/process/start_error.h"

namespace host {
namespace {

volatile int descriptorOf[NSIG];
volatile pid_t ownProcess = -1;

extern "C" void onCaughtSignal(int signal) {
    // A child between fork and exec shares the descriptor, but its signals are its own.
    if (::getpid() != ownProcess) return;
    const int error = errno;
    const std::uint64_t one = 1;
    if (::write(descriptorOf[signal], &one, sizeof one) < 0) errno = error;
    errno = error;
}

}  // namespace

int catchSignals(std::initializer_list<int> signals) {
    const int descriptor = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (descriptor < 0) throw StartError("out of file descriptors");
    ownProcess = ::getpid();
    struct sigaction action {};
    action.sa_handler = onCaughtSignal;
    action.sa_flags = SA_RESTART | SA_NOCLDSTOP;
    sigemptyset(&action.sa_mask);
    for (const int signal : signals) {
        descriptorOf[signal] = descriptor;
        ::sigaction(signal, &action, nullptr);
    }
    return descriptor;
}

void forgetSignals(int descriptor) {
    std::uint64_t count = 0;
    while (::read(descriptor, &count, sizeof count) == -1 && errno == EINTR) {
    }
}

}  // namespace host
