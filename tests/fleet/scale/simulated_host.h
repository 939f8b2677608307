/// A host that exists in memory only, as its link sees it.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

#include "fleet/link/program/host_side.h"
#include "tests/fleet/scale/task_clock.h"

namespace fleet_scale {

/// What all simulated hosts share.
struct SimulatedWorld {
    std::chrono::milliseconds taskTime{1000};  ///< that each task takes
    TaskClock clock;
    std::atomic<std::uint64_t> tasks{0};      ///< that have run
    std::atomic<std::uint64_t> outOfTurn{0};  ///< new ones with no higher number than one before
};

/// Runs its tasks one after the other and never fails. It answers with the documents of a real
/// host, which go through the code that reads those. Its journal lives as long as the object.
class SimulatedHost : public fleet::HostSide {
public:
    /// Borrows the world. The host is there at once.
    SimulatedHost(SimulatedWorld& world, Events events);
    ~SimulatedHost() override;

    void handOver(const fleet::HandOver& action,
                  std::function<void(fleet::HandOverAnswer)> answer) override;
    void enter(const fleet::EnterEnd& action,
               std::function<void(fleet::HandOverAnswer)> answer) override;
    void cancel(const std::string& order, const std::string& journal,
                std::function<void(fleet::CancelAnswer)> answer) override;
    void lookUp(const std::string& order, const std::string& journal,
                std::function<void(fleet::LookUpAnswer)> answer) override;
    void listOrders(const std::string& journal,
                    std::function<void(std::optional<std::vector<std::string>>)> answer) override;
    void lookAgain() override;
    void look(std::function<void(std::optional<fleet::HostLook>)> answer) override;

private:
    class Journal;
    const std::shared_ptr<Journal> journal_;
};

}  // namespace fleet_scale
