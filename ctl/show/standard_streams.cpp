#include "ctl/show/standard_streams.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <cstdio>

#include "ctl/show/page.h"

namespace ctl {
namespace {

/// False when standard output is a pipe that nobody reads any more.
bool isOutputRead() {
    pollfd output{STDOUT_FILENO, 0, 0};
    return ::poll(&output, 1, 0) == 0;
}

}  // namespace

void occupyStandardDescriptors() {
    for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        if (::fcntl(descriptor, F_GETFD) != -1) continue;
        // The lowest free number is this one.
        (void)::open("/dev/null", descriptor == STDIN_FILENO ? O_WRONLY : O_RDONLY);
    }
}

ExitStatus withOutputWritten(ExitStatus status) {
    const bool written = std::fflush(stdout) == 0 && std::ferror(stdout) == 0;
    if (written || status != kSuccess || !isOutputRead()) return status;
    return print({{}, complaint("the output could not be written"), kWrongUsage});
}

}  // namespace ctl
