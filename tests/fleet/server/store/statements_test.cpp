/// How the store's statements are carried out. SQLite decides by the tables' indexes alone, so
/// empty tables tell it for ten thousand hosts and a million orders.
#include <gtest/gtest.h>

#include <string>

#include "fleet/server/store/centre_schema.h"
#include "fleet/server/store/order_rows.h"
#include "fleet/server/store/stored_figures.h"

namespace {

class StoreStatement : public testing::TestWithParam<const char*> {};

std::string planOf(const std::string& sql) {
    sqlite::Database database(":memory:");
    fleet::makeCentreTables(database);
    sqlite::Statement plan = database.ask(("EXPLAIN QUERY PLAN " + sql).c_str());
    std::string text;
    while (plan.step())
        text += plan.bytes(3) + "\n";
    return text;
}

TEST_P(StoreStatement, NeitherGoesThroughAllOrdersNorSortsThem) {
    const std::string plan = planOf(GetParam());
    EXPECT_NE(plan.find("SEARCH"), std::string::npos) << plan;
    EXPECT_EQ(plan.find("SCAN"), std::string::npos) << plan;
    EXPECT_EQ(plan.find("TEMP B-TREE"), std::string::npos) << plan;
}

INSTANTIATE_TEST_SUITE_P(All, StoreStatement,
                         testing::Values(fleet::kOrderByName, fleet::kOrderByNumber,
                                         fleet::kUnpublished, fleet::kOpen, fleet::kLatest,
                                         fleet::kNotePublished, fleet::kKeepOutcome, fleet::kHold,
                                         fleet::kRelease, fleet::kReleaseAll, fleet::kComplete));

TEST(StoreStatements, AnOrderWhoseHostNobodyKnowsIsSearchedForOnceForEachHost) {
    const std::string plan = planOf(fleet::kOrdersNamed);
    EXPECT_NE(plan.find("SEARCH o "), std::string::npos) << plan;
    EXPECT_EQ(plan.find("SCAN o "), std::string::npos) << plan;
}

TEST(StoreStatements, ThoseWithoutAnIndexAreSeenToGoThroughAllOrders) {
    const std::string plan = planOf("SELECT name FROM orders WHERE bytes = x'' ORDER BY task");
    EXPECT_NE(plan.find("SCAN"), std::string::npos) << plan;
    EXPECT_NE(plan.find("TEMP B-TREE"), std::string::npos) << plan;
}

/// A scrape reads them beside the centre, every some seconds.
TEST(StoreStatements, FiguresAreCountedInIndexesOfWhatIsUnfinished) {
    for (const char* const count :
         {fleet::kCountWaiting, fleet::kCountOpen, fleet::kCountUnconfirmed}) {
        const std::string plan = planOf(count);
        EXPECT_EQ(plan.find("SCAN rollout_parts"), std::string::npos) << plan;
        EXPECT_EQ(plan.find("SCAN p"), std::string::npos) << plan;
        EXPECT_EQ(plan.find("SCAN orders\n"), std::string::npos) << plan;
    }
    EXPECT_NE(planOf(fleet::kCountWaiting).find("orders_waiting"), std::string::npos);
    EXPECT_NE(planOf(fleet::kCountOpen).find("orders_open"), std::string::npos);
    EXPECT_NE(planOf(fleet::kCountUnconfirmed).find("rollout_parts_by_state"), std::string::npos);
}

/// What waits for a host that is held back is not gone through on the way to what may be published.
TEST(StoreStatements, OrdersThatAreHeldBackStandInNoIndexOfThoseThatWait) {
    EXPECT_NE(planOf(fleet::kUnpublished).find("orders_waiting"), std::string::npos);
}

}  // namespace
