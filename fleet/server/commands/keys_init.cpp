#include <CLI/CLI.hpp>
#include <memory>
#include <ostream>

#include "fleet/server/commands/command_line.h"
#include "fleet/server/commands/command_table.h"
#include "fleet/server/commands/texts.h"
#include "fleet/server/keys/setup/make_fleet.h"

namespace fleet {
namespace {

struct InitArguments {
    FleetPlan plan;
    long long validDays = 730;
    long long authorityDays = 3650;
    std::uint64_t storeBytes = 0;
};

int initKeys(const InitArguments& arguments, Surroundings& around) {
    FleetPlan plan = arguments.plan;
    plan.directory = around.directory;
    plan.now = around.now;
    plan.until = around.now + daysOf(arguments.validDays);
    plan.authorityUntil = around.now + daysOf(arguments.authorityDays);
    if (arguments.storeBytes > 0) plan.storeBytes = arguments.storeBytes;
    makeFleet(plan);
    const FleetPlan made = completed(plan);
    around.err << "Made the fleet " << made.fleet << ".\n"
               << "The root is " << made.rootFile
               << ": take it off this machine, and keep a second copy.\n"
               << "The bus's server: nats-server -c " << made.busDirectory << "/nats-server.conf\n";
    return kDone;
}

}  // namespace

Action declareKeysInit(CLI::App& app) {
    const auto arguments = std::make_shared<InitArguments>();
    FleetPlan& plan = arguments->plan;
    app.add_option("--fleet", plan.fleet, "The fleet's name")->required();
    app.add_option("--root", plan.rootFile,
                   "Where the root goes, which certifies the centre and the operators; not in the "
                   "centre's directory")
        ->required();
    app.add_option("--name", plan.names,
                   "DNS names and IP addresses of the servers, joined by commas; a DNS name first")
        ->delimiter(',')
        ->required();
    app.add_option("--bus", plan.busUrls, "Each server of the bus, as nats://HOST:PORT")
        ->default_str("the first name, port 4222");
    app.add_option("--url", plan.url, "The centre, as https://HOST[:PORT]")
        ->default_str("the first name, port 8443");
    app.add_option("--bus-directory", plan.busDirectory, "Where the bus's server has its files")
        ->default_str("bus in the centre's directory");
    app.add_option("--store-bytes", arguments->storeBytes, "What the bus may store, in bytes")
        ->check(CLI::Range(std::uint64_t{1} << 16, std::uint64_t{1} << 50))
        ->default_str("80 % of what is free");
    app.add_option("--valid", arguments->validDays, "Days until the certificates end")
        ->capture_default_str();
    app.add_option("--authority-valid", arguments->authorityDays,
                   "Days until the TLS authority ends")
        ->capture_default_str();
    return [arguments](Surroundings& around) { return initKeys(*arguments, around); };
}

}  // namespace fleet
