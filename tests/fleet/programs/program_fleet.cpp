#include "tests/fleet/programs/program_fleet.h"

#include <signal.h>

#include <stdexcept>
#include <utility>

#include "fleet/bus/messages/login.h"
#include "fleet/operator/identity/operator_files.h"
#include "fleet/server/keys/trust/operators.h"
#include "fleet/server/keys/trust/trust_database.h"
#include "support/free_port.h"

namespace fleet_programs {
namespace {

constexpr const char* kReady = "Server is ready";
constexpr const char* kWorks = "the centre works";

std::string programPath(const std::string& name) {
    return ZAV_BUILD_DIR "/bin/" + name;
}

/// It must not outlive a test that is killed.
std::unique_ptr<Program> started(std::vector<std::string> argv) {
    argv.insert(argv.begin(), {"/usr/bin/setpriv", "--pdeathsig", "KILL"});
    return std::make_unique<Program>(argv);
}

/// Whether a program has said it, on either of its outputs. Throws if it has ended.
bool hasSaid(Program& program, const std::string& text) {
    const auto said = [&] {
        return program.err().find(text) != std::string::npos ||
               program.out().find(text) != std::string::npos;
    };
    if (said()) return true;
    if (program.running()) return false;
    if (said()) return true;
    throw std::runtime_error("a program has ended: " + program.err());
}

void awaitWords(Program& program, const std::string& text) {
    if (eventually([&] { return hasSaid(program, text); }, kPatience)) return;
    throw std::runtime_error("a program does not say \"" + text + "\": " + program.err());
}

std::string ran(const std::vector<std::string>& argv, const std::string& input = "") {
    const ProgramResult result = runProgram(argv, input, {}, kPatience);
    if (result.status != 0) throw std::runtime_error(argv.front() + ": " + result.err);
    return result.out;
}

}  // namespace

fleet::Moment wallTime() {
    return std::chrono::duration_cast<fleet::Moment>(
        std::chrono::system_clock::now().time_since_epoch());
}

ProgramFleet::ProgramFleet()
    : busPort_(std::to_string(freePort())),
      centrePort_(std::to_string(freePort())),
      made_([this](fleet::FleetPlan& plan) {
          plan.busUrls = {"nats://localhost:" + busPort_};
          plan.url = "https://localhost:" + centrePort_;
          plan.now = wallTime() - std::chrono::minutes(1);
          plan.until = plan.now + made_fleet::kDay;
          plan.authorityUntil = plan.until;
      }) {
    addOperator();
}

void ProgramFleet::addOperator() {
    fleet::TrustDatabase trust(directory().trustDatabase());
    fleet::Operators operators(trust.connection());
    fleet::OperatorGrant grant;
    grant.name = "anna";
    grant.role = fleet::Role::Admin;
    grant.valid = std::chrono::hours(12);
    const fleet::KeyPair key = fleet::KeyPair::make(fleet::KeyKind::User);
    const fleet::FleetFacts facts = directory().facts();
    const std::string token = operators.invite(grant, std::chrono::hours(1), wallTime());
    const std::string request = signLogin({facts.fleet, token, key.publicKey()}, key);
    operators.login(request, facts, wallTime());
    operators.certify({key.publicKey()}, made_.root(), wallTime());
    const fleet::LoginAnswer answer = operators.login(request, facts, wallTime());
    fleet::OperatorFiles(scratch().path("operator/zavctl/fleet"))
        .keep({facts.url, facts.fleet, facts.root, directory().authority(), key,
               answer.certificate.value()});
}

void ProgramFleet::startBus() {
    bus_ = started(
        {"/usr/sbin/nats-server", "-c", directory().facts().busDirectory + "/nats-server.conf"});
    awaitWords(*bus_, kReady);
}

void ProgramFleet::startCentre() {
    centre_ = started({programPath("zavfleetd"), "--directory", directory().path(), "serve"});
    awaitWords(*centre_, "started");
}

bool ProgramFleet::isCentreAtWork() const {
    return hasSaid(*centre_, kWorks);
}

void ProgramFleet::awaitCentre() {
    awaitWords(*centre_, kWorks);
}

void ProgramFleet::endBus(int signal) {
    bus_->signal(signal);
    bus_->wait();
}

void ProgramFleet::endCentre(int signal) {
    centre_->signal(signal);
    centre_->wait();
}

std::string ProgramFleet::inviteHost(const std::string& name) const {
    return ran({programPath("zavfleetd"), "--directory", directory().path(), "enrol", name});
}

std::unique_ptr<Program> ProgramFleet::zavctl(const std::vector<std::string>& arguments) const {
    std::vector<std::string> argv = {zavctlPath(), "--fleet", directory().facts().url};
    argv.insert(argv.end(), arguments.begin(), arguments.end());
    return std::make_unique<Program>(
        argv, "", Environment{{"XDG_CONFIG_HOME", scratch().path("operator")}, {"ZAV_FLEET", ""}});
}

JoinedHost::JoinedHost(const ProgramFleet& fleet, std::string name)
    : name_(std::move(name)), host_(home_.path()) {
    ran({programPath("zavlink"), "enrol", "--directory", scratch_.path("link"), "--config",
         scratch_.path("zavlink.toml"), "--host-socket", host_.socket(), "-"},
        fleet.inviteHost(name_));
    startLink();
}

void JoinedHost::startLink() {
    link_ = started({programPath("zavlink"), "--config", scratch_.path("zavlink.toml")});
    awaitWords(*link_, "ready: ");
    const std::string line = link_->out();
    const std::size_t begin = line.find("ready: ") + 7;
    key_ = line.substr(begin, line.find('\n', begin) - begin);
}

void JoinedHost::killLink() {
    link_->signal(SIGKILL);
    link_->wait();
}

void JoinedHost::killHost() {
    host_.program().signal(SIGKILL);
    host_.program().wait();
}

}  // namespace fleet_programs
