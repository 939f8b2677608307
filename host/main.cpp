// zavhost: a small agent process that loads the management plug-in and serves local clients.

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <optional>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "embedded/ncs_host.h"
#include "embedded/oxa_host.h"
#include "embedded/ras1_control.h"
#include "host/api/api.h"
#include "host/api/pulse.h"
#include "host/api/routes.h"
#include "host/api/services.h"
#include "host/api/tasks/interruption.h"
#include "host/checks/check_list.h"
#include "host/commands/recorder.h"
#include "host/depot/depot_directory.h"
#include "host/home/parameter_copy.h"
#include "host/home/temporary_directory.h"
#include "host/peers/peer_of.h"
#include "host/process/children/last_processes.h"
#include "host/process/children/orphans.h"
#include "host/process/configuration/options.h"
#include "host/process/configuration/task_timeout.h"
#include "host/process/home_lock.h"
#include "host/process/log.h"
#include "host/process/plugin_loader.h"
#include "host/process/setup.h"
#include "host/process/socket_file.h"
#include "host/process/start_error.h"
#include "host/process/system/signal_descriptor.h"
#include "host/service/notifier.h"
#include "host/service/on_change.h"
#include "host/service/service_environment.h"
#include "host/service/status_reporter.h"
#include "host/service/task_log.h"
#include "host/service/task_status.h"
#include "host/service/trace_log.h"
#include "http/server.h"

