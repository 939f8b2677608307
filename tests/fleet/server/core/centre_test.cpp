/// What the centre does with orders, hellos and outcomes.
#include "fleet/server/core/centre.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/fleet/model/sim_bus.h"
#include "tests/fleet/model/sim_store.h"

namespace {

using fleet::Centre;
using fleet::Hello;
using fleet::Moment;
using fleet::Number;
using fleet::Outcome;
using fleet::Reply;

constexpr Moment kNow{1'700'000'000'000};

/// A centre with hosts, on a bus and a store without faults.
class CentreTest : public testing::Test {
protected:
    CentreTest() {
        dice_.faults = false;
        bus_.republish = [this](const std::string& host, Number number) {
            republished_.push_back(host + "." + std::to_string(number));
        };
        for (const char* const host : {"a", "b", "c"}) {
            fleet::HostRecord record;
            record.host = host;
            store_.tables.hosts[host] = record;
        }
    }

    void submit(const std::string& host, const std::string& order) {
        centre_.submit(host, order, [&](Number number) {
            return host + "." + std::to_string(number) + "=" + order;
        });
    }
    void work() {
        while (centre_.work(100)) {
        }
    }
    Hello hello(Number taken) const {
        Hello made;
        made.session = "session";
        made.machine = "machine";
        made.taken = taken;
        made.journal = made.journalNow = "journal";
        return made;
    }
    /// A link makes a nonce for each hello.
    Reply greet(const std::string& host, Hello said) {
        said.nonce = "nonce " + std::to_string(++nonces_);
        return centre_.greet(host, said, kNow).value();
    }
    void end(const std::string& host, const std::string& order, const std::string& state) {
        Outcome outcome;
        outcome.host = host;
        outcome.order = order;
        outcome.journal = "journal";
        outcome.state = state;
        centre_.hear(outcome);
    }
    std::string stateOf(const std::string& host, const std::string& order) const {
        const auto record = store_.order(host, order);
        return record && record->outcome ? record->outcome->state : "";
    }

