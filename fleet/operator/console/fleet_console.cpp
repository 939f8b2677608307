// console: a page in a browser that shows the fleet, and acts by the operator's own program.

#include <algorithm>
#include <chrono>
#include <csignal>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/console/embedded_page.h"
#include "ctl/console/received_file.h"
#include "ctl/console/serving.h"
#include "ctl/verbs/host/console.h"
#include "ctl/verbs/invocation.h"
#include "fleet/https/client/server_url.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/console/fleet_backend.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"

namespace fleet {
namespace {

constexpr const char* kLinkLetters =
    "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_/?=";

constexpr ctl::Argument kAtCentre =
    ctl::flag("--at-centre",
              "Print a link to the console that the centre serves, which only looks;\n"
              "it works once, within a minute");

constexpr ctl::Argument kFleetConsoleArguments[] = {
    ctl::kConsolePort.without("--at-centre"), ctl::kBrowserUser.without("--at-centre"), kAtCentre};

std::vector<console::PageFile> insistOnPage() {
    std::vector<console::PageFile> page = console::embeddedPage();
    if (!page.empty()) return page;
    throw ctl::Failure(ctl::kWrongUsage, "the console is not installed here",
                       "The program zavctl-fleet was built without its page.");
}

/// The centre says where on it the link leads, and nothing else: a link to another place could be
/// anybody's.
ctl::ExitStatus printCentresLink(const ctl::Invocation& invocation) {
    OperatorSide side(invocation);
    const std::string path =
        memberText(side.centre.post("/v1/console-links", nlohmann::json::object()), "path");
    const bool isPath = path.size() > 1 && path[0] == '/' && path[1] != '/' &&
                        path.find_first_not_of(kLinkLetters) == std::string::npos;
    if (!isPath) throw senseless("it gives no link");
    return console::printLink("https://" + readServerUrl(side.identity.url).authority() + path,
                              invocation.format);
}

ctl::ExitStatus runFleetConsole(const ctl::Invocation& invocation) {
    if (invocation.given.has(kAtCentre)) return printCentresLink(invocation);
    const sys::FileDescriptor signals = console::endSignals();
    // The caller may have left SIGCHLD ignored, which children would inherit.
    std::signal(SIGCHLD, SIG_DFL);
    console::ConsoleSettings settings;
    settings.page = insistOnPage();
    settings.browsers = console::browsersOf(invocation.given);
    FleetBackend::Settings fleet{OperatorSide(invocation).identity};
    if (invocation.given.has(kFleetTimeout)) {
        const std::chrono::duration<double> time(invocation.given.seconds(kFleetTimeout));
        fleet.readTime =
            std::min(fleet.readTime, std::chrono::duration_cast<std::chrono::milliseconds>(time));
    }
    fleet.uploadDirectory = console::receivingDirectory();
    FleetBackend backend(std::move(fleet));
    return console::serveUntilSignal(std::move(settings), backend, invocation.given,
                                     invocation.format, signals);
}

}  // namespace

constexpr ctl::Verb kFleetConsoleVerb = {
    "console",
    "Serve a page for a browser on this machine, and print the link to it",
    kFleetConsoleArguments,
    {"zavctl --fleet https://centre.example console",
     "zavctl --fleet https://centre.example console --at-centre"},
    runFleetConsole,
};

}  // namespace fleet
