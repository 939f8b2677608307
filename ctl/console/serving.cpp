#include "ctl/console/serving.h"

#include <sys/signalfd.h>

#include <csignal>
#include <cstdlib>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>

#include "ctl/show/standard_streams.h"
#include "ctl/verbs/host/console.h"

namespace console {

ctl::ExitStatus printLink(const std::string& link, ctl::Format format) {
    if (format == ctl::Format::Json) return ctl::print(ctl::jsonPage({{"console", link}}));
    // A link that is broken into lines is none.
    return ctl::print({"console: " + link + "\n", {}, ctl::kSuccess, true});
}

sys::FileDescriptor endSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int signal : {SIGINT, SIGTERM, SIGHUP})
        sigaddset(&signals, signal);
    ::sigprocmask(SIG_BLOCK, &signals, nullptr);
    return sys::FileDescriptor(::signalfd(-1, &signals, SFD_CLOEXEC | SFD_NONBLOCK));
}

Browsers browsersOf(const ctl::Values& given) {
    Browsers browsers;
    browsers.other = given.has(ctl::kBrowserUser) ? browserUser(given.text(ctl::kBrowserUser))
                                                  : userBehindSudo();
    return browsers;
}

ctl::ExitStatus serveUntilSignal(ConsoleSettings settings, Backend& backend,
                                 const ctl::Values& given, ctl::Format format,
                                 const sys::FileDescriptor& signals, std::function<void()> begins) {
    const auto port = static_cast<std::uint16_t>(given.number(ctl::kConsolePort));
    ConsoleServer server(std::move(settings), backend, port);
    server.endWhenReadable(signals.get(), std::move(begins));
    const ctl::ExitStatus status = ctl::withOutputWritten(printLink(server.link(), format));
    if (status != ctl::kSuccess) return status;  // nobody could open it
    server.run();
    // Requests that only wait for an answer may go on for minutes. They change nothing.
    std::_Exit(ctl::kSuccess);
}

}  // namespace console
