#include "host/process/configuration/options.h"

#include <algorithm>
#include <charconv>
#include <filesystem>
#include <system_error>

#include "host/process/configuration/command_line.h"
#include "host/process/configuration/configuration_file.h"
#include "host/process/configuration/listing.h"
#include "host/process/configuration/settings.h"
#include "host/process/configuration/task_timeout.h"
#include "host/process/start_error.h"

namespace host {
namespace {

namespace fs = std::filesystem;

constexpr int kHighestPort = 65535;
constexpr int kSmallestLog = 4096;

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

std::string usableHome(const Settings& settings, const Environment& environment) {
    const std::string given = settings.text("home").value_or("");
    const std::string home = given.empty() ? valueOf(environment, "TOVRINHOME") : given;
    if (home.empty()) throw StartError("no home: give --home DIR or set TOVRINHOME");
    const std::string where = given.empty() ? "" : settings.where("home");
    std::error_code error;
    const fs::file_status status = fs::status(home, error);
    if (!fs::exists(status)) {
        throw StartError(where + "home " + home + ": " +
                         (error ? error.message() : "no such file or directory"));
    }
    if (!fs::is_directory(status)) throw StartError(where + "home " + home + " is not a directory");
    return absolutePath(home);
}

std::string stateDirectory(const Settings& settings, const std::string& home,
                           const Environment& environment) {
    const std::optional<std::string> given = settings.text("state");
    if (given && given->empty()) {
        throw StartError(settings.where("state") + "the name of the state directory is empty");
    }
    if (given) return absolutePath(*given);
    // A service manager that provides several separates them by colons.
    const std::string provided = valueOf(environment, "STATE_DIRECTORY");
    return provided.empty() ? home + "/zavhost"
                            : absolutePath(provided.substr(0, provided.find(':')));
}

/// A whole number from `least` to `most`; `otherwise` when the option was not given.
int countOf(const Settings& settings, const char* option, int most, int otherwise, int least = 1) {
    const std::optional<std::string> text = settings.text(option);
    if (!text) return otherwise;
    int number = 0;
    const char* const end = text->data() + text->size();
    const auto [rest, error] = std::from_chars(text->data(), end, number);
    if (error != std::errc() || rest != end || number < least || number > most) {
        throw StartError(settings.label(option) + " takes a number from " + std::to_string(least) +
                         " to " + std::to_string(most) + ", not \"" + *text + "\"");
    }
    return number;
}

std::chrono::seconds secondsOf(const Settings& settings, const char* option, int otherwise) {
    constexpr int kDay = 86'400;
    return std::chrono::seconds(countOf(settings, option, kDay, otherwise));
}

/// What is not given elsewhere is as long as a command may run.
std::chrono::seconds orphanWait(const Settings& settings, const Environment& environment,
                                const HostOptions& options) {
    const int usual = static_cast<int>(options.orphanWait.count());
    return secondsOf(settings, "orphan-wait",
                     options.taskTimeout.value_or(taskTimeoutIn(environment).value_or(usual)));
}

/// Whether the second of two words was chosen; the first one is the usual.
bool isSecond(const Settings& settings, const char* option, const char* first, const char* second) {
    const std::string chosen = settings.text(option).value_or(first);
    if (chosen != first && chosen != second) {
        throw StartError(settings.label(option) + " takes " + first + " or " + second + ", not \"" +
                         chosen + "\"");
    }
    return chosen == second;
}

void chooseJournal(const Settings& settings, const Environment& environment, HostOptions& options) {
    options.journal = !settings.flag("no-journal");
    options.ownState = settings.find("state") != nullptr;
    if (!options.journal && options.ownState) {
        throw StartError(settings.label("no-journal") + " and " + settings.label("state") +
                         " exclude each other");
    }
    options.maxQueued = countOf(settings, "max-queued", 1'000'000, options.maxQueued);
    options.keepDays = countOf(settings, "keep-tasks", 36'500, options.keepDays);
    options.keepRows = countOf(settings, "keep-rows", 100'000'000, options.keepRows);
    options.orphanWait = orphanWait(settings, environment, options);
    options.rerunInterrupted = isSecond(settings, "on-interrupt", "keep", "rerun");
}

void chooseSockets(const Settings& settings, const Environment& environment, HostOptions& options) {
    options.socket = settings.text("socket").value_or(defaultSocket(environment));
    options.rpcSocket = settings.text("rpc-socket").value_or(options.socket + ".rpc");
    for (const char* const name : {"socket", "rpc-socket"}) {
        if (settings.text(name) == "") {
            throw StartError(settings.where(name) + "the name of a socket is empty");
        }
    }
    if (options.socket == options.rpcSocket) {
        throw StartError(settings.where("rpc-socket") +
                         "--socket and --rpc-socket name the same file " + options.socket);
    }
    if (settings.find("rpc-port") != nullptr) {
        options.rpcPort =
            static_cast<std::uint16_t>(countOf(settings, "rpc-port", kHighestPort, 1));
    }
}

/// How long things take and how large they get.
void chooseBounds(const Settings& settings, HostOptions& options) {
    constexpr int kMostBytes = 1'000'000'000;
    if (const std::optional<std::string> timeout = settings.text("task-timeout")) {
        options.taskTimeout = taskTimeoutOf(settings.label("task-timeout"), *timeout);
    }
    options.grace = secondsOf(settings, "grace", static_cast<int>(options.grace.count()));
    options.maxOutput = countOf(settings, "max-output", kMostBytes, options.maxOutput);
    if (isSecond(settings, "log-format", "text", "json")) options.logFormat = LogFormat::Json;
    options.logSize = countOf(settings, "log-size", kMostBytes, options.logSize, kSmallestLog);
}

AccessGroups chosenGroups(const Settings& settings) {
    AccessGroups groups;
    if (const auto act = settings.text("group")) {
        groups.act = groupNamed(settings.label("group"), *act);
    }
    if (const auto read = settings.text("read-only-group")) {
        groups.read = groupNamed(settings.label("read-only-group"), *read);
    }
    return groups;
}

HostOptions chosenBy(const Settings& settings, const Environment& environment) {
    HostOptions options;
    options.guarded = !settings.flag("unguarded");
    options.traceSecrets = settings.flag("trace-secrets");
    options.check = settings.flag("check");
    options.originNode = settings.text("origin-node");
    options.plugin = settings.text("plugin");
    options.groups = chosenGroups(settings);
    options.home = usableHome(settings, environment);
    options.state = stateDirectory(settings, options.home, environment);
    chooseBounds(settings, options);
    chooseSockets(settings, environment, options);
    chooseJournal(settings, environment, options);
    return options;
}

}  // namespace

std::optional<HostOptions> readOptions(int argc, const char* const* argv,
                                       const Environment& environment) {
    std::optional<Settings> settings = readCommandLine(argc, argv);
    if (!settings) return std::nullopt;
    if (const std::optional<std::string> file = settings->text("config")) {
        settings->add(readConfigurationFile(*file));
    }
    HostOptions options = chosenBy(*settings, environment);
    if (settings->flag("print-config")) {
        options.listing = listOptions(options, *settings, environment);
    }
    return options;
}

}  // namespace host
