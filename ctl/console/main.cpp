// zavctl-console: the part of zavctl that serves a page for a browser. zavctl runs it.

#include <sys/signalfd.h>

#include <csignal>
#include <cstdlib>
#include <exception>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "ctl/client/address/peer.h"
#include "ctl/client/failure.h"
#include "ctl/client/transfer/interruption.h"
#include "ctl/command_line.h"
#include "ctl/console/console_server.h"
#include "ctl/console/copied_command.h"
#include "ctl/console/embedded_page.h"
#include "ctl/show/page.h"
#include "ctl/show/standard_streams.h"
#include "ctl/show/terminal.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/host/console.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"
#include "system/file_descriptor.h"

namespace {

/// Readable once somebody wants the program to end. No thread gets these signals otherwise.
sys::FileDescriptor endSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int signal : {SIGINT, SIGTERM, SIGHUP})
        sigaddset(&signals, signal);
    ::sigprocmask(SIG_BLOCK, &signals, nullptr);
    return sys::FileDescriptor(::signalfd(-1, &signals, SFD_CLOEXEC | SFD_NONBLOCK));
}

ctl::ExitStatus printLink(const std::string& link, ctl::Format format) {
    if (format == ctl::Format::Json) return ctl::print(ctl::jsonPage({{"console", link}}));
    // A link that is broken into lines is none.
    return ctl::print({"console: " + link + "\n", {}, ctl::kSuccess, true});
}

ctl::ExitStatus serve(const ctl::Invocation& invocation) {
    const sys::FileDescriptor signals = endSignals();
    console::ConsoleSettings settings;
    settings.host = invocation.host;
    settings.page = console::embeddedPage();
    settings.command = console::copiedCommand(invocation.given);
    if (const char* const named = std::getenv("TMPDIR"); named != nullptr && *named != '\0') {
        settings.uploadDirectory = named;
    }
    settings.browsers.other = invocation.given.has(ctl::kBrowserUser)
                                  ? console::browserUser(invocation.given.text(ctl::kBrowserUser))
                                  : console::userBehindSudo();
    const auto port = static_cast<std::uint16_t>(invocation.given.number(ctl::kConsolePort));
    console::ConsoleServer server(std::move(settings), port);
    server.endWhenReadable(signals.get(), [] { ctl::Interruption::interrupt(SIGTERM); });
    const ctl::ExitStatus status =
        ctl::withOutputWritten(printLink(server.link(), invocation.format));
    if (status != ctl::kSuccess) return status;  // nobody could open it
    server.run();
    // Requests that only wait for the host may go on for minutes. They change nothing.
    std::_Exit(ctl::kSuccess);
}

/// The verb of zavctl, whose help it is that people see; here it does what it says.
const ctl::Verb& serveVerb() {
    static const ctl::Verb verb = [] {
        ctl::Verb made = ctl::kConsoleVerb;
        made.run = serve;
        return made;
    }();
    return verb;
}

const ctl::Vocabulary& consoleVocabulary() {
    static const ctl::Vocabulary vocabulary{"Serves the console of one host",
                                            ctl::kGlobalArguments,
                                            {&serveVerb(), &ctl::kVersionVerb},
                                            {}};
    return vocabulary;
}

ctl::ExitStatus run(const std::vector<std::string>& words) {
    const ctl::CommandLine line = ctl::parseCommandLine(words, consoleVocabulary());
    const ctl::Format format = line.verb == nullptr ? ctl::Format::Text : ctl::formatOf(line.given);
    ctl::lookAtTerminals(line.verb != nullptr && format == ctl::Format::Text);
    if (line.verb == nullptr) return ctl::print(line.page);
    try {
        if (line.given.has(ctl::kHostUser)) ctl::trustHostUser(line.given.text(ctl::kHostUser));
        return line.verb->run({line.given, ctl::hostAddressOf(line.given), format});
    } catch (const ctl::Failure& failure) {
        return ctl::print(ctl::failurePage(failure, format));
    }
}

}  // namespace

int main(int argc, char** argv) {
    ctl::occupyStandardDescriptors();
    std::signal(SIGPIPE, SIG_IGN);  // a browser that goes away is an error of the write
    try {
        return ctl::withOutputWritten(run({argv + 1, argv + argc}));
    } catch (const std::exception& error) {
        return ctl::print({{}, ctl::complaint(error.what()), ctl::kNoHost});
    }
}
