/// A fleet whose keys were made in a directory of a test's own.
#pragma once

#include <chrono>
#include <string>
#include <utility>

#include "fleet/server/keys/directory/fleet_directory.h"
#include "fleet/server/keys/directory/root_file.h"
#include "fleet/server/keys/setup/make_fleet.h"
#include "tests/support/scratch_dir.h"

namespace made_fleet {

constexpr fleet::Moment kDay = std::chrono::hours(24);
/// Whole seconds, as the bus tells times.
constexpr fleet::Moment kNow = std::chrono::seconds(1'790'000'000);

inline fleet::FleetPlan planIn(const ScratchDir& scratch) {
    fleet::FleetPlan plan;
    plan.fleet = "demo";
    plan.directory = scratch.path("keys");
    plan.rootFile = scratch.path("root.key");
    plan.names = {"localhost", "127.0.0.1"};
    plan.storeBytes = 1U << 30U;
    plan.now = kNow;
    plan.until = kNow + 730 * kDay;
    plan.authorityUntil = kNow + 3650 * kDay;
    return plan;
}

class MadeFleet {
public:
    MadeFleet() : MadeFleet([](fleet::FleetPlan&) {}) {}
    /// The plan may be changed before the keys are made.
    template <typename Change>
    explicit MadeFleet(Change change) : directory_(made(scratch_, change)) {}

    const ScratchDir& scratch() const { return scratch_; }
    const fleet::FleetDirectory& directory() const { return directory_; }
    std::string rootFile() const { return scratch_.path("root.key"); }
    fleet::RootKeys root() const { return fleet::readRootFile(rootFile()); }

private:
    template <typename Change>
    static fleet::FleetDirectory made(const ScratchDir& scratch, Change change) {
        fleet::FleetPlan plan = planIn(scratch);
        change(plan);
        fleet::makeFleet(plan);
        return fleet::FleetDirectory(plan.directory);
    }

    ScratchDir scratch_;
    fleet::FleetDirectory directory_;
};

}  // namespace made_fleet
