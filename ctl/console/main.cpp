// zavctl-console: the part of zavctl that serves a page for a browser. zavctl runs it.

#include <csignal>
#include <exception>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/address/peer.h"
#include "ctl/client/failure.h"
#include "ctl/client/transfer/interruption.h"
#include "ctl/command_line.h"
#include "ctl/console/embedded_page.h"
#include "ctl/console/host/copied_command.h"
#include "ctl/console/host/host_backend.h"
#include "ctl/console/received_file.h"
#include "ctl/console/serving.h"
#include "ctl/show/page.h"
#include "ctl/show/standard_streams.h"
#include "ctl/show/terminal.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/host/console.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"
#include "system/file_descriptor.h"

namespace {

ctl::ExitStatus serve(const ctl::Invocation& invocation) {
    const sys::FileDescriptor signals = console::endSignals();
    console::HostSettings host;
    host.host = invocation.host;
    host.command = console::copiedCommand(invocation.given);
    host.uploadDirectory = console::receivingDirectory();
    console::HostBackend backend(std::move(host));
    console::ConsoleSettings settings;
    settings.page = console::embeddedPage();
    settings.browsers = console::browsersOf(invocation.given);
    return console::serveUntilSignal(std::move(settings), backend, invocation.given,
                                     invocation.format, signals,
                                     [] { ctl::Interruption::interrupt(SIGTERM); });
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
