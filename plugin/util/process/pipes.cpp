#include "util/process/pipes.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "base/zavtrace.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavprnix"};

constexpr int kFirstOwnDescriptor = 3;

bool moveAboveStandardStreams(FileDescriptor& end) {
    if (end.get() >= kFirstOwnDescriptor) return true;
    end = FileDescriptor(::fcntl(end.get(), F_DUPFD_CLOEXEC, kFirstOwnDescriptor));
    return end.isOpen();
}

bool makePipe(Pipe& made) {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) return false;
    made.readEnd = FileDescriptor(ends[0]);
    made.writeEnd = FileDescriptor(ends[1]);
    return moveAboveStandardStreams(made.readEnd) && moveAboveStandardStreams(made.writeEnd);
}

}  // namespace

bool createPipes(Pipe& out, Pipe& err, Pipe& in) {
    Trace trace(traceUnit);
    if (!makePipe(out)) {
        trace().error("failed to create stdout pipe");
        return trace.exit(false);
    }
    if (!makePipe(err)) {
        trace().error("failed to create stderr pipe");
        return trace.exit(false);
    }
    if (!makePipe(in)) {
        trace().error("failed to create stdin pipe");
        return trace.exit(false);
    }
    return trace.exit(true);
}

bool closePipeEnd(FileDescriptor& end) {
    // On Linux an interrupted close has closed the descriptor and must not be repeated, but closing
    // a pipe is never interrupted there. Elsewhere it can be, and has to be repeated.
    const int fd = end.release();
    int result;
    do {
        result = ::close(fd);
    } while (result == -1 && errno == EINTR);
    return result == 0;
}

}  // namespace ZAV
