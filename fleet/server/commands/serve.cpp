#include <pthread.h>
#include <sys/resource.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <csignal>
#include <memory>
#include <ostream>
#include <thread>

#include "fleet/https/client/server_url.h"
#include "fleet/log/log.h"
#include "fleet/server/api/api_server.h"
#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/service/centre_service.h"

namespace fleet {
namespace {

/// Blocked in all threads, so that one thread waits for them.
sigset_t blockSignals() {
    ::signal(SIGPIPE, SIG_IGN);
    sigset_t signals;
    ::sigemptyset(&signals);
    ::sigaddset(&signals, SIGTERM);
    ::sigaddset(&signals, SIGINT);
    ::pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    return signals;
}

/// Ends the service when a signal comes. Waits for one until it is destroyed.
class SignalWaiter {
public:
    SignalWaiter(const sigset_t& signals, CentreService& service)
        : thread_([signals, &service] {
              int signal = 0;
              ::sigwait(&signals, &signal);
              service.end();
          }) {}
    ~SignalWaiter() {
        ::pthread_kill(thread_.native_handle(), SIGTERM);
        thread_.join();
    }
    SignalWaiter(const SignalWaiter&) = delete;
    SignalWaiter& operator=(const SignalWaiter&) = delete;

private:
    std::thread thread_;
};

struct ServeOptions {
    ServiceOptions service;
    std::string address;
    int port = -1;  ///< -1: that of the fleet's URL
};

ListenPlace placeOf(const ServeOptions& options, const CentreService& service) {
    if (options.port >= 0) return {options.address, static_cast<std::uint16_t>(options.port)};
    const ServerUrl url = readServerUrl(service.directory().facts().url);
    return {options.address, static_cast<std::uint16_t>(std::stoi(url.port))};
}

/// A client takes three; the usual limit of 1,024 would be used up by those of one place.
void raiseDescriptorLimit() {
    rlimit limit{};
    if (::getrlimit(RLIMIT_NOFILE, &limit) != 0) return;
    constexpr rlim_t kWanted = 16'384;
    limit.rlim_cur = std::min(kWanted, limit.rlim_max);
    static_cast<void>(::setrlimit(RLIMIT_NOFILE, &limit));
}

int serve(ServeOptions options, Surroundings& around) {
    nameProgram("zavfleetd");
    options.service.directory = around.directory;
    raiseDescriptorLimit();
    const sigset_t signals = blockSignals();
    CentreService service(options.service);
    const ApiServer server(service, placeOf(options, service));
    const SignalWaiter waiter(signals, service);
    around.out << "started, listening on port " << server.port() << std::endl;
    return service.run() == CentreProgram::End::Asked ? kDone : kFailed;
}

}  // namespace

Action declareServe(CLI::App& app) {
    const auto options = std::make_shared<ServeOptions>();
    app.add_option("--tasks-bytes", options->service.tasksBytes,
                   "Room on the bus for orders that wait, in bytes")
        ->check(CLI::Range(std::int64_t{1} << 20, std::int64_t{1} << 40))
        ->capture_default_str();
    app.add_option("--replicas", options->service.replicas,
                   "Servers of the bus that have each message")
        ->check(CLI::IsMember({1, 3, 5}))
        ->capture_default_str();
    app.add_option("--listen", options->address,
                   "The address at which operators and hosts that join reach the centre; without "
                   "it all that the machine has");
    app.add_option("--port", options->port,
                   "The port there; without it that of the fleet's URL; 0 is any that is free")
        ->check(CLI::Range(0, 65535));
    return [options](Surroundings& around) { return serve(*options, around); };
}

}  // namespace fleet
