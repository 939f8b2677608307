/// A fleet with a real bus and a real centre whose hosts are simulated.
#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "tests/fleet/programs/centre_records.h"
#include "tests/fleet/programs/program_fleet.h"

namespace fleet_scale {

class SimulatedFleet {
public:
    /// Starts all of it and returns when the centre works; links are still coming. Throws
    /// std::runtime_error.
    SimulatedFleet(std::size_t hosts, std::chrono::milliseconds taskTime);

    fleet_programs::ProgramFleet& programs() { return fleet_; }
    fleet_programs::CentreRecords& records() { return *records_; }
    Program& simulator() { return *simulator_; }
    /// When the links began to come.
    fleet::Moment began() const { return began_; }

    /// A centre that has lost its lease ends, and its service manager starts it again.
    void supervise();
    /// Waits until so many hosts were heard since then, and have told facts, and supervises.
    /// False if they were not within `patience`.
    bool awaitHeard(std::size_t hosts, fleet::Moment since, std::chrono::milliseconds patience);
    /// The same until so many orders have their outcomes.
    bool awaitOver(std::int64_t orders, std::chrono::milliseconds patience);
    /// Gives a START to all hosts in one wave. Returns when the centre has the roll-out; throws
    /// std::runtime_error.
    void startAll(const std::string& product);
    /// Ends the simulator; what it says in the end.
    std::string endSimulator();

private:
    fleet_programs::ProgramFleet fleet_;
    std::unique_ptr<Program> simulator_;
    fleet::Moment began_{};
    std::unique_ptr<fleet_programs::CentreRecords> records_;
};

}  // namespace fleet_scale
