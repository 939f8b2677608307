/// How the centre publishes many orders together.
#include <gtest/gtest.h>

#include <set>
#include <string>
#include <vector>

#include "fleet/server/core/centre.h"
#include "tests/fleet/model/sim_bus.h"
#include "tests/fleet/model/sim_store.h"

namespace {

using fleet::Centre;
using fleet::FetchAnswer;
using fleet::Number;
using fleet::OrderPlace;
using fleet::PlacedOrder;
using fleet::StoreAnswer;

/// A bus that takes all orders but some, of which it says nothing or that it has no room.
class PartlySilentBus : public fleet::CentreBus {
public:
    explicit PartlySilentBus(fleet::CentreBus& bus) : bus_(bus) {}

    std::vector<StoreAnswer> store(const std::vector<PlacedOrder>& orders) override {
        ++questions;
        std::vector<StoreAnswer> answers;
        for (const PlacedOrder& order : orders) {
            if (silent.count(order.place.host) != 0) {
                answers.emplace_back(fleet::Unanswered{});
            } else if (full.count(order.place.host) != 0) {
                answers.emplace_back(fleet::NoRoom{});
            } else {
                answers.push_back(bus_.store({order}).front());
            }
        }
        return answers;
    }
    std::vector<FetchAnswer> fetch(const std::vector<OrderPlace>& places) override {
        ++questions;
        return bus_.fetch(places);
    }
    void erase(const std::vector<std::uint64_t>& sequences) override {
        ++questions;
        bus_.erase(sequences);
    }

    std::set<std::string> silent;  ///< hosts
    std::set<std::string> full;    ///< hosts for whose orders there is no room
    int questions = 0;

private:
    fleet::CentreBus& bus_;
};

class PublishingTogether : public testing::Test {
protected:
    PublishingTogether() {
        dice_.faults = false;
        sim_.republish = [this](const std::string& host, Number number) {
            republished_.insert(host + "." + std::to_string(number));
        };
    }
    static std::string hostOf(int i) { return "h" + std::to_string(i); }
    void submitToMany(int hosts, const std::string& bytes = "bytes") {
        for (int i = 0; i < hosts; ++i)
            submitToHost(i, bytes);
    }
    void submitToHost(int i, const std::string& bytes) {
        fleet::HostRecord record;
        record.host = hostOf(i);
        store_.tables.hosts[record.host] = record;
        centre_.submit(record.host, "order", [&](Number) { return bytes; });
    }

    model::Dice dice_{1};
    model::SimBus disk_{dice_};
    model::SimCentreBus sim_{disk_, dice_};
    PartlySilentBus bus_{sim_};
    model::SimStore store_{dice_};
    std::set<std::string> republished_;
    fleet::CentreCounts counts_;
    Centre centre_{store_, bus_, [](const fleet::Alarm&) {}, &counts_};
};

TEST_F(PublishingTogether, AsksTheBusOnceForMany) {
    submitToMany(50);
    EXPECT_FALSE(centre_.work(1000));
    EXPECT_EQ(bus_.questions, 1);
    EXPECT_EQ(republished_.size(), 50U);
    EXPECT_EQ(counts_.published.value(), 50U);
}

TEST_F(PublishingTogether, AsksTheBusMoreOftenForLongOrders) {
    submitToMany(10, std::string(std::size_t{1} << 20, 'x'));
    EXPECT_FALSE(centre_.work(1000));
    EXPECT_EQ(bus_.questions, 3) << "4 MiB at a time";
    EXPECT_EQ(republished_.size(), 10U);
    for (int i = 10; i < 12; ++i)
        submitToHost(i, std::string(std::size_t{5} << 20, 'x'));
    EXPECT_FALSE(centre_.work(1000));
    EXPECT_EQ(bus_.questions, 5) << "one that is longer goes alone";
    EXPECT_EQ(republished_.size(), 12U);
}

TEST_F(PublishingTogether, SaysThatThereIsMoreThanIsDoneAtOnce) {
    submitToMany(50);
    EXPECT_TRUE(centre_.work(20));
    EXPECT_EQ(republished_.size(), 20U);
    while (centre_.work(20)) {
    }
    EXPECT_EQ(republished_.size(), 50U);
}

TEST_F(PublishingTogether, AnOrderForWhichThereIsNoRoomHoldsUpNoOthers) {
    submitToMany(100);
    bus_.full = {hostOf(0)};
    EXPECT_FALSE(centre_.work(1000)) << "it is tried again later, not at once";
    EXPECT_EQ(republished_.size(), 99U);
    bus_.full.clear();
    EXPECT_FALSE(centre_.work(1000));
    EXPECT_EQ(republished_.size(), 100U);
}

TEST_F(PublishingTogether, ManyOrdersWithoutRoomTakeTheirTurnsWithTheOthers) {
    submitToMany(100);
    for (int i = 0; i < 90; ++i)
        bus_.full.insert(hostOf(i));
    int looks = 0;
    for (; republished_.size() < 10 && looks < 20; ++looks)
        EXPECT_FALSE(centre_.work(20)) << "a few at each look";
    EXPECT_LE(looks, 6) << "one look at each of them is enough";
    const std::string early = hostOf(40);
    bus_.full.erase(early);
    for (looks = 0; republished_.size() < 11 && looks < 20; ++looks)
        centre_.work(20);
    EXPECT_LE(looks, 6);
    bus_.full.clear();
    for (looks = 0; republished_.size() < 100 && looks < 20; ++looks) {
        while (centre_.work(20)) {
        }
    }
    EXPECT_LE(looks, 3) << "with room, all that is left goes at once";
}

TEST_F(PublishingTogether, AnOrderWithoutAnAnswerKeepsItsNumberAndIsPublishedLater) {
    submitToMany(3);
    bus_.silent = {hostOf(1)};
    EXPECT_FALSE(centre_.work(1000));
    EXPECT_EQ(republished_, (std::set<std::string>{"h0.1", "h2.1"}));
    EXPECT_FALSE(store_.order(hostOf(1), "order")->isPublished);
    EXPECT_TRUE(store_.order(hostOf(2), "order")->isPublished);
    EXPECT_EQ(counts_.unanswered.value(), 1U);
    bus_.silent.clear();
    EXPECT_FALSE(centre_.work(1000));
    EXPECT_EQ(republished_, (std::set<std::string>{"h0.1", "h1.1", "h2.1"}));
    EXPECT_EQ(store_.order(hostOf(1), "order")->number, Number{1});
}

TEST_F(PublishingTogether, ABusThatSaysNothingIsNotAskedForTheRest) {
    submitToMany(500);
    for (int i = 0; i < 500; ++i)
        bus_.silent.insert(hostOf(i));
    EXPECT_FALSE(centre_.work(1000)) << "the next look comes a second later";
    EXPECT_EQ(bus_.questions, 1);
}

TEST_F(PublishingTogether, OrdersThatAreOverAreRemovedTogether) {
    submitToMany(50);
    centre_.work(1000);
    for (int i = 0; i < 50; ++i) {
        fleet::Outcome outcome;
        outcome.host = hostOf(i);
        outcome.order = "order";
        outcome.state = "done";
        centre_.hear(outcome);
    }
    const int before = bus_.questions;
    EXPECT_FALSE(centre_.work(1000));
    EXPECT_EQ(bus_.questions - before, 2) << "where they are now, and then without them";
    EXPECT_TRUE(disk_.tasks().empty());
}

}  // namespace
