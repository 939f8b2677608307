// zavctl: sends a central server's requests to a managed host and shows how they ended.

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <exception>
#include <string>
#include <vector>

#include "ctl/client/address/peer.h"
#include "ctl/client/failure.h"
#include "ctl/command_line.h"
#include "ctl/completion/completion.h"
#include "ctl/show/page.h"
#include "ctl/show/terminal.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/invocation.h"

namespace {

/// A standard descriptor that the caller has closed would be given to the next socket, and the
/// output would go to the host. In its place stands one on which reading or writing fails.
void occupyStandardDescriptors() {
    for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        if (::fcntl(descriptor, F_GETFD) != -1) continue;
        // The lowest free number is this one.
        (void)::open("/dev/null", descriptor == STDIN_FILENO ? O_WRONLY : O_RDONLY);
    }
}

ctl::ExitStatus run(const ctl::CommandLine& line, ctl::Format format) {
    if (line.verb == nullptr) return ctl::print(line.page);
    try {
        if (line.given.has(ctl::kHostUser)) ctl::trustHostUser(line.given.text(ctl::kHostUser));
        return line.verb->run({line.given, ctl::hostAddressOf(line.given), format});
    } catch (const ctl::Failure& failure) {
        return ctl::print(ctl::failurePage(failure, format));
    }
}

ctl::ExitStatus run(const std::vector<std::string>& words) {
    if (!words.empty() && words.front() == ctl::kCompletionWord) {
        return ctl::print(
            {ctl::completionOf({words.begin() + 1, words.end()}), {}, ctl::kSuccess, true});
    }
    const ctl::CommandLine line = ctl::parseCommandLine(words);
    const ctl::Format format = line.verb == nullptr ? ctl::Format::Text : ctl::formatOf(line.given);
    // What stands on a page that needs no verb fits already.
    ctl::lookAtTerminals(line.verb != nullptr && format == ctl::Format::Text);
    return run(line, format);
}

/// False when standard output is a pipe that nobody reads any more.
bool isOutputRead() {
    pollfd output{STDOUT_FILENO, 0, 0};
    return ::poll(&output, 1, 0) == 0;
}

/// Output that could not be written, on a full disk for instance, is a failure. It is none when the
/// reader has read enough and gone.
ctl::ExitStatus withOutputWritten(ctl::ExitStatus status) {
    const bool written = std::fflush(stdout) == 0 && std::ferror(stdout) == 0;
    if (written || status != ctl::kSuccess || !isOutputRead()) return status;
    return ctl::print({{}, ctl::complaint("the output could not be written"), ctl::kWrongUsage});
}

}  // namespace

int main(int argc, char** argv) {
    occupyStandardDescriptors();
    std::signal(SIGPIPE, SIG_IGN);  // a host that goes away is an error of the write
    try {
        return withOutputWritten(run({argv + 1, argv + argc}));
    } catch (const std::exception& error) {
        return ctl::print({{}, ctl::complaint(error.what()), ctl::kNoHost});
    }
}
