// ctest-label: threaded
#include "host/journal/writer.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>

#include "support/gate.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

using host::Database;
using host::Writer;

class JournalWriter : public testing::Test {
protected:
    JournalWriter() { database.run("CREATE TABLE t (a INTEGER PRIMARY KEY)"); }

    static Writer::Change inserting(int number) {
        return [number](Database& written) { written.change("INSERT INTO t VALUES (?)", number); };
    }
    /// What another connection sees.
    std::int64_t rows() { return Database(scratch.path("db")).number("SELECT count(*) FROM t"); }

    ScratchDir scratch;
    Database database{scratch.path("db")};
};

TEST_F(JournalWriter, AChangeIsWrittenWhenItsFutureIsReady) {
    Writer writer(database);
    writer.submit(inserting(1)).get();
    EXPECT_EQ(rows(), 1);
}

TEST_F(JournalWriter, ThoseThatWaitShareOneTransaction) {
    Gate gate;
    Writer writer(database);
    auto first = writer.submit([&gate](Database&) { gate.pass(); });
    ASSERT_TRUE(gate.awaitArrival());
    std::vector<std::future<void>> others;
    for (int i = 0; i < 50; ++i)
        others.push_back(writer.submit(inserting(i)));
    gate.open();
    first.get();
    for (std::future<void>& other : others)
        other.get();
    EXPECT_EQ(writer.transactions(), 2U);
    EXPECT_EQ(rows(), 50);
}

TEST_F(JournalWriter, WaitsForMoreAfterSeveralHaveComeAtATime) {
    Gate gate;
    std::atomic<int> transactions{0};
    Writer::Watch watch;
    watch.committed = [&transactions](Database&) { ++transactions; };
    watch.gather = std::chrono::hours(1);  // the end cuts it short
    std::vector<std::future<void>> last;
    {
        Writer writer(database, nullptr, watch);
        auto first = writer.submit([&gate](Database&) { gate.pass(); });
        ASSERT_TRUE(gate.awaitArrival());
        auto second = writer.submit(inserting(1));
        auto third = writer.submit(inserting(2));
        gate.open();
        first.get();
        second.get();
        third.get();
        EXPECT_EQ(transactions, 2) << "who came alone did not wait";
        for (int i = 10; i < 20; ++i)
            last.push_back(writer.submit(inserting(i)));
    }
    for (std::future<void>& each : last)
        each.get();
    EXPECT_EQ(transactions, 3);
    EXPECT_EQ(rows(), 12);
}

TEST_F(JournalWriter, SaysSinceWhenItHasBeenAtATransaction) {
    Gate gate;
    Writer writer(database);
    EXPECT_FALSE(writer.busySince());
    const auto before = std::chrono::steady_clock::now();
    auto done = writer.submit([&gate](Database&) { gate.pass(); });
    ASSERT_TRUE(gate.awaitArrival());
    const auto since = writer.busySince();
    ASSERT_TRUE(since);
    EXPECT_GE(*since, before);
    EXPECT_LE(*since, std::chrono::steady_clock::now());
    gate.open();
    done.get();
    EXPECT_TRUE(eventually([&writer] { return !writer.busySince(); }));
}

TEST_F(JournalWriter, WhatMayWaitLongGoesWithWhatMayNot) {
    Gate written;
    Writer writer(database);
    writer.submitLater(inserting(1), std::chrono::hours(1));
    writer.submitLater([&written](Database&) { written.pass(); }, std::chrono::milliseconds(1));
    ASSERT_TRUE(written.awaitArrival());
    written.open();
    writer.submitLater(inserting(2), std::chrono::hours(1));
    writer.submit([](Database&) {}).get();
    EXPECT_EQ(writer.transactions(), 2U);
    EXPECT_EQ(rows(), 2);
}

TEST_F(JournalWriter, TellsOfACommitBeforeWhoeverWaitsForIt) {
    std::string told;
    Writer writer(database, nullptr,
                  {[&told] { told += "begins "; },
                   [this, &told](Database&) { told += std::to_string(rows()) + " rows "; }});
    writer.submit(inserting(1)).get();
    EXPECT_EQ(told, "begins 1 rows ");
    EXPECT_THROW(writer.submit([](Database& written) { written.run("nonsense"); }).get(),
                 host::DatabaseError);
    EXPECT_EQ(told, "begins 1 rows begins 1 rows ") << "the others of a transaction count";
}

