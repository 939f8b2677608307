/// How the roll-outs' statements are carried out, with as many hosts as a large fleet has.
#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "fleet/server/store/centre_schema.h"
#include "fleet/server/store/rollout_rows.h"

namespace {

constexpr int kHosts = 10'000;

/// One roll-out to all hosts, half of which have their orders; and what SQLite knows when it has
/// looked at all of them.
class RolloutStatement : public testing::TestWithParam<const char*> {
protected:
    static void SetUpTestSuite() {
        database_ = std::make_unique<sqlite::Database>(":memory:");
        fleet::makeCentreTables(*database_);
        database_->run("BEGIN");
        for (int i = 0; i < kHosts; ++i) {
            const std::string name = "h" + std::to_string(i);
            database_->change(
                "INSERT INTO hosts (host, last, told, machine, journal, session, earlier_session,"
                " stopped, unpublished, heard) VALUES (?, 0, 0, '', '', '', '', '', '', 0)",
                name);
            database_->change(fleet::kAddPart, 1, i, 1, name, 1, 1, i % 2, 0, "", "", 0, "", name);
        }
        database_->run("COMMIT");
    }
    static void TearDownTestSuite() { database_.reset(); }

    static std::string planOf(const std::string& sql) {
        sqlite::Statement plan = database_->ask(("EXPLAIN QUERY PLAN " + sql).c_str());
        std::string text;
        while (plan.step())
            text += plan.bytes(3) + "\n";
        return text;
    }
    static void expectDirect() {
        const std::string plan = planOf(GetParam());
        EXPECT_NE(plan.find("SEARCH"), std::string::npos) << plan;
        EXPECT_EQ(plan.find("SCAN"), std::string::npos) << plan;
        EXPECT_EQ(plan.find("TEMP B-TREE"), std::string::npos) << plan;
    }

    static std::unique_ptr<sqlite::Database> database_;
};

std::unique_ptr<sqlite::Database> RolloutStatement::database_;

TEST_P(RolloutStatement, NeitherGoesThroughATableNorSorts) {
    expectDirect();
}

TEST_P(RolloutStatement, DoesSoAlsoWhenSqliteKnowsTheTables) {
    database_->run("ANALYZE");
    expectDirect();
}

INSTANTIATE_TEST_SUITE_P(
    All, RolloutStatement,
    testing::Values(fleet::kKnowsOrder, fleet::kRolloutByName, fleet::kRolloutsBefore,
                    fleet::kRolloutsRunning, fleet::kKeepRollout, fleet::kPartOfHost,
                    fleet::kKeepPart, fleet::kWaitingOrder, fleet::kDropWaitingOrder,
                    fleet::kDropWaitingOrders, fleet::kWaitingParts, fleet::kHasWaiting,
                    fleet::kCountReleased, fleet::kHasUnfinished, fleet::kHasReleased,
                    fleet::kPostponeWaiting, fleet::kEndWaiting, fleet::kHasMoreFailures,
                    fleet::kForgiveFailures, fleet::kToldParts, fleet::kForgetTold,
                    fleet::kTellKnown, fleet::kCancelsToRelease, fleet::kCancelOrder,
                    fleet::kForgetCancel, fleet::kExpiringParts, fleet::kUncancelledParts,
                    fleet::kPartsOver, fleet::kTallies, fleet::kCountAway, fleet::kCountPastExpiry,
                    fleet::kFailedParts, fleet::kPartsFrom));

class RolloutTickStatement : public RolloutStatement {};

/// What a tick asks of each roll-out. An index that tells the state and the wave leads to the few
/// hosts that matter; another one would lead through all hosts of the roll-out.
TEST_P(RolloutTickStatement, KnowsTheStateBeforeItLooksAtAHost) {
    const std::string plan = planOf(GetParam());
    EXPECT_NE(plan.find("rollout_parts_by_state (rollout=? AND state=?"), std::string::npos)
        << plan;
}

INSTANTIATE_TEST_SUITE_P(All, RolloutTickStatement,
                         testing::Values(fleet::kWaitingParts, fleet::kHasWaiting,
                                         fleet::kCountReleased, fleet::kHasUnfinished,
                                         fleet::kHasReleased, fleet::kPostponeWaiting));

TEST(RolloutTick, FindsFailuresAmongTheFailed) {
    sqlite::Database database(":memory:");
    fleet::makeCentreTables(database);
    sqlite::Statement plan =
        database.ask((std::string("EXPLAIN QUERY PLAN ") + fleet::kHasMoreFailures).c_str());
    ASSERT_TRUE(plan.step());
    EXPECT_NE(plan.bytes(3).find("rollout_parts_failed (rollout=? AND failure>? AND failure<?)"),
              std::string::npos)
        << plan.bytes(3);
}

}  // namespace
