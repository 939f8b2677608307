#include "fleet/server/store/host_facts.h"

#include <gtest/gtest.h>

#include "fleet/server/store/centre_schema.h"
#include "fleet/server/store/sqlite_centre_store.h"

namespace {

using fleet::Facts;
using fleet::Moment;

class KeptHostFacts : public testing::Test {
protected:
    KeptHostFacts() {
        fleet::makeCentreTables(database_);
        fleet::HostRecord record;
        record.host = "a";
        fleet::SqliteCentreStore(database_).keepHost(record);
    }
    static Facts factsAt(Moment time, const std::string& environment) {
        Facts facts;
        facts.host = "a";
        facts.time = time;
        facts.name = "web-1";
        facts.labels = {{"env", environment}};
        facts.link = "l";
        facts.version = "v";
        facts.journal = "j";
        facts.blocked = "b";
        facts.inventory = fleet::Inventory{Moment(7), R"({"products":[]})"};
        return facts;
    }

    sqlite::Database database_{":memory:"};
    fleet::HostFacts facts_{database_};
};

TEST_F(KeptHostFacts, ComeBackAsTheyWereTold) {
    EXPECT_FALSE(facts_.of("a").has_value());
    EXPECT_TRUE(facts_.keep(factsAt(Moment(10), "test"), Moment(20)));
    const auto kept = facts_.of("a");
    ASSERT_TRUE(kept.has_value());
    EXPECT_TRUE(saySame(kept->facts, factsAt(Moment(10), "test")));
    EXPECT_EQ(kept->facts.time, Moment(10));
    EXPECT_EQ(kept->facts.inventory->time, Moment(7));
    EXPECT_EQ(kept->heard, Moment(20));
    EXPECT_EQ(facts_.labels(), (std::map<std::string, fleet::Labels>{{"a", {{"env", "test"}}}}));
}

TEST_F(KeptHostFacts, AreTheNewestOnes) {
    facts_.keep(factsAt(Moment(10), "test"), Moment(20));
    EXPECT_FALSE(facts_.keep(factsAt(Moment(10), "repeated"), Moment(21)));
    EXPECT_FALSE(facts_.keep(factsAt(Moment(9), "old"), Moment(22)));
    EXPECT_EQ(facts_.of("a")->facts.labels.at("env"), "test");
    Facts newer = factsAt(Moment(11), "production");
    newer.inventory.reset();
    EXPECT_TRUE(facts_.keep(newer, Moment(23)));
    EXPECT_EQ(facts_.of("a")->facts.labels.at("env"), "production");
    EXPECT_FALSE(facts_.of("a")->facts.inventory.has_value());
}

TEST_F(KeptHostFacts, OfAStrangerAreNotKept) {
    Facts strange = factsAt(Moment(10), "test");
    strange.host = "b";
    EXPECT_FALSE(facts_.keep(strange, Moment(20)));
    EXPECT_TRUE(facts_.labels().empty());
}

}  // namespace
