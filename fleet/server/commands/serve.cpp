#include <sys/resource.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <memory>
#include <optional>
#include <ostream>
#include <vector>

#include "ctl/console/embedded_page.h"
#include "fleet/https/client/server_url.h"
#include "fleet/log/log.h"
#include "fleet/loop/end_signals.h"
#include "fleet/server/api/api_server.h"
#include "fleet/server/api/metrics/metrics_server.h"
#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/service/centre_service.h"

namespace fleet {
namespace {

struct ServeOptions {
    ServiceOptions service;
    std::string address;
    int port = -1;         ///< -1: that of the fleet's URL
    int metricsPort = -1;  ///< -1: nobody reads metrics
    bool console = false;
};

ListenPlace placeOf(const ServeOptions& options, const CentreService& service) {
    if (options.port >= 0) return {options.address, static_cast<std::uint16_t>(options.port)};
    const ServerUrl url = readServerUrl(service.directory().facts().url);
    return {options.address, static_cast<std::uint16_t>(std::stoi(url.port))};
}

/// Empty if browsers are not to be served.
std::vector<console::PageFile> pageOf(const ServeOptions& options) {
    if (!options.console) return {};
    std::vector<console::PageFile> page = console::embeddedPage();
    if (page.empty()) throw KeysError("this zavfleetd was built without the console's page");
    return page;
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
    const EndSignals signals;
    CentreService service(options.service);
    ApiServer server(service, placeOf(options, service), pageOf(options));
    std::optional<MetricsServer> metrics;
    if (options.metricsPort >= 0) {
        metrics.emplace(server.metricsSources(), static_cast<std::uint16_t>(options.metricsPort));
        around.out << "metrics on port " << metrics->port() << std::endl;
    }
    const EndWaiter waiter(signals, [&service] { service.end(); });
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
    app.add_option("--metrics-port", options->metricsPort,
                   "The port of 127.0.0.1 at which a monitoring system reads /v1/metrics by HTTP; "
                   "without it none; 0 is any that is free")
        ->check(CLI::Range(0, 65535));
    app.add_flag("--console", options->console,
                 "Serve the console to browsers at that port as well, only to look at");
    return [options](Surroundings& around) { return serve(*options, around); };
}

}  // namespace fleet
