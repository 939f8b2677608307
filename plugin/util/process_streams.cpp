// The caller's ends of a child's pipes.

#include <fcntl.h>
#include <signal.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>

#include "base/zavtrace.h"
#include "util/process/pipes.h"
#include "util/zavprocs.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavprocs"};

int switchNonBlocking(int fd, bool on) {
    const int flags = ::fcntl(fd, F_GETFL);
    if (flags == -1) return -1;
    return ::fcntl(fd, F_SETFL, on ? flags | O_NONBLOCK : flags & ~O_NONBLOCK);
}

/// While it exists, SIGPIPE is blocked in the calling thread; at its end it discards the SIGPIPE
/// that a write has raised. One that was pending before stays pending.
class SigpipeHeldBack {
public:
    SigpipeHeldBack() {
        ::sigemptyset(&sigpipe_);
        ::sigaddset(&sigpipe_, SIGPIPE);
        sigset_t pending;
        ::sigpending(&pending);
        wasPending_ = ::sigismember(&pending, SIGPIPE) == 1;
        ::pthread_sigmask(SIG_BLOCK, &sigpipe_, &before_);
    }
    ~SigpipeHeldBack() {
        const int savedErrno = errno;
        if (raised_ && !wasPending_) {
            const timespec now{};
            while (::sigtimedwait(&sigpipe_, nullptr, &now) == -1 && errno == EINTR) {
            }
        }
        ::pthread_sigmask(SIG_SETMASK, &before_, nullptr);
        errno = savedErrno;
    }
    SigpipeHeldBack(const SigpipeHeldBack&) = delete;
    SigpipeHeldBack& operator=(const SigpipeHeldBack&) = delete;

    void raised() { raised_ = true; }

private:
    sigset_t sigpipe_;
    sigset_t before_;
    bool wasPending_ = false;
    bool raised_ = false;
};

}  // namespace

int ProcessInputStream::read() {
    unsigned char byte = 0;
    return read(&byte, 1) == 1 ? byte : -1;
}

int ProcessInputStream::read(void* buf, int len) {
    Trace trace(traceUnit);
    return trace.exit(static_cast<int>(readSome(fd_.get(), buf, static_cast<std::size_t>(len))));
}

int ProcessInputStream::setNonBlocking(bool on) {
    Trace trace(traceUnit);
    nonBlocking_ = on;
    return trace.exit(switchNonBlocking(fd_.get(), on));
}

bool ProcessInputStream::close() {
    Trace trace(traceUnit);
    return trace.exit(closePipeEnd(fd_));
}

bool ProcessOutputStream::write(const char* buf, int len) {
    Trace trace(traceUnit);
    while (len > 0) {
        const ssize_t written = writeSome(buf, static_cast<std::size_t>(len));
        if (written <= 0) return trace.exit(false);
        buf += written;
        len -= static_cast<int>(written);
    }
    return trace.exit(true);
}

ssize_t ProcessOutputStream::writeSome(const char* buf, std::size_t len) {
    SigpipeHeldBack sigpipe;
    ssize_t written;
    do {
        written = ::write(fd_.get(), buf, len);
    } while (written == -1 && errno == EINTR);
    if (written == -1 && errno == EPIPE) sigpipe.raised();
    return written;
}

int ProcessOutputStream::setNonBlocking(bool on) {
    Trace trace(traceUnit);
    return trace.exit(switchNonBlocking(fd_.get(), on));
}

bool ProcessOutputStream::close() {
    Trace trace(traceUnit);
    return trace.exit(closePipeEnd(fd_));
}

}  // namespace ZAV
