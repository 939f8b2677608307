#include <pthread.h>

#include <CLI/CLI.hpp>
#include <csignal>
#include <memory>
#include <ostream>
#include <thread>

#include "fleet/log/log.h"
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

int serve(ServiceOptions options, Surroundings& around) {
    nameProgram("zavfleetd");
    options.directory = around.directory;
    const sigset_t signals = blockSignals();
    CentreService service(options);
    const SignalWaiter waiter(signals, service);
    around.out << "started" << std::endl;
    return service.run() == CentreProgram::End::Asked ? kDone : kFailed;
}

}  // namespace

Action declareServe(CLI::App& app) {
    const auto options = std::make_shared<ServiceOptions>();
    app.add_option("--tasks-bytes", options->tasksBytes,
                   "Room on the bus for orders that wait, in bytes")
        ->check(CLI::Range(std::int64_t{1} << 20, std::int64_t{1} << 40))
        ->capture_default_str();
    app.add_option("--replicas", options->replicas, "Servers of the bus that have each message")
        ->check(CLI::IsMember({1, 3, 5}))
        ->capture_default_str();
    return [options](Surroundings& around) { return serve(*options, around); };
}

}  // namespace fleet