namespace host {
namespace {

/// Starts the plug-in; returns its tables.
std::vector<oxa::Table> startPlugin(const HostOptions& options) {
    const Plugin plugin(options.plugin);
    if (options.originNode) oxa::setOriginNode(*options.originNode);
    const int status = plugin.initialize();
    std::vector<oxa::Table> tables = oxa::tables();
    if (tables.empty()) throw StartError("plug-in " + plugin.file() + " offers no tables");
    if (status != 0) {
        say(Priority::Warning, "plug-in " + plugin.file() + " started with status " +
                                   std::to_string(status) + "; file transfers may fail");
    }
    return tables;
}

/// Serves file transfers on a socket of their own, and on a loopback port if one was asked for.
void serveTransfers(ncs::Server& transfers, SocketFile& socket, const HostOptions& options) {
    transfers.listen(socket.listen(), [groups = options.groups](int accepted) {
        return peerOf(accepted, groups).access == http::Access::Act;
    });
    if (!options.rpcPort) return;
    try {
        transfers.listenOnLoopback(*options.rpcPort);
    } catch (const std::system_error& error) {
        throw StartError("cannot listen on the loopback port " + std::to_string(*options.rpcPort) +
                         ": " + error.code().message());
    }
}

const char* environmentVariable(const char* name) {
    return std::getenv(name);
}

/// Prints what the checks find. Returns the exit status.
int check(const HostOptions& options) {
    CheckSubject subject(options, environmentVariable);
    const std::vector<CheckResult> results = runChecks(subject);
    for (const CheckResult& result : results)
        std::fputs(lineOf(result).c_str(), stdout);
    return hasError(results) ? 1 : 0;
}

/// Throws StartError, which names them all in one line, if the checks find errors. Otherwise says
/// on standard error what they warn of.
void refuseUnfitHome(const HostOptions& options) {
    CheckSubject subject(options, environmentVariable);
    std::string errors;
    std::vector<std::string> warnings;
    for (const CheckResult& result : runChecks(subject)) {
        const std::string words = result.check + ": " + wordsOf(result.finding);
        if (result.finding.verdict == Verdict::Error) errors += "; " + words;
        if (result.finding.verdict == Verdict::Warning) {
            warnings.push_back("warning: " + words);
        }
    }
    if (!errors.empty()) throw StartError("not started (see --check)" + errors);
    for (const std::string& warning : warnings)
        say(Priority::Warning, warning);
}

/// The port can be reached from where the sockets' files cannot, and what comes through it must not
/// replace the home's programs.
void refuseHomeOnPort(const HostOptions& options, const DepotDirectory& depot) {
    if (!options.guarded || !options.rpcPort || !holdsHome(depot, options.home)) return;
    throw StartError("--rpc-port: the depot " + depot.path +
                     " holds the home itself, whose programs a transfer could replace; name "
                     "another directory in " +
                     kDepotVariable);
}

/// What a host that was killed has left of the universal agent's start-up parameters.
void restoreParameters(const std::string& home) {
    const ParameterCopy copy(home);
    try {
        if (!copy.restore()) return;
    } catch (const std::system_error& error) {
        throw StartError(error.what());
    }
    say(Priority::Warning, "restored " + copy.file() +
                               ", which was cut off while a task changed it; look whether the "
                               "change is to be made again");
}

/// What a guarded host does before anything of the home is used. Returns the home's lock.
HomeLock guardStart(const HostOptions& options) {
    takeWritePermissionFromOthers();
    HomeLock lock(options.home);
    restoreParameters(options.home);
    refuseUnfitHome(options);
    provideTemporaryDirectory(options.home);
    return lock;
}

/// Unguarded hosts may share a home, as processes that load the plug-in themselves may. Their
/// operator should know.
void warnOfOwner(const std::string& home) {
    const std::string owner = HomeLock::ownerOf(home);
    if (owner.empty()) return;
    say(Priority::Warning, "warning: home " + home + " is in use by " + owner +
                               "; both will run commands there at the same time");
}

/// The trace is the host's only log; what it prints itself goes to its standard outputs.
void reopenLogs(int signals) {
    forgetSignals(signals);
    if (ras1::reopenLog()) return;
    say(Priority::Warning, "the trace log cannot be opened anew; the old one is still used");
}

/// Ends what a command leaves behind when its time is over, and reaps it. run() is called on the
/// main thread, which has no other children.
void attendToOrphans(http::HttpServer& server, int childSignals) {
    adoptOrphans();
    endWhatGivenUpCommandsStarted();
    // Each child of the plug-in sends a signal, too, and needs nothing of this thread.
    constexpr std::chrono::milliseconds kPatience{100};
    server.whenReadable(childSignals, kPatience, [childSignals] {
        forgetSignals(childSignals);
        reapOrphans();
    });
}

/// At the end, for whoever reads the log.
void sayWhatWaits(Journal& journal) {
    const std::int64_t waiting = journal.notBegun();
    if (waiting > 0) {
        say(Priority::Notice, std::to_string(waiting) + " tasks wait for the next start");
    }
}

/// Unguarded hosts may share a home, but not a journal.
Journal::Settings journalOf(const HostOptions& options) {
    return {options.journal ? options.state : std::string(), options.rerunInterrupted,
            options.keepDays, options.keepRows, !options.guarded && !options.ownState};
}

/// Agents live on when their host ends, but not when it is process 1: then they end with it, and
/// may at least end in good order. Their pid files stay, so they are started again with the next
/// container.
void endContainer(Journal& journal) {
    if (::getpid() == 1) journal.close();  // the commands of a task in hand are cut off, not failed
    // Agents have five seconds to end when they are stopped, unless they ask for more.
    constexpr std::chrono::seconds kPatience{10};
    const std::size_t left = endLastProcesses(kPatience);
    if (left == 0) return;
    say(Priority::Warning, std::to_string(left) + " processes have not ended within " +
                               std::to_string(kPatience.count()) + " s and are killed");
}

SocketFile openSocket(const std::string& path, Connects connects,
                      std::optional<PassedSocket> passed) {
    if (passed) return SocketFile(path, connects, std::move(passed->descriptor));
    return SocketFile(path, connects);
}

/// Half of the time after which the service manager takes the host for dead.
std::chrono::milliseconds feedingTime(std::chrono::microseconds watchdog) {
    using std::chrono::milliseconds;
    return std::clamp(std::chrono::duration_cast<milliseconds>(watchdog / 2), milliseconds(1),
                      milliseconds(std::chrono::hours(1)));
}

/// On the thread that serves clients: so its own life is what the service manager hears of.
void feedWatchdog(http::HttpServer& server, const Notifier& notifier, const Journal& journal,
                  const ServiceEnvironment& service) {
    if (!service.watchdog || !notifier.isWanted()) return;
    server.every(feedingTime(*service.watchdog), [&notifier, &journal] {
        const bool isAlive = hangsOf(pulseOf(journal), std::chrono::steady_clock::now()).empty();
        if (isAlive) notifier.tell("WATCHDOG=1\n");
    });
}

std::string statusOf(Journal& journal) {
    const std::int64_t queued = journal.notBegun();
    return taskStatus(queued, journal.running());
}

/// False when the journal cannot be read now: what is new is told at the next look.
bool tellOfTasks(TaskLog& log) {
    try {
        log.look();
        return true;
    } catch (const std::exception&) {
        // Requests say so to those whom it concerns.
        return false;
    }
}

void run(const HostOptions& options, ServiceEnvironment service) {
    const Notifier notifier(service.notifySocket);
    std::optional<PassedSocket> passed = takeSocket(service.sockets, "http", options.socket);
    std::optional<PassedSocket> passedTransfers =
        takeSocket(service.sockets, "rpc", options.rpcSocket);
    refuseSuperfluous(service.sockets);
    const bool keepsListener = passed.has_value();
    ras1::showSecrets(options.traceSecrets || !options.guarded);
    constexpr int kOlderLogs = 3;
    ras1::limitLog(static_cast<std::uint64_t>(options.logSize), kOlderLogs);
    std::optional<HomeLock> homeLock;
    // The checks look at the time-out too, and name it beside whatever else is wrong.
    if (options.guarded) {
        homeLock.emplace(guardStart(options));
    } else {
        warnOfOwner(options.home);
    }
    chooseTaskTimeout(options.taskTimeout, options.guarded, environmentVariable);
    ::setenv("TOVRINHOME", options.home.c_str(), 1);
    const Connects connects = options.groups.any() ? Connects::Everybody : Connects::Owner;
    SocketFile socket = openSocket(options.socket, connects, std::move(passed));
    SocketFile transferSocket = openSocket(options.rpcSocket, connects, std::move(passedTransfers));
    const int endDescriptor = catchSignals({SIGTERM, SIGINT});
    const int reopenDescriptor = catchSignals({SIGHUP});
    const int childDescriptor = options.guarded ? catchSignals({SIGCHLD}) : -1;
    const DepotDirectory depot =
        depotDirectoryOf(options.home, std::getenv(kDepotVariable), options.guarded);
    refuseHomeOnPort(options, depot);
    provideDepotDirectory(depot);
    limitOutput(static_cast<std::uint64_t>(options.maxOutput));
    if (wantsTraceFile(options.logFormat, environmentVariable)) {
        traceToFile(options.state, environmentVariable);
    }
    std::vector<oxa::Table> tables = startPlugin(options);
    if (options.guarded) requireDepotDirectory(depot);
    Services services(std::move(tables), CodePage::ofProcess(), options.home, {}, options.guarded,
                      {depot.path, options.state}, journalOf(options));
    services.maxQueued = options.maxQueued;
    services.checkSubject = [options] { return CheckSubject(options, environmentVariable); };
    Api api(services, routes());
    ncs::Server transfers({}, &services.transfers);
    services.transferServer = [&transfers] { return transfers.counts(); };
    serveTransfers(transfers, transferSocket, options);
    http::HttpServer server(socket.listen(), doorFor(options.groups), api, services.counts);
    if (keepsListener) server.leaveListenerOpen();
    server.endWhenReadable(endDescriptor, options.grace,
                           [&notifier] { notifier.tell("STOPPING=1\n"); });
    server.whenReadable(reopenDescriptor, std::chrono::milliseconds(0),
                        [&notifier, reopenDescriptor] {
                            notifier.tell(reloadingNotice());
                            reopenLogs(reopenDescriptor);
                            notifier.tell("READY=1\n");
                        });
    feedWatchdog(server, notifier, services.journal, service);
    if (options.guarded) attendToOrphans(server, childDescriptor);
    services.dispatcher.start(services.leftovers, options.orphanWait,
                              [&services] { describeInterrupted(services); });
    std::printf("ready: %s\n", options.socket.c_str());
    std::fflush(stdout);
    notifier.tellSurely("READY=1\n");
    beginLog(options.logFormat);
    TaskLog taskLog(services.journal, say);
    OnChange logging(std::chrono::seconds(1), [&] { return tellOfTasks(taskLog); });
    StatusReporter reporter(notifier, [&] { return statusOf(services.journal); });
    const auto look = [&logging, &reporter] {
        logging.changed();
        reporter.changed();
    };
    services.journal.whenChanged(look);
    // Something may have been committed since their first looks.
    look();
    server.run();
    logging.stop();
    tellOfTasks(taskLog);
    services.journal.endCleanly(api.quiet());
    sayWhatWaits(services.journal);
    transfers.stop();
    transferSocket.remove();
    socket.remove();
    endContainer(services.journal);
    // The plug-in's executor never ends and uses its globals to the last, so destroy nothing.
    ::_exit(0);
}

int start(int argc, char** argv) {
    setUpProcess();
    try {
        ServiceEnvironment service = readServiceEnvironment(environmentVariable);
        forgetServiceEnvironment();
        const auto options = readOptions(argc, argv, environmentVariable);
        if (options && options->listing) return std::fputs(options->listing->c_str(), stdout) < 0;
        if (options && options->check) return check(*options);
        if (options && options->logFormat == LogFormat::Json) beginLog(LogFormat::Json);
        if (options) run(*options, std::move(service));
        return 0;
    } catch (const std::exception& error) {
        say(Priority::Error, error.what());
        return 1;
    }
}

}  // namespace
}  // namespace host

int main(int argc, char** argv) {
    const int status = host::start(argc, argv);
    std::fflush(stdout);
    ::_exit(status);  // a plug-in that was started has threads of its own
}
