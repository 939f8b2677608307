#include "host/process/options.h"

#include <CLI/CLI.hpp>
#include <algorithm>
#include <charconv>
#include <filesystem>
#include <system_error>
#include <variant>
#include <vector>

#include "host/process/start_error.h"
#include "host/process/task_timeout.h"
#include "host/process/version.h"
#include "host/text/nearest_name.h"

namespace host {
namespace {

namespace fs = std::filesystem;

constexpr int kHighestPort = 65535;
constexpr int kSmallestLog = 4096;

/// The command line as it was typed; a missing option is an absent value.
struct Typed {
    std::optional<std::string> home;
    std::optional<std::string> socket;
    std::optional<std::string> rpcSocket;
    std::optional<std::string> rpcPort;
    std::optional<std::string> originNode;
    std::optional<std::string> plugin;
    std::optional<std::string> state;
    std::optional<std::string> maxQueued;
    std::optional<std::string> keepTasks;
    std::optional<std::string> keepRows;
    std::optional<std::string> orphanWait;
    std::optional<std::string> onInterrupt;
    std::optional<std::string> taskTimeout;
    std::optional<std::string> grace;
    std::optional<std::string> maxOutput;
    std::optional<std::string> logSize;
    bool noJournal = false;
    bool traceSecrets = false;
    bool check = false;
    bool unguarded = false;
};

using ValueOf = std::optional<std::string> Typed::*;
using FlagOf = bool Typed::*;

/// One option of the command line.
struct OptionRow {
    const char* name;
    const char* value;  ///< the word for its value; null: it is a flag
    const char* help;
    std::variant<ValueOf, FlagOf> place;  ///< where it goes
};

/// In the order of the help.
const OptionRow kOptions[] = {
    {"--home", "DIR", "The home directory; else TOVRINHOME names it", &Typed::home},
    {"--socket", "PATH",
     "The socket for HTTP; else ZAV_SOCKET, XDG_RUNTIME_DIR/zavhost.sock or /run/zavhost.sock",
     &Typed::socket},
    {"--rpc-socket", "PATH",
     "The socket for file transfers; else the other's name with .rpc appended", &Typed::rpcSocket},
    {"--rpc-port", "N",
     "A TCP port, 1 to 65535, that takes file transfers from this machine as well",
     &Typed::rpcPort},
    {"--origin-node", "NAME", "The name of the node that this host stands for; else the machine's",
     &Typed::originNode},
    {"--plugin", "FILE",
     "The plug-in; else libzavmgmt.so in ../lib beside this program or where the loader looks",
     &Typed::plugin},
    {"--state", "DIR",
     "The directory for what the host itself keeps; else STATE_DIRECTORY or HOME/zavhost",
     &Typed::state},
    {"--no-journal", nullptr, "Keep tasks in memory only; they end with the process",
     &Typed::noJournal},
    {"--max-queued", "N", "How many tasks may wait, 1 to 1000000; 1000 if not given",
     &Typed::maxQueued},
    {"--keep-tasks", "DAYS",
     "How many days tasks that are over are kept, 1 to 36500; 30 if not given", &Typed::keepTasks},
    {"--keep-rows", "N", "How many rows of outcomes are kept, 1 to 100000000; 10000 if not given",
     &Typed::keepRows},
    {"--orphan-wait", "SECONDS",
     "How long the host waits for commands of an earlier run before it kills them, 1 to 86400; as "
     "long as a command may run if not given",
     &Typed::orphanWait},
    {"--on-interrupt", "keep|rerun",
     "What becomes of a task in whose midst the host was killed: keep notes that, rerun runs it "
     "again; keep if not given",
     &Typed::onInterrupt},
    {"--task-timeout", "SECONDS",
     "How long one command of a task may run; else TIMEOUT says so, else 300", &Typed::taskTimeout},
    {"--grace", "SECONDS",
     "How long the task in hand may take when the host is told to end, 1 to 86400; 10 if not given",
     &Typed::grace},
    {"--max-output", "BYTES",
     "How much the commands of one task may write before they are ended, 1 to 1000000000; 16777216 "
     "if not given",
     &Typed::maxOutput},
    {"--log-size", "BYTES",
     "How long the trace log gets before a new one is begun, 4096 to 1000000000; 10485760 if not "
     "given",
     &Typed::logSize},
    {"--trace-secrets", nullptr, "Show passwords and configurations in the trace log as they are",
     &Typed::traceSecrets},
    {"--check", nullptr,
     "Check the home and the machine, print what was found, and end; the status is 1 if the host "
     "would refuse to start",
     &Typed::check},
    {"--unguarded", nullptr,
     "Switch off every guard, so that the plug-in does exactly what it is told", &Typed::unguarded},
};

void declare(CLI::App& app, Typed& typed) {
    app.set_version_flag("--version", kVersion, "Print the version and end");
    app.set_help_flag("-h,--help", "Print this help and end");
    for (const OptionRow& row : kOptions) {
        if (const FlagOf* const flag = std::get_if<FlagOf>(&row.place)) {
            app.add_flag(row.name, typed.**flag, row.help);
        } else {
            app.add_option(row.name, typed.*std::get<ValueOf>(row.place), row.help)
                ->type_name(row.value);
        }
    }
}

std::vector<std::string> namesOf(const CLI::App& app) {
    std::vector<std::string> names;
    for (const CLI::Option* const option : app.get_options()) {
        for (const std::string& name : option->get_lnames())
            names.push_back("--" + name);
    }
    return names;
}

[[noreturn]] void failOnStray(const CLI::App& app, const std::string& stray) {
    const bool isOption = !stray.empty() && stray.front() == '-';
    const std::string name = stray.substr(0, stray.find('='));
    const std::string nearest = isOption ? nearestName(name, namesOf(app)) : "";
    throw StartError(
        (isOption ? "there is no option " + name : "the argument \"" + stray + "\" has no place") +
        (nearest.empty() ? "" : "; did you mean " + nearest + "?") + " (--help shows the options)");
}

/// Null after printing what was asked for in place of a run.
std::optional<Typed> parse(int argc, const char* const* argv) {
    Typed typed;
    CLI::App app("A small agent process: loads the management plug-in and serves local clients",
                 "zavhost");
    declare(app, typed);
    app.allow_extras();
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& wanted) {
        app.exit(wanted);
        return std::nullopt;
    } catch (const CLI::ParseError& error) {
        throw StartError(std::string(error.what()) + " (--help shows the options)");
    }
    const std::vector<std::string> strays = app.remaining();
    if (!strays.empty()) failOnStray(app, strays.front());
    return typed;
}

std::string valueOf(const Environment& environment, const char* name) {
    const char* value = environment(name);
    return value == nullptr ? "" : value;
}

std::string defaultSocket(const Environment& environment) {
    const std::string named = valueOf(environment, "ZAV_SOCKET");
    if (!named.empty()) return named;
    const std::string runtime = valueOf(environment, "XDG_RUNTIME_DIR");
    return (runtime.empty() ? "/run" : runtime) + "/zavhost.sock";
}

/// Children change their working directory, where a relative path would name something else.
std::string absolutePath(const std::string& path) {
    return fs::path(path).is_absolute() ? path : fs::absolute(path).string();
}

std::string usableHome(const std::optional<std::string>& given, const Environment& environment) {
    const bool isGiven = given && !given->empty();
    const std::string home = isGiven ? *given : valueOf(environment, "TOVRINHOME");
    if (home.empty()) throw StartError("no home: give --home DIR or set TOVRINHOME");
    std::error_code error;
    const fs::file_status status = fs::status(home, error);
    if (!fs::exists(status)) {
        throw StartError("home " + home + ": " +
                         (error ? error.message() : "no such file or directory"));
    }
    if (!fs::is_directory(status)) throw StartError("home " + home + " is not a directory");
    return absolutePath(home);
}

std::string stateDirectory(const Typed& typed, const std::string& home,
                           const Environment& environment) {
    if (typed.state && typed.state->empty()) {
        throw StartError("the name of the state directory is empty");
    }
    if (typed.state) return absolutePath(*typed.state);
    // A service manager that provides several separates them by colons.
    const std::string provided = valueOf(environment, "STATE_DIRECTORY");
    return provided.empty() ? home + "/zavhost"
                            : absolutePath(provided.substr(0, provided.find(':')));
}

/// A whole number from `least` to `most`; `otherwise` when the option was not given.
int countOf(const char* option, const std::optional<std::string>& typed, int most, int otherwise,
            int least = 1) {
    if (!typed) return otherwise;
    int number = 0;
    const char* const end = typed->data() + typed->size();
    const auto [rest, error] = std::from_chars(typed->data(), end, number);
    if (error != std::errc() || rest != end || number < least || number > most) {
        throw StartError(std::string(option) + " takes a number from " + std::to_string(least) +
                         " to " + std::to_string(most) + ", not \"" + *typed + "\"");
    }
    return number;
}

/// What is not given elsewhere is as long as a command may run.
std::chrono::seconds orphanWait(const Typed& typed, const Environment& environment,
                                const HostOptions& options) {
    const int usual = static_cast<int>(options.orphanWait.count());
    const int timeout = options.taskTimeout.value_or(taskTimeoutIn(environment).value_or(usual));
    return std::chrono::seconds(countOf("--orphan-wait", typed.orphanWait, 86'400, timeout));
}

void chooseJournal(const Typed& typed, const Environment& environment, HostOptions& options) {
    if (typed.noJournal && typed.state) {
        throw StartError("--no-journal and --state exclude each other");
    }
    options.journal = !typed.noJournal;
    options.ownState = typed.state.has_value();
    options.maxQueued = countOf("--max-queued", typed.maxQueued, 1'000'000, options.maxQueued);
    options.keepDays = countOf("--keep-tasks", typed.keepTasks, 36'500, options.keepDays);
    options.keepRows = countOf("--keep-rows", typed.keepRows, 100'000'000, options.keepRows);
    options.orphanWait = orphanWait(typed, environment, options);
    const std::string onInterrupt = typed.onInterrupt.value_or("keep");
    if (onInterrupt != "keep" && onInterrupt != "rerun") {
        throw StartError("--on-interrupt takes keep or rerun, not \"" + onInterrupt + "\"");
    }
    options.rerunInterrupted = onInterrupt == "rerun";
}

void chooseSockets(const Typed& typed, const Environment& environment, HostOptions& options) {
    options.socket = typed.socket ? *typed.socket : defaultSocket(environment);
    options.rpcSocket = typed.rpcSocket ? *typed.rpcSocket : options.socket + ".rpc";
    if (options.socket.empty() || options.rpcSocket.empty()) {
        throw StartError("the name of a socket is empty");
    }
    if (options.socket == options.rpcSocket) {
        throw StartError("--socket and --rpc-socket name the same file " + options.socket);
    }
}

}  // namespace

std::optional<HostOptions> readOptions(int argc, const char* const* argv,
                                       const Environment& environment) {
    const std::optional<Typed> typed = parse(argc, argv);
    if (!typed) return std::nullopt;
    HostOptions options;
    options.guarded = !typed->unguarded;
    options.traceSecrets = typed->traceSecrets;
    options.check = typed->check;
    options.originNode = typed->originNode;
    options.plugin = typed->plugin;
    options.home = usableHome(typed->home, environment);
    options.state = stateDirectory(*typed, options.home, environment);
    if (typed->rpcPort) {
        options.rpcPort =
            static_cast<std::uint16_t>(countOf("--rpc-port", typed->rpcPort, kHighestPort, 1));
    }
    if (typed->taskTimeout)
        options.taskTimeout = taskTimeoutOf("--task-timeout", *typed->taskTimeout);
    options.grace = std::chrono::seconds(
        countOf("--grace", typed->grace, 86'400, static_cast<int>(options.grace.count())));
    options.maxOutput = countOf("--max-output", typed->maxOutput, 1'000'000'000, options.maxOutput);
    options.logSize =
        countOf("--log-size", typed->logSize, 1'000'000'000, options.logSize, kSmallestLog);
    chooseSockets(*typed, environment, options);
    chooseJournal(*typed, environment, options);
    return options;
}

}  // namespace host
