/// How the roll-outs' statements are carried out, with as many hosts as a large fleet has.
#include <gtest/gtest.h>

#include <string>

#include "fleet/server/store/centre_schema.h"
#include "fleet/server/store/rollout_rows.h"

namespace {

constexpr int kHosts = 10'000;

constexpr const char* kAllStatements[] = {
    fleet::kKnowsOrder,        fleet::kRolloutByName,    fleet::kRolloutsBefore,
    fleet::kRolloutsRunning,   fleet::kKeepRollout,      fleet::kPartOfHost,
    fleet::kKeepPart,          fleet::kWaitingOrder,     fleet::kDropWaitingOrder,
    fleet::kDropWaitingOrders, fleet::kWaitingParts,     fleet::kHasWaiting,
    fleet::kCountReleased,     fleet::kHasUnfinished,    fleet::kHasReleased,
    fleet::kPostponeWaiting,   fleet::kEndWaiting,       fleet::kHasMoreFailures,
    fleet::kForgiveFailures,   fleet::kToldParts,        fleet::kForgetTold,
    fleet::kTellKnown,         fleet::kCancelsToRelease, fleet::kCancelOrder,
    fleet::kForgetCancel,      fleet::kExpiringParts,    fleet::kUncancelledParts,
    fleet::kPartsOver,         fleet::kTallies,          fleet::kCountAway,
    fleet::kCountPastExpiry,   fleet::kFailedParts,      fleet::kPartsFrom};

/// What a tick asks of each roll-out that depends on the states of its parts.
constexpr const char* kTickStatements[] = {fleet::kWaitingParts,  fleet::kHasWaiting,
                                           fleet::kCountReleased, fleet::kHasUnfinished,
                                           fleet::kHasReleased,   fleet::kPostponeWaiting};

class RolloutStatements : public testing::Test {
protected:
    /// One roll-out to all hosts, half of which have their orders.
    RolloutStatements() {
        fleet::makeCentreTables(database_);
        database_.run("BEGIN");
        for (int i = 0; i < kHosts; ++i) {
            const std::string name = "h" + std::to_string(i);
            database_.change(
                "INSERT INTO hosts (host, last, told, machine, journal, session, earlier_session,"
                " stopped, unpublished, heard) VALUES (?, 0, 0, '', '', '', '', '', '', 0)",
                name);
            database_.change(fleet::kAddPart, 1, i, 1, name, 1, 1, i % 2, 0, "", "", 0, "", name);
        }
        database_.run("COMMIT");
    }
    std::string planOf(const std::string& sql) {
        sqlite::Statement plan = database_.ask(("EXPLAIN QUERY PLAN " + sql).c_str());
        std::string text;
        while (plan.step())
            text += plan.bytes(3) + "\n";
        return text;
    }
    void expectDirect() {
        for (const char* const sql : kAllStatements) {
            const std::string plan = planOf(sql);
            EXPECT_NE(plan.find("SEARCH"), std::string::npos) << sql << "\n" << plan;
            EXPECT_EQ(plan.find("SCAN"), std::string::npos) << sql << "\n" << plan;
            EXPECT_EQ(plan.find("TEMP B-TREE"), std::string::npos) << sql << "\n" << plan;
        }
    }
    /// An index that tells the state leads to the few hosts that matter; another one would lead
    /// through all hosts of the roll-out.
    void expectStateFirst() {
        for (const char* const sql : kTickStatements) {
            const std::string plan = planOf(sql);
            EXPECT_NE(plan.find("rollout_parts_by_state (rollout=? AND state=?"), std::string::npos)
                << sql << "\n"
                << plan;
        }
        const std::string failures = planOf(fleet::kHasMoreFailures);
        EXPECT_NE(failures.find("rollout_parts_failed (rollout=? AND failure>? AND failure<?)"),
                  std::string::npos)
            << failures;
    }

    sqlite::Database database_{":memory:"};
};

TEST_F(RolloutStatements, NeitherGoThroughATableNorSort) {
    expectDirect();
    expectStateFirst();
}

TEST_F(RolloutStatements, DoNotWhenSqliteKnowsWhatIsInTheTablesEither) {
    database_.run("ANALYZE");
    expectDirect();
    expectStateFirst();
}

}  // namespace
