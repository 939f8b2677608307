#include "tests/fleet/scale/simulated_fleet.h"

#include <signal.h>

#include <stdexcept>
#include <thread>

namespace fleet_scale {

using fleet_programs::kPatience;
using fleet_programs::wallTime;

namespace {

/// Between two looks, which take processor time from what is looked at.
void letWork() {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
}

}  // namespace

SimulatedFleet::SimulatedFleet(std::size_t hosts, std::chrono::milliseconds taskTime) {
    fleet_.startBus();
    // It must not outlive a test that is killed.
    simulator_ = std::make_unique<Program>(std::vector<std::string>{
        "/usr/bin/setpriv", "--pdeathsig", "KILL", ZAV_BUILD_DIR "/bin/fleet_simulator",
        fleet_.directory().path(), std::to_string(hosts), fleet_.scratch().makeDir("simulated"),
        std::to_string(taskTime.count())});
    if (!simulator_->awaitOutput("enrolled", kPatience)) {
        throw std::runtime_error("the hosts do not join: " + simulator_->err());
    }
    began_ = wallTime();
    fleet_.startCentre();
    fleet_.awaitCentre();
    records_ = std::make_unique<fleet_programs::CentreRecords>(fleet_.directory());
}

void SimulatedFleet::supervise() {
    if (!fleet_.centre().running()) fleet_.startCentre();
}

bool SimulatedFleet::awaitHeard(std::size_t hosts, fleet::Moment since,
                                std::chrono::milliseconds patience) {
    const auto wanted = static_cast<std::int64_t>(hosts);
    return eventually(
        [&] {
            letWork();
            supervise();
            return records_->heardSince(since) >= wanted && records_->withFacts() >= wanted;
        },
        patience);
}

bool SimulatedFleet::awaitOver(std::int64_t orders, std::chrono::milliseconds patience) {
    return eventually(
        [&] {
            letWork();
            supervise();
            return records_->orders().over >= orders;
        },
        patience);
}

void SimulatedFleet::startAll(const std::string& product) {
    const auto command = fleet_.zavctl({"start", product, "--on", "*", "--no-wait"});
    const ProgramResult result = command->wait(kPatience);
    if (result.status != 0) throw std::runtime_error("no roll-out: " + result.err);
}

std::string SimulatedFleet::endSimulator() {
    simulator_->signal(SIGTERM);
    return simulator_->wait(kPatience).out;
}

}  // namespace fleet_scale
