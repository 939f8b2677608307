/// A fleet in which everything goes wrong at random, and the checks of what must hold in the end.
#pragma once

#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "fleet/server/core/centre.h"
#include "tests/fleet/model/dice.h"
#include "tests/fleet/model/model_store.h"
#include "tests/fleet/model/sim_bus.h"
#include "tests/fleet/model/sim_host.h"
#include "tests/fleet/model/sim_link.h"

namespace model {

/// What may go wrong in a schedule, besides kills and losses on the way.
struct Disasters {
    bool journals = false;  ///< hosts' journals are set aside
    bool links = false;     ///< backups of links' files are put back
    bool power = false;     ///< the bus loses power, or its disks
    bool backups = false;   ///< the centre's database is put back from a backup
};

class World {
public:
    /// The centre's database is the model's own, in memory, or the one that is made.
    World(std::uint64_t seed, Disasters disasters, const MakeStore& makeStore = inMemory);

    /// Faults for a while, then peace until nothing is left to do.
    void run(std::size_t steps);

    /// What does not hold; "" if all is well.
    std::string fault() const;

private:
    struct Seat {
        std::unique_ptr<SimHost> host;
        std::unique_ptr<SimLink> link;
        fleet::Kept backup;
        bool hasForgotten = false;  ///< a backup of the link's file was put back
    };

    void step();
    void disturb();
    void disturbBus();
    void restoreCentre();
    void serveCentre();
    void serveSeat(Seat& seat);
    void startCentre();
    void submit();
    void makePeace();
    bool isQuiet() const;
    void deliverHello();
    void sweep(const std::function<void(const fleet::OrderRecord&)>& tell);
    template <typename Function>
    void asCentre(Function function);
    template <typename Function>
    void asLink(Seat& seat, Function function);
    std::string faultOfHost(const Seat& seat) const;
    std::string faultOfOrder(const Seat& seat, const fleet::OrderRecord& order) const;
    const Task* taskOf(const Seat& seat, const fleet::Outcome& outcome) const;

    static std::unique_ptr<ModelStore> inMemory(Dice& dice);

    Dice dice_;
    const Disasters disasters_;
    fleet::Moment now_{1'000'000'000};
    SimBus bus_;
    SimCentreBus centreBus_;
    std::unique_ptr<ModelStore> store_;
    bool hasRestored_ = false;
    std::unique_ptr<fleet::Centre> centre_;
    std::vector<Seat> seats_;
    std::deque<std::pair<std::string, fleet::Hello>> hellos_;
    std::map<std::string, SimOrder> orders_;  ///< all that were accepted, by identifier
    int orderCount_ = 0;
    std::vector<std::string> alarms_;
    bool hasLostBus_ = false;
};

}  // namespace model
