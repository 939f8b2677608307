// zavlink: connects the host on this machine to its fleet.

#include <cstdio>
#include <exception>
#include <iostream>
#include <optional>
#include <string>
#include <vector>

#include "fleet/files/files.h"
#include "fleet/link/enrol/enrol_command.h"
#include "fleet/link/program/link_program.h"
#include "fleet/log/log.h"
#include "fleet/loop/end_signals.h"

namespace fleet {
namespace {

constexpr const char* kConfiguration = "/etc/zavlink.toml";
constexpr const char* kUsage =
    "usage: zavlink [--config FILE]\n"
    "       zavlink enrol [--directory DIR] [--config FILE] INVITATION\n"
    "\n"
    "Takes the orders of the fleet that FILE names (/etc/zavlink.toml if none is given)\n"
    "to the host on this machine, and brings back how they ended.\n"
    "\n"
    "Before that, enrol joins the fleet: zavlink enrol --help.\n";

/// The exit status that tells the service manager not to start it again: EX_CONFIG.
constexpr int kMustNotRun = 78;
constexpr int kWrongUsage = 2;

struct Wish {
    std::string configuration = kConfiguration;
    const char* print = nullptr;  ///< only this is wanted
};

/// Nothing if the arguments make no sense.
std::optional<Wish> wishOf(int argc, char** argv) {
    Wish wish;
    for (int i = 1; i < argc; ++i) {
        const std::string argument = argv[i];
        if (argument == "--help") {
            wish.print = kUsage;
        } else if (argument == "--version") {
            wish.print = "zavlink " ZAV_VERSION "\n";
        } else if (argument == "--config" && i + 1 < argc) {
            wish.configuration = argv[++i];
        } else {
            return std::nullopt;
        }
    }
    return wish;
}

int run(const std::string& file) {
    const EndSignals signals;
    const LinkConfiguration configuration =
        parseLinkConfiguration(readFile(file, Secrecy::Public), file);
    LinkProgram program(configuration);
    const EndWaiter waiter(signals, [&program] { program.end(); });
    std::printf("ready: %s\n", program.host().c_str());
    std::fflush(stdout);
    return program.run() == LinkProgram::End::Stopped ? kMustNotRun : 0;
}

}  // namespace
}  // namespace fleet

int main(int argc, char** argv) {
    fleet::nameProgram("zavlink");
    if (argc > 1 && std::string(argv[1]) == "enrol") {
        return fleet::runEnrolCommand(std::vector<std::string>(argv + 2, argv + argc), std::cin,
                                      std::cout, std::cerr);
    }
    const auto wish = fleet::wishOf(argc, argv);
    if (!wish) {
        std::fputs(fleet::kUsage, stderr);
        return fleet::kWrongUsage;
    }
    if (wish->print != nullptr) return std::fputs(wish->print, stdout) < 0 ? 1 : 0;
    try {
        return fleet::run(wish->configuration);
    } catch (const std::exception& error) {
        fleet::say(fleet::Priority::Error, error.what());
        return 1;
    }
}