TEST_F(JournalWriter, DoesWhatIsRegularAgainAndAgainThoughNobodyComes) {
    Gate second;
    int times = 0;
    Writer writer(database, nullptr,
                  {{},
                   {},
                   [&](Database&) {
                       if (++times == 2) second.pass();
                   },
                   std::chrono::milliseconds(1)});
    ASSERT_TRUE(second.awaitArrival());
    second.open();
}

TEST_F(JournalWriter, AWatchThatFailsTakesNothingBack) {
    Writer writer(database, nullptr, {{}, [](Database& written) { written.run("nonsense"); }});
    EXPECT_NO_THROW(writer.submit(inserting(1)).get());
    EXPECT_EQ(rows(), 1);
}

TEST_F(JournalWriter, OneThatFailsLeavesTheOthersAlone) {
    Gate gate;
    Writer writer(database);
    auto first = writer.submit([&gate](Database&) { gate.pass(); });
    ASSERT_TRUE(gate.awaitArrival());
    auto good = writer.submit(inserting(1));
    auto twice = writer.submit([](Database& written) {
        written.change("INSERT INTO t VALUES (2)");
        written.change("INSERT INTO t VALUES (1)");
    });
    auto better = writer.submit(inserting(3));
    gate.open();
    first.get();
    good.get();
    EXPECT_THROW(twice.get(), host::DatabaseError);
    better.get();
    EXPECT_EQ(rows(), 2) << "the failed one left nothing";
}

TEST_F(JournalWriter, MeasuresTransactionsAndCountsThoseThatFail) {
    Writer writer(database);
    writer.submit(inserting(1)).get();
    writer.submit(inserting(2)).get();
    EXPECT_EQ(writer.commitTimes().snapshot().count, 2U);
    EXPECT_GT(writer.commitTimes().snapshot().sum, std::chrono::nanoseconds(0));
    EXPECT_EQ(writer.failures().value(), 0U);
    const auto endingAll = [](Database& written) { written.run("ROLLBACK"); };
    EXPECT_THROW(writer.submit(endingAll).get(), host::DatabaseError);
    EXPECT_EQ(writer.commitTimes().snapshot().count, 2U);
    EXPECT_EQ(writer.failures().value(), 1U);
}

TEST_F(JournalWriter, WhatCanWaitGoesWithTheNextThatCannot) {
    Writer writer(database);
    writer.submitLater(inserting(1), std::chrono::hours(1));
    writer.submit(inserting(2)).get();
    EXPECT_EQ(writer.transactions(), 1U);
    EXPECT_EQ(rows(), 2);
}

TEST_F(JournalWriter, WhatCanWaitIsWrittenWhenSomebodyAsks) {
    Writer writer(database);
    writer.submitLater(inserting(1));
    writer.flush();
    EXPECT_EQ(rows(), 1);
    writer.flush();
    EXPECT_EQ(writer.transactions(), 1U);
}

TEST_F(JournalWriter, AFlushWaitsForWhatIsBeingWritten) {
    Gate gate;
    Writer writer(database);
    writer.submitLater(
        [&gate, this](Database& written) {
            gate.pass();
            inserting(1)(written);
        },
        std::chrono::milliseconds(0));
    ASSERT_TRUE(gate.awaitArrival());
    auto flushed = std::async(std::launch::async, [&writer] { writer.flush(); });
    EXPECT_EQ(flushed.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
    gate.open();
    flushed.get();
    EXPECT_EQ(rows(), 1);
}

TEST_F(JournalWriter, WhatCanWaitIsWrittenByTheEnd) {
    { Writer(database).submitLater(inserting(1)); }
    EXPECT_EQ(rows(), 1);
}

TEST_F(JournalWriter, AChangeThatMakesNoSenseIsNotTriedAgain) {
    Writer writer(database);
    int tries = 0;
    writer.submitLater([&tries](Database&) {
        ++tries;
        throw std::logic_error("no sense");
    });
    writer.flush();
    writer.submit(inserting(1)).get();
    EXPECT_EQ(tries, 1);
}

TEST_F(JournalWriter, TheLogOfChangesIsCutByTheEnd) {
    {
        database.run("PRAGMA journal_mode = WAL");
        Writer writer(database);
        writer.submit(inserting(1)).get();
        EXPECT_NE(scratch.read("db-wal"), "");
        writer.wipeSoon();
    }
    EXPECT_EQ(scratch.read("db-wal"), "");
}

}  // namespace
