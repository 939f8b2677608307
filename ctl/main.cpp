// zavctl: sends a central server's requests to a managed host and shows how they ended.

#include <poll.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <clocale>
#include <csignal>
#include <cstdio>
#include <string>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/client/options.h"
#include "ctl/verbs/commands.h"

namespace {

void addGlobalOptions(CLI::App& app, ctl::Options& options) {
    app.add_option("--socket", options.socket,
                   "The host's socket; without it $ZAV_SOCKET, else zavhost.sock in\n"
                   "$XDG_RUNTIME_DIR, else /run/zavhost.sock")
        ->type_name("PATH");
    app.add_option("--rpc-socket", options.rpcSocket,
                   "The host's file transfer socket; without it the socket's name with .rpc\n"
                   "appended")
        ->type_name("PATH");
    app.add_flag("--json", options.json, "Print one JSON document");
    app.add_option("--timeout", options.timeoutSeconds,
                   "How long to wait for an answer or an outcome; 660 if not given")
        ->check(CLI::Range(0.0, 1e9))
        ->type_name("SECONDS");
    app.footer(
        "Exit status: 0 success, 1 the host reported a failure, 2 wrong usage,\n"
        "3 no host reached, 4 no outcome within --timeout.");
}

/// Prints what is wrong with the command line, or the help that it asks for. An unknown word also
/// keeps a required one from being found; then the unknown one is what to say.
int reportParse(const CLI::App& app, const CLI::ParseError& error) {
    const std::vector<std::string> unknown = app.remaining(true);
    const bool missing = dynamic_cast<const CLI::RequiredError*>(&error) != nullptr;
    const int code = missing && !unknown.empty()
                         ? app.exit(CLI::ExtrasError(app.get_name(), unknown))
                         : app.exit(error);
    return code == 0 ? ctl::kSuccess : ctl::kWrongUsage;
}

int run(int argc, char** argv) {
    CLI::App app("Manages the monitoring agents of one host.", "zavctl");
    ctl::Options options;
    int status = ctl::kSuccess;
    app.require_subcommand(1);
    app.fallthrough();
    addGlobalOptions(app, options);
    // Runs before the command's own callback, when all options are known.
    app.parse_complete_callback([&options] {
        if (options.socket.empty()) options.socket = ctl::defaultSocket();
        if (options.rpcSocket.empty()) options.rpcSocket = options.socket + ".rpc";
    });
    ctl::addTaskCommands(app, options, status);
    ctl::addConfigurationCommands(app, options, status);
    ctl::addTransferCommands(app, options, status);
    ctl::addInformationCommands(app, options, status);
    try {
        app.parse(argc, argv);
    } catch (const CLI::ParseError& error) {
        return reportParse(app, error);
    }
    return status;
}

/// False when standard output is a pipe that nobody reads any more.
bool isOutputRead() {
    pollfd output{STDOUT_FILENO, 0, 0};
    return ::poll(&output, 1, 0) == 0;
}

/// What could not be written is missed by its reader, on a full disk for instance; a reader that
/// has read enough misses nothing.
int withOutputWritten(int status) {
    const bool written = std::fflush(stdout) == 0 && std::ferror(stdout) == 0;
    if (written || status != ctl::kSuccess || !isOutputRead()) return status;
    std::fprintf(stderr, "zavctl: the output could not be written\n");
    return ctl::kWrongUsage;
}

}  // namespace

int main(int argc, char** argv) {
    std::setlocale(LC_CTYPE, "");
    std::signal(SIGPIPE, SIG_IGN);  // a host that goes away is an error of the write
    try {
        return withOutputWritten(run(argc, argv));
    } catch (const ctl::Failure& failure) {
        std::fprintf(stderr, "zavctl: %s\n", failure.what());
        return failure.status();
    } catch (const std::exception& error) {
        std::fprintf(stderr, "zavctl: %s\n", error.what());
        return ctl::kNoHost;
    }
}