    model::Dice dice_{1};
    model::SimBus disk_{dice_};
    model::SimCentreBus bus_{disk_, dice_};
    model::SimStore store_{dice_};
    std::vector<std::string> republished_;
    int nonces_ = 0;
    std::vector<std::string> alarms_;
    Centre centre_{store_, bus_,
                   [this](const fleet::Alarm& alarm) { alarms_.push_back(alarm.host); }};
};

TEST_F(CentreTest, GivesEachHostItsOwnNumbersOneAfterTheOther) {
    submit("a", "one");
    submit("b", "two");
    submit("a", "three");
    EXPECT_EQ(store_.order("a", "one")->number, Number{1});
    EXPECT_EQ(store_.order("b", "two")->number, Number{1});
    EXPECT_EQ(store_.order("a", "three")->number, Number{2});
}

TEST_F(CentreTest, TheSameOrderAgainKeepsItsNumber) {
    submit("a", "one");
    submit("a", "one");
    EXPECT_EQ(greet("a", hello(0)).last, Number{1});
}

TEST_F(CentreTest, KnowsNoHostThatNobodyEnrolled) {
    EXPECT_FALSE(centre_.submit("x", "one", [](Number) { return std::string(); }).has_value());
    EXPECT_FALSE(centre_.greet("x", hello(0), kNow).has_value());
}

TEST_F(CentreTest, PublishesEachOrderOnce) {
    submit("a", "one");
    submit("a", "two");
    work();
    work();
    EXPECT_EQ(republished_, (std::vector<std::string>{"a.1", "a.2"}));
}

TEST_F(CentreTest, AnOrderWhoseAnswerWasLostIsPublished) {
    submit("a", "one");
    disk_.store("a", 1, "a.1=one");
    work();
    EXPECT_TRUE(store_.order("a", "one")->isPublished);
    EXPECT_TRUE(alarms_.empty());
}

TEST_F(CentreTest, AnotherMessageInAnOrdersPlaceStopsThatHostOnly) {
    submit("a", "one");
    submit("a", "two");
    submit("b", "three");
    disk_.store("a", 1, "something else");
    work();
    work();
    EXPECT_EQ(alarms_, std::vector<std::string>{"a"});
    EXPECT_FALSE(store_.order("a", "one")->isPublished);
    EXPECT_TRUE(store_.order("b", "three")->isPublished);
}

TEST_F(CentreTest, ALinkThatHasNotTakenAnOrderGetsItPublishedAgain) {
    submit("a", "one");
    submit("a", "two");
    work();
    disk_.loseDisks();
    republished_.clear();
    greet("a", hello(1));
    work();
    EXPECT_EQ(republished_, std::vector<std::string>{"a.2"});
}

TEST_F(CentreTest, NamesWhatIsOpenAndWhatIsOver) {
    for (const char* const order : {"one", "two", "three", "four"})
        submit("a", order);
    end("a", "one", "done");
    end("a", "three", "failed");
    const Reply reply = greet("a", hello(3));
    EXPECT_EQ(reply.open, std::vector<std::string>{"two"});
    EXPECT_EQ(reply.over, Number{1});
    EXPECT_EQ(reply.last, Number{4});
    end("a", "two", "done");
    end("a", "four", "done");
    EXPECT_EQ(greet("a", hello(4)).over, Number{4});
}

TEST_F(CentreTest, NamesOnlySoManyOpenOrdersInOneReply) {
    for (std::size_t i = 0; i < Centre::kMostOpen + 5; ++i)
        submit("a", std::to_string(i));
    EXPECT_EQ(greet("a", hello(Centre::kMostOpen + 5)).open.size(), Centre::kMostOpen);
}

TEST_F(CentreTest, RemovesFromTheBusWhatIsOver) {
    submit("a", "one");
    submit("b", "two");
    work();
    end("a", "one", "done");
    work();
    EXPECT_FALSE(disk_.fetch("a", 1).has_value());
    EXPECT_TRUE(disk_.fetch("b", 1).has_value());
}

TEST_F(CentreTest, TheSameHelloAgainProvesNothing) {
    Hello said = hello(0);
    said.nonce = "one";
    EXPECT_TRUE(centre_.greet("a", said, kNow).has_value());
    EXPECT_FALSE(centre_.greet("a", said, kNow + Moment(60'000)).has_value());
    EXPECT_EQ(store_.host("a")->heard, kNow) << "a bus that repeats it hides that the host is away";
    said.nonce = "another";
    EXPECT_TRUE(centre_.greet("a", said, kNow + Moment(60'000)).has_value());
}

TEST_F(CentreTest, TheSweepRemovesWhatWasLeftOnTheBus) {
    submit("a", "one");
    work();
    end("a", "one", "done");
    work();
    disk_.store("a", 1, "a.1=one");
    fleet::OrderRecord found;
    found.host = "a";
    found.number = 1;
    found.order = "one";
    centre_.foundOnBus(found, kNow);
    work();
    EXPECT_FALSE(disk_.fetch("a", 1).has_value());
}

TEST_F(CentreTest, AnUnknownOrderOnTheBusStopsWhatIsPublishedForItsHost) {
    submit("a", "one");
    work();
    fleet::OrderRecord found;
    found.host = "a";
    found.number = 2;
    found.order = "nobody's";
    found.bytes = "a.2=nobody's";
    centre_.foundOnBus(found, kNow);
    EXPECT_FALSE(store_.order("a", "nobody's").has_value()) << "only a restore adopts orders";
    EXPECT_NE(store_.host("a")->unpublished, "");
    EXPECT_EQ(alarms_, std::vector<std::string>{"a"});
    centre_.foundOnBus(found, kNow);
    EXPECT_EQ(alarms_.size(), 1U) << "said once";
    submit("a", "two");
    submit("b", "one");
    work();
    EXPECT_FALSE(disk_.fetch("a", 2).has_value());
    EXPECT_TRUE(disk_.fetch("b", 1).has_value());
}

TEST_F(CentreTest, TheFirstOutcomeStaysAndAnotherRaisesAnAlarm) {
    submit("a", "one");
    end("a", "one", "done");
    end("a", "one", "done");
    EXPECT_TRUE(alarms_.empty());
    end("a", "one", "failed");
    EXPECT_EQ(alarms_, std::vector<std::string>{"a"});
    EXPECT_EQ(stateOf("a", "one"), "done");
}

TEST_F(CentreTest, AnOutcomeOfAnOrderThatNobodyGaveIsNotKept) {
    end("a", "nobody's", "done");
    EXPECT_FALSE(store_.order("a", "nobody's").has_value());
}

TEST_F(CentreTest, ALinkThatTellsLessThanBeforeHasForgotten) {
    for (const char* const order : {"one", "two", "three"})
        submit("a", order);
    EXPECT_FALSE(greet("a", hello(2)).forget);
    EXPECT_TRUE(greet("a", hello(1)).forget);
    EXPECT_TRUE(greet("a", hello(1)).forget);
    EXPECT_FALSE(greet("a", hello(3)).forget);
}

TEST_F(CentreTest, ALinkWithoutAnyMemoryMayAdoptOnlyTheJournalThatWasSeen) {
    Hello first = hello(0);
    first.journal.clear();
    EXPECT_FALSE(greet("a", first).forget);
    EXPECT_FALSE(greet("a", first).forget);
    first.journalNow = "another";
    EXPECT_TRUE(greet("a", first).forget);
    EXPECT_TRUE(greet("a", first).forget);
}

TEST_F(CentreTest, TwoSessionsInTurnAreTwoMachines) {
    Hello one = hello(0);
    Hello other = hello(0);
    other.session = "other";
    EXPECT_EQ(greet("a", one).stop, "");
    EXPECT_EQ(greet("a", other).stop, "");
    EXPECT_NE(greet("a", one).stop, "");
    EXPECT_NE(greet("a", other).stop, "");
    EXPECT_EQ(alarms_, std::vector<std::string>{"a"});
}

TEST_F(CentreTest, AHelloThatIsOlderThanOneBeforeCountsNothing) {
    Hello before = hello(0);
    before.time = Moment(1'000);
    greet("a", before);
    Hello after = hello(0);
    after.session = "after a new start";
    after.time = Moment(2'000);
    greet("a", after);
    EXPECT_FALSE(centre_.greet("a", before, kNow).has_value());
    EXPECT_EQ(greet("a", after).stop, "");
    EXPECT_TRUE(alarms_.empty());
}

TEST_F(CentreTest, StartsOneAfterTheOtherAreNoAlarm) {
    for (int start = 0; start < 5; ++start) {
        Hello said = hello(0);
        said.session = "session-" + std::to_string(start);
        EXPECT_EQ(greet("a", said).stop, "");
        EXPECT_EQ(greet("a", said).stop, "");
    }
    EXPECT_TRUE(alarms_.empty());
}

TEST_F(CentreTest, AnotherMachineThanTheFirstMustStop) {
    greet("a", hello(0));
    Hello moved = hello(0);
    moved.machine = "another";
    EXPECT_NE(greet("a", moved).stop, "");
    EXPECT_EQ(alarms_, std::vector<std::string>{"a"});
}

TEST_F(CentreTest, AHostThatHasTakenTooMuchGetsNothingMoreAndSeveralStopAll) {
    for (const char* const host : {"a", "b", "c"})
        submit(host, "one");
    greet("a", hello(7));
    EXPECT_FALSE(centre_.isBehind());
    work();
    EXPECT_EQ(republished_, (std::vector<std::string>{"b.1", "c.1"}));
    submit("c", "two");
    greet("b", hello(7));
    EXPECT_TRUE(centre_.isBehind());
    work();
    EXPECT_EQ(republished_, (std::vector<std::string>{"b.1", "c.1"}));
    EXPECT_EQ(alarms_, (std::vector<std::string>{"a", "b"}));
}

TEST_F(CentreTest, ARestoreSkipsNumbersAndAsksForALittleWhileWhatHostsHave) {
    submit("a", "one");
    centre_.restored(kNow);
    const Reply reply = greet("a", hello(1));
    EXPECT_TRUE(reply.list);
    EXPECT_GT(reply.last, Centre::kRestoreGap);
    const Moment later = kNow + Centre::kListTime;
    EXPECT_FALSE(centre_.greet("a", hello(1), later)->list);
}

TEST_F(CentreTest, TheSameBackupPutBackTwiceGivesNoNumberTwice) {
    const model::Tables backup = store_.tables;
    centre_.restored(kNow);
    submit("a", "one");
    const Number given = store_.order("a", "one")->number;
    store_.tables = backup;
    centre_.restored(kNow + Moment(60'000));
    submit("a", "two");
    EXPECT_GT(store_.order("a", "two")->number, given);
}

TEST_F(CentreTest, AfterARestoreListedOrdersAreOpenAndThoseOnTheBusAdopted) {
    centre_.restored(kNow);
    Hello listing = hello(5);
    listing.have = {{"told", 0}};
    EXPECT_EQ(greet("a", listing).open, std::vector<std::string>{"told"});
    fleet::OrderRecord found;
    found.host = "a";
    found.number = 5;
    found.order = "told";
    found.bytes = "bytes";
    centre_.adoptFromBus(found);
    EXPECT_EQ(store_.order("a", "told")->number, Number{5});
}

TEST_F(CentreTest, WithoutARestoreAHostCannotMakeOrdersUp) {
    Hello listing = hello(0);
    listing.have = {{"made-up", 0}};
    EXPECT_TRUE(greet("a", listing).open.empty());
}

}  // namespace
