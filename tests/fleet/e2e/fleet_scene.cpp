#include "tests/fleet/e2e/fleet_scene.h"

#include <signal.h>

#include <algorithm>

#include "fleet/bus/messages/question.h"

namespace fleet_e2e {

using fleet::CentreProgram;
using fleet::KeyKind;
using fleet::KeyPair;

FleetHost::FleetHost(std::string name, const KeyPair& bus, const KeyPair& signing,
                     const Fleet& fleet)
    : name_(std::move(name)), key_(bus.publicKey()), signing_(signing.publicKey()), fleet_(fleet) {
    fleet::LinkFile::create(scratch_.makeDir("state"), bus, signing, fleet.token);
    // The host's socket is at the same place each time.
    host_ = std::make_unique<ManagedHost>(home_.path());
    scratch_.write("zavlink.toml", configurationIn("state"));
}

std::string FleetHost::configurationIn(const std::string& state) const {
    return "fleet = \"" + std::string(kFleet) + "\"\nname = \"" + name_ + "\"\nbus = [\"" +
           fleet_.bus + "\"]\nroot = \"" + fleet_.root + "\"\ncentre = \"" + fleet_.centre +
           "\"\nhost-socket = \"" + host_->socket() + "\"\nstate = \"" + scratch_.path(state) +
           "\"\n[labels]\nenv = \"test\"\n";
}

std::unique_ptr<Program> FleetHost::run(const std::string& configuration) const {
    // It must not outlive a test that is killed.
    auto link = std::make_unique<Program>(
        std::vector<std::string>{"/usr/bin/setpriv", "--pdeathsig", "KILL",
                                 ZAV_BUILD_DIR "/bin/zavlink", "--config", configuration});
    if (!link->awaitOutput("ready: " + key_, std::chrono::seconds(60))) {
        throw std::runtime_error("the link is not ready: " + link->wait().err);
    }
    return link;
}

void FleetHost::startHost() {
    host_->start();
}

void FleetHost::startLink() {
    link_ = run(scratch_.path("zavlink.toml"));
}

void FleetHost::killHost() {
    host_->program().signal(SIGKILL);
    host_->program().wait();
}

void FleetHost::killLink() {
    link_->signal(SIGKILL);
    link_->wait();
}

void FleetHost::stopLink() {
    link_->signal(SIGTERM);
    link_->wait();
}

std::unique_ptr<Program> FleetHost::startClone() {
    scratch_.makeDir("clone");
    scratch_.write("clone/link.json", scratch_.read("state/link.json"), 0600);
    scratch_.write("clone.toml", configurationIn("clone"));
    return run(scratch_.path("clone.toml"));
}

std::size_t FleetHost::callsOf(const std::string& verb) const {
    const std::vector<std::string> calls = home_.agentCalls();
    return static_cast<std::size_t>(std::count_if(
        calls.begin(), calls.end(),
        [&verb](const std::string& call) { return call.find(verb) != std::string::npos; }));
}

FleetScene::FleetScene() {
    certificate_.fleet = kFleet;
    certificate_.holder = fleet::Certificate::Holder::Operator;
    certificate_.name = "an operator";
    certificate_.key = operator_.publicKey();
    certificate_.until = now() + std::chrono::hours(24);
    certificate_.commands = {"*"};
    certificate_.products = {"*"};
    certificate_.selector = "*";
    startCentre();
}

FleetScene::~FleetScene() {
    if (centre_) stopCentre();
}

void FleetScene::startCentre() {
    const auto user = KeyPair::make(KeyKind::User);
    fleet::CentreSettings settings{
        scratch_.path("centre"),
        bus_.optionsOf(user, fleet::fullUserToken(bus_.keys().control,
                                                  {user.publicKey(), "centre", bus_.madeAt(), {}})),
        centreKey_,
        {1 << 20, 1},
        "the centre",
        std::chrono::seconds(30),
        std::chrono::hours(1),
        {},
        [this](const fleet::Alarm& alarm) {
            const std::lock_guard lock(mutex_);
            alarms_.push_back(alarm.text);
        }};
    centre_ = std::make_unique<CentreProgram>(std::move(settings));
    running_ = std::async(std::launch::async, [this] { return centre_->run(); });
}

CentreProgram::End FleetScene::stopCentre() {
    centre_->end();
    const CentreProgram::End end = running_.get();
    centre_.reset();
    return end;
}

std::vector<std::string> FleetScene::alarms() {
    const std::lock_guard lock(mutex_);
    return alarms_;
}

std::unique_ptr<FleetHost> FleetScene::enrol(const std::string& name) {
    const KeyPair bus = KeyPair::make(KeyKind::User);
    const KeyPair signing = KeyPair::make(KeyKind::User);
    fleet::HostRecord record;
    record.host = bus.publicKey();
    record.signing = signing.publicKey();
    record.name = name;
    centre_
        ->ask([record](CentreProgram::Parts& parts) {
            parts.store.keepHost(record);
            return true;
        })
        .get();
    return std::make_unique<FleetHost>(
        name, bus, signing,
        FleetHost::Fleet{bus_.server().url(), root_.publicKey(), centreKey_.publicKey(),
                         bus_.hostToken(bus, name)});
}

fleet::Order FleetScene::order(const FleetHost& host, const std::string& command,
                               const std::string& body) const {
    fleet::Order made;
    made.fleet = kFleet;
    made.id = fleet::makeOrderId();
    made.host = host.key();
    made.selector = "env=test";
    made.kind = command;
    made.body = body;
    made.issued = now();
    made.expires = now() + std::chrono::hours(1);
    return made;
}

std::string FleetScene::sign(const fleet::Order& order) const {
    return signOrder(order, operator_, signCertificate(certificate_, root_));
}

std::string FleetScene::signQuestion(const fleet::Order& question) const {
    return fleet::signQuestion(question, operator_, signCertificate(certificate_, root_));
}

std::string FleetScene::submit(const fleet::Order& order) {
    if (!centre_->submit(sign(order)).get()) throw std::runtime_error("there is no such host");
    return order.id;
}

std::string FleetScene::submit(const FleetHost& host, const std::string& command) {
    return submit(order(host, command));
}

std::optional<fleet::Outcome> FleetScene::outcome(const FleetHost& host, const std::string& order) {
    return centre_
        ->ask([key = host.key(), order](CentreProgram::Parts& parts) {
            const auto known = parts.store.order(key, order);
            return known ? known->outcome : std::nullopt;
        })
        .get();
}

std::string FleetScene::awaitEnd(const FleetHost& host, const std::string& order) {
    eventually([&] { return outcome(host, order).has_value(); }, kPatience);
    const std::optional<fleet::Outcome> end = outcome(host, order);
    return end ? end->state : "";
}

}  // namespace fleet_e2e
