/// What every store of the centre's does: the one that ships and the model's.
#include <gtest/gtest.h>

#include <limits>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "fleet/server/store/centre_database.h"
#include "fleet/server/store/sqlite_centre_store.h"
#include "tests/fleet/model/sim_store.h"
#include "tests/support/scratch_dir.h"

namespace {

using fleet::Number;
using fleet::OrderRecord;
using Names = std::vector<std::string>;

/// The model's, without faults.
class InMemory {
public:
    InMemory() { dice_.faults = false; }
    fleet::CentreStore& store() { return store_; }

private:
    model::Dice dice_{1};
    model::SimStore store_{dice_};
};

class InFile {
public:
    fleet::CentreStore& store() { return store_; }

private:
    ScratchDir scratch_;
    fleet::CentreDatabase database_{scratch_.path("centre")};
    fleet::SqliteCentreStore store_{database_.connection()};
};

template <typename Kind>
class CentreStoreContract : public testing::Test {
protected:
    CentreStoreContract() {
        for (const char* const host : {"a", "b"}) {
            fleet::HostRecord record;
            record.host = host;
            store().keepHost(record);
        }
    }
    fleet::CentreStore& store() { return kind_.store(); }
    Number give(const std::string& host, const std::string& order) {
        return store().give(host, order, sealed).value();
    }
    static std::string sealed(Number number) { return "sealed " + std::to_string(number); }
    static fleet::Outcome done(const std::string& host, const std::string& order) {
        return {host, 7, order, "journal", "done", "{}"};
    }
    void hold(const std::string& host, const std::string& why) {
        fleet::HostRecord record = store().host(host).value();
        record.unpublished = why;
        store().keepHost(record);
    }
    template <typename Order>
    static Names namesOf(const std::vector<Order>& orders) {
        Names names;
        for (const Order& order : orders)
            names.push_back(order.order);
        return names;
    }

private:
    Kind kind_;
};

using Kinds = testing::Types<InMemory, InFile>;
TYPED_TEST_SUITE(CentreStoreContract, Kinds);

TYPED_TEST(CentreStoreContract, KeepsAllOfAHost) {
    fleet::HostRecord record;
    record.host = "c";
    record.last = fleet::kHighestNumber;
    record.told = 3;
    record.machine = "machine";
    record.journal = "journal";
    record.session = "session";
    record.earlierSession = "earlier";
    record.stopped = "stopped";
    record.unpublished = "unpublished";
    record.signing = "UKEY";
    record.name = "web-1";
    record.toldTime = fleet::Moment(1'234'567'890'000);
    record.heard = fleet::Moment(1'234'567'890'123);
    this->store().keepHost(record);
    const fleet::HostRecord kept = this->store().host("c").value();
    EXPECT_EQ(kept.host, "c");
    EXPECT_EQ(kept.last, fleet::kHighestNumber);
    EXPECT_EQ(kept.told, Number{3});
    EXPECT_EQ(kept.machine, "machine");
    EXPECT_EQ(kept.journal, "journal");
    EXPECT_EQ(kept.session, "session");
    EXPECT_EQ(kept.earlierSession, "earlier");
    EXPECT_EQ(kept.stopped, "stopped");
    EXPECT_EQ(kept.unpublished, "unpublished");
    EXPECT_EQ(kept.signing, "UKEY");
    EXPECT_EQ(kept.name, "web-1");
    EXPECT_EQ(kept.toldTime, fleet::Moment(1'234'567'890'000));
    EXPECT_EQ(kept.heard, fleet::Moment(1'234'567'890'123));
    record.machine.clear();
    this->store().keepHost(record);
    EXPECT_EQ(this->store().host("c")->machine, "");
    EXPECT_FALSE(this->store().host("nobody").has_value());
}

TYPED_TEST(CentreStoreContract, CountsTheOrdersOfEachHost) {
    EXPECT_EQ(this->give("a", "one"), Number{1});
    EXPECT_EQ(this->give("a", "two"), Number{2});
    EXPECT_EQ(this->give("b", "one"), Number{1});
    EXPECT_EQ(this->store().host("a")->last, Number{2});
    const OrderRecord two = this->store().order("a", "two").value();
    EXPECT_EQ(two.host, "a");
    EXPECT_EQ(two.number, Number{2});
    EXPECT_EQ(two.bytes, "sealed 2");
    EXPECT_FALSE(two.isPublished);
    EXPECT_FALSE(two.outcome.has_value());
}

TYPED_TEST(CentreStoreContract, KeepsBytesAsTheyAre) {
    const std::string bytes("\0\xFF'x", 4);
    const std::string name("order\0'", 7);
    this->store().give("a", name, [&](Number) { return bytes; });
    EXPECT_EQ(this->store().order("a", name)->bytes, bytes);
    EXPECT_EQ(this->store().orderAt("a", 1)->order, name);
}

TYPED_TEST(CentreStoreContract, GivesTheSameOrderTheSameNumberAgain) {
    this->give("a", "one");
    this->give("a", "two");
    const auto again =
        this->store().give("a", "one", [](Number) -> std::string { return "other"; });
    EXPECT_EQ(again, Number{1});
    EXPECT_EQ(this->store().order("a", "one")->bytes, "sealed 1");
    EXPECT_EQ(this->store().host("a")->last, Number{2});
}

TYPED_TEST(CentreStoreContract, GivesNoNumberToAStranger) {
    EXPECT_FALSE(this->store().give("nobody", "one", this->sealed).has_value());
    EXPECT_FALSE(this->store().order("nobody", "one").has_value());
    OrderRecord order;
    order.host = "nobody";
    order.order = "one";
    this->store().adopt(order);
    EXPECT_FALSE(this->store().order("nobody", "one").has_value());
}

TYPED_TEST(CentreStoreContract, FindsAnOrderByItsNumber) {
    this->give("a", "one");
    this->give("b", "other");
    EXPECT_EQ(this->store().orderAt("b", 1)->order, "other");
    EXPECT_FALSE(this->store().orderAt("a", 2).has_value());
    EXPECT_FALSE(this->store().orderAt("nobody", 1).has_value());
}

TYPED_TEST(CentreStoreContract, TellsWhatWaitsLowestNumbersFirst) {
    for (const char* const order : {"one", "two", "three"})
        this->give("a", order);
    EXPECT_EQ(this->namesOf(this->store().unpublished(9, 0)), (Names{"one", "two", "three"}));
    EXPECT_EQ(this->namesOf(this->store().unpublished(2, 0)), (Names{"one", "two"}));
    EXPECT_EQ(this->namesOf(this->store().unpublished(2, 1)), (Names{"two", "three"}));
    EXPECT_EQ(this->namesOf(this->store().unpublished(2, 3)), Names{});
    this->store().notePublished("a", 1);
    EXPECT_TRUE(this->store().order("a", "one")->isPublished);
    this->store().keepOutcome(this->done("a", "two"));
    EXPECT_EQ(this->namesOf(this->store().unpublished(9, 0)), (Names{"three"}));
}

TYPED_TEST(CentreStoreContract, HoldsBackTheOrdersOfAHostForWhichNothingIsPublished) {
    this->give("a", "one");
    this->give("b", "other");
    this->hold("a", "something is wrong");
    this->give("a", "two");
    EXPECT_EQ(this->namesOf(this->store().unpublished(9, 0)), (Names{"other"}));
    this->hold("a", "something else is wrong");
    EXPECT_EQ(this->namesOf(this->store().unpublished(9, 0)), (Names{"other"}));
    this->store().notePublished("b", 1);
    this->hold("a", "");
    EXPECT_EQ(this->namesOf(this->store().unpublished(9, 0)), (Names{"one", "two"}));
}

TYPED_TEST(CentreStoreContract, TellsTheOpenOrdersOfARange) {
    for (const char* const order : {"one", "two", "three", "four"})
        this->give("a", order);
    this->give("b", "other");
    this->store().notePublished("a", 2);
    this->store().keepOutcome(this->done("a", "three"));
    EXPECT_EQ(this->namesOf(this->store().open("a", 2, 4, 9)), (Names{"two", "four"}));
    EXPECT_EQ(this->namesOf(this->store().open("a", 1, 4, 2)), (Names{"one", "two"}));
    EXPECT_EQ(this->namesOf(this->store().open("a", 2, std::numeric_limits<Number>::max(), 9)),
              (Names{"two", "four"}));
    EXPECT_EQ(this->namesOf(this->store().open("a", 5, 4, 9)), Names{});
}

TYPED_TEST(CentreStoreContract, KeepsAllOfAnOutcome) {
    this->give("a", "one");
    this->store().keepOutcome(this->done("a", "one"));
    const fleet::Outcome kept = this->store().order("a", "one")->outcome.value();
    EXPECT_TRUE(fleet::saySame(kept, this->done("a", "one")));
    EXPECT_EQ(kept.number, Number{7});
    fleet::Outcome other = this->done("a", "one");
    other.state = "failed";
    this->store().keepOutcome(other);
    EXPECT_EQ(this->store().order("a", "one")->outcome->state, "failed");
    EXPECT_THROW(this->store().keepOutcome(this->done("a", "nobody's")), std::out_of_range);
}

TYPED_TEST(CentreStoreContract, AdoptsAnOrderThatOnlyTheHostKnows) {
    OrderRecord order;
    order.host = "a";
    order.order = "listed";
    order.isPublished = true;
    this->store().adopt(order);
    EXPECT_EQ(this->store().order("a", "listed")->number, Number{0});
    EXPECT_EQ(this->namesOf(this->store().open("a", 0, 9, 9)), (Names{"listed"}));
    EXPECT_EQ(this->namesOf(this->store().unpublished(9, 0)), Names{});

    order.number = 5;
    order.bytes = "sealed 5";
    this->store().adopt(order);
    EXPECT_EQ(this->store().orderAt("a", 5)->bytes, "sealed 5");
    order.number = 6;
    order.bytes = "another";
    this->store().adopt(order);
    EXPECT_EQ(this->store().order("a", "listed")->number, Number{5});
    EXPECT_EQ(this->store().order("a", "listed")->bytes, "sealed 5");
}

TYPED_TEST(CentreStoreContract, AdoptsAnOutcomeToo) {
    OrderRecord order;
    order.host = "a";
    order.number = 5;
    order.order = "over";
    order.outcome = this->done("a", "over");
    this->store().adopt(order);
    EXPECT_TRUE(fleet::saySame(*this->store().order("a", "over")->outcome, *order.outcome));
    EXPECT_EQ(this->namesOf(this->store().open("a", 0, 9, 9)), Names{});
}

TYPED_TEST(CentreStoreContract, SkipsNumbersOfEveryHostAndPublishesForAll) {
    this->give("a", "one");
    this->hold("a", "something is wrong");
    fleet::HostRecord far = this->store().host("b").value();
    far.last = 5'000;
    this->store().keepHost(far);
    EXPECT_EQ(this->store().listUntil(), fleet::Moment(0));
    this->store().skipNumbers(10, 1'000, fleet::Moment(77));
    EXPECT_EQ(this->store().host("a")->last, Number{1'000});
    EXPECT_EQ(this->store().host("b")->last, Number{5'010});
    EXPECT_EQ(this->store().host("a")->unpublished, "");
    EXPECT_EQ(this->store().listUntil(), fleet::Moment(77));
    EXPECT_EQ(this->namesOf(this->store().unpublished(9, 0)), (Names{"one"}));
    EXPECT_EQ(this->give("a", "two"), Number{1'001});
}

TYPED_TEST(CentreStoreContract, GivesNoNumberWhenSealingFails) {
    const auto fail = [](Number) -> std::string { throw std::runtime_error("no key"); };
    EXPECT_THROW(this->store().give("a", "one", fail), std::runtime_error);
    EXPECT_FALSE(this->store().order("a", "one").has_value());
    EXPECT_EQ(this->give("a", "two"), Number{1});
}

}  // namespace
