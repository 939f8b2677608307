/// Many links in one process.
#pragma once

#include <atomic>
#include <condition_variable>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "fleet/link/program/link_program.h"
#include "tests/fleet/scale/simulated_host.h"
#include "tests/fleet/scale/simulated_members.h"

namespace fleet_scale {

/// Links that share one loop. Each has a connection to the bus of its own, with the two threads
/// that the link's program and the bus's client want for that.
class LinkLoop {
public:
    /// For so many links at most.
    LinkLoop(SimulatedWorld& world, std::size_t most);
    ~LinkLoop();
    LinkLoop(const LinkLoop&) = delete;
    LinkLoop& operator=(const LinkLoop&) = delete;

    /// One thread at a time.
    void add(const SimulatedMember& member);
    /// How many of its links have been connected to the bus.
    std::size_t came() const { return came_; }
    /// Why links have ended that must not go on.
    std::vector<std::string> ended() const;

private:
    struct Place {
        std::unique_ptr<fleet::LinkProgram> link;
        std::atomic<bool> isMade{false};  ///< and `link` may be used
        std::atomic<int> letters{0};
        std::atomic<bool> isReady{false};
        bool hasEnded = false;
    };
    void makeReady(Place& place);
    void run();
    void visit(Place& place);
    void visitSlice();

    SimulatedWorld& world_;
    std::vector<std::unique_ptr<Place>> places_;  ///< never moves
    std::atomic<std::size_t> count_{0};           ///< of those that the loop may look at
    std::atomic<std::size_t> came_{0};
    std::size_t nextSlice_ = 0;
    mutable std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Place*> ready_;
    std::vector<std::string> ended_;
    bool isEnding_ = false;
    std::thread thread_;
};

}  // namespace fleet_scale
