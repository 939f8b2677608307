#include "tests/fleet/e2e/program_fleet.h"

#include <signal.h>

#include <stdexcept>

#include "support/free_port.h"
#include "tests/fleet/e2e/fleet_scene.h"

namespace fleet_e2e {
namespace {

std::string programPath(const std::string& name) {
    return ZAV_BUILD_DIR "/bin/" + name;
}

void insist(bool isSo, const std::string& what) {
    if (!isSo) throw std::runtime_error(what);
}

}  // namespace

ProgramFleet::ProgramFleet()
    : bus_("nats://localhost:" + std::to_string(freePort())),
      url_("https://localhost:" + std::to_string(freePort())) {
    makeKeys();
    Program& bus = *programs_.emplace_back(
        begin({"/usr/sbin/nats-server", "-c", scratch_.path("keys/bus/nats-server.conf")}));
    insist(eventually([&] { return bus.err().find("Server is ready") != std::string::npos; },
                      kPatience),
           "there is no bus: " + bus.err());
    Program& centre = *programs_.emplace_back(
        begin({programPath("zavfleetd"), "--directory", scratch_.path("keys"), "serve"}));
    const auto works = [&] {
        return (centre.out() + centre.err()).find("the centre works") != std::string::npos;
    };
    insist(eventually(works, kPatience), "there is no centre: " + centre.err());
    enrolHost();
}

ProgramFleet::~ProgramFleet() {
    while (!programs_.empty()) {
        programs_.back()->signal(SIGTERM);
        programs_.back()->wait();
        programs_.pop_back();
    }
}

void ProgramFleet::makeKeys() {
    scratch_.makeDir("usb-stick");
    zavfleetd({"keys", "init", "--fleet", kFleet, "--root", scratch_.path("usb-stick/root.key"),
               "--name", "localhost,127.0.0.1", "--bus", bus_, "--url", url_, "--store-bytes",
               "1073741824"});
}

void ProgramFleet::enrolHost() {
    host_ = std::make_unique<ManagedHost>(home_.path(),
                                          Environment{{"QVSDEPLOY_AGENTDEPOT", home_.depot()}});
    scratch_.makeDir("link");
    const ProgramResult joined =
        runProgram({programPath("zavlink"), "enrol", "--directory", scratch_.path("link"),
                    "--config", scratch_.path("zavlink.toml"), "--host-socket", host_->socket(),
                    "--label", "env=test", "-"},
                   zavfleetd({"enrol", "web-1"}));
    insist(joined.status == 0, "the host cannot join: " + joined.err);
    startLink();
}

void ProgramFleet::restartLink() {
    link().signal(SIGKILL);
    link().wait();
    programs_.pop_back();
    startLink();
}

void ProgramFleet::startLink() {
    Program& link = *programs_.emplace_back(
        begin({programPath("zavlink"), "--config", scratch_.path("zavlink.toml")}));
    const auto isConnected = [&] {
        return (link.out() + link.err()).find("connected to the bus") != std::string::npos;
    };
    insist(eventually(isConnected, kPatience), "the link does not connect: " + link.err());
}

void ProgramFleet::join(const std::string& name, const std::vector<std::string>& words) {
    std::vector<std::string> add = {"operator", "add", name};
    add.insert(add.end(), words.begin(), words.end());
    std::string invitation = zavfleetd(add);
    invitation.erase(invitation.find_last_not_of('\n') + 1);
    const auto login = startZavctl(name, {"login", invitation});
    const auto certify = [&] {
        return runProgram({programPath("zavfleetd"), "--directory", scratch_.path("keys"),
                           "operator", "certify", "--root", scratch_.path("usb-stick/root.key"),
                           "--all"})
                       .status == 0 &&
               (login->out() + login->err()).find("You are") != std::string::npos;
    };
    insist(eventually(certify, kPatience), name + " cannot join: " + login->err());
    insist(login->wait().status == 0, name + " cannot join: " + login->err());
}

ProgramResult ProgramFleet::zavctl(const std::string& name,
                                   const std::vector<std::string>& words) const {
    return startZavctl(name, words)->wait(kPatience);
}

std::unique_ptr<Program> ProgramFleet::startZavctl(const std::string& name,
                                                   const std::vector<std::string>& words) const {
    std::vector<std::string> line = {zavctlPath(), "--fleet", url_};
    line.insert(line.end(), words.begin(), words.end());
    return std::make_unique<Program>(line, "", environmentOf(name));
}

Environment ProgramFleet::environmentOf(const std::string& name) const {
    return {{"XDG_CONFIG_HOME", scratch_.path("of-" + name)}, {"ZAV_FLEET", ""}};
}

std::string ProgramFleet::zavfleetd(const std::vector<std::string>& words) const {
    std::vector<std::string> line = {programPath("zavfleetd"), "--directory",
                                     scratch_.path("keys")};
    line.insert(line.end(), words.begin(), words.end());
    const ProgramResult result = runProgram(line, "", {}, kPatience);
    insist(result.status == 0, "zavfleetd " + words.front() + ": " + result.err);
    return result.out;
}

std::unique_ptr<Program> ProgramFleet::begin(const std::vector<std::string>& words) {
    // It must not outlive a test that is killed.
    std::vector<std::string> line = {"/usr/bin/setpriv", "--pdeathsig", "KILL"};
    line.insert(line.end(), words.begin(), words.end());
    return std::make_unique<Program>(line);
}

}  // namespace fleet_e2e
