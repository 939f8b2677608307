// ctest-label: threaded
#include "host/outcomes/task_watch.h"

#include <gtest/gtest.h>

#include <optional>
#include <thread>

#include "host/made_up_table.h"
#include "support/host/program.h"

namespace {

using host::TaskWatch;

std::vector<ColumnInfo> taskColumns() {
    return {{"transid", 0, 8, OXA_TYPE_CHARACTER},
            {"command", 8, 16, OXA_TYPE_CHARACTER},
            {"retval", 24, 4, OXA_TYPE_INTEGER}};
}

std::string taskRow(const std::string& transid, const std::string& command, int retval) {
    return RowBuilder().text(transid, 8).text(command, 16).integer(retval);
}

class Watch : public testing::Test {
protected:
    Watch() {
        requests.RegisterWithManager();
        outcomes.RegisterWithManager();
        tables.emplace(oxa::tables());
        feed.emplace(*tables);
        watch.emplace(*tables, *feed);
    }

    const oxa::Table& requestTable() { return *tables->find("KAGREQT"); }
    /// A request that was answered with one row.
    void answer(const std::string& row) {
        TaskWatch::Request request(*watch, requestTable());
        request.answered({row, static_cast<unsigned>(row.size())});
    }
    void publish(const std::string& transid) { outcomes.publish(taskRow(transid, "START", 0)); }

    MadeUpTable requests{"KAGREQT", taskColumns()};
    MadeUpTable outcomes{"KAGDYST", taskColumns()};
    std::optional<host::TableSet> tables;
    std::optional<host::OutcomeFeed> feed;
    std::optional<TaskWatch> watch;
};

TEST_F(Watch, IsQuietAtFirstAndBusyWhileARequestRuns) {
    EXPECT_TRUE(watch->quiet());
    {
        TaskWatch::Request request(*watch, requestTable());
        EXPECT_FALSE(watch->quiet());
    }
    EXPECT_TRUE(watch->quiet());
}

TEST_F(Watch, CountsAnAcceptedTaskUntilItsOutcome) {
    answer(taskRow("t1", "START", 0));
    EXPECT_FALSE(watch->quiet());
    publish("other");
    EXPECT_FALSE(watch->quiet());
    publish("t1");
    EXPECT_TRUE(watch->quiet());
}

TEST_F(Watch, TasksWithTheSameTransactionCountEach) {
    answer(taskRow("t1", "STOP", 0));
    answer(taskRow("t1", "START", 0));
    publish("t1");
    EXPECT_FALSE(watch->quiet());
    publish("t1");
    EXPECT_TRUE(watch->quiet());
}

TEST_F(Watch, RefusedTasksAndThoseThatRanAtOnceDoNotCount) {
    answer(taskRow("t1", "START", 1003));
    answer(taskRow("t2", "GETCONFIG", 0));
    answer(taskRow("t3", "COMPLETE_INSTALL", 0));
    EXPECT_TRUE(watch->quiet());
}

TEST_F(Watch, RowsOfOtherTablesDoNotCount) {
    const std::string row = taskRow("t1", "START", 0);
    {
        TaskWatch::Request request(*watch, *tables->find("KAGDYST"));
        request.answered({row, static_cast<unsigned>(row.size())});
    }
    EXPECT_TRUE(watch->quiet());
}

TEST_F(Watch, AnOutcomeThatComesBeforeTheReplyIsItsOwn) {
    {
        TaskWatch::Request request(*watch, requestTable());
        publish("t1");
        const std::string row = taskRow("t1", "START", 0);
        request.answered({row, static_cast<unsigned>(row.size())});
    }
    EXPECT_TRUE(watch->quiet());
}

TEST_F(Watch, AForeignOutcomeDoesNotHideALaterTask) {
    {
        TaskWatch::Request request(*watch, requestTable());
        publish("t1");
    }
    answer(taskRow("t1", "START", 0));
    EXPECT_FALSE(watch->quiet());
}

TEST_F(Watch, IsQuietWhileTheExecutorIsHeldWhateverIsQueued) {
    answer(taskRow("t1", "START", 0));
    answer(taskRow("t2", "START", 0));
    feed->holdAfterOutcome();
    EXPECT_FALSE(watch->quiet()) << "the first task is in hand";
    std::thread executor([&] { publish("t1"); });
    EXPECT_TRUE(eventually([&] { return watch->quiet(); }));
    TaskWatch::Request request(*watch, requestTable());
    EXPECT_FALSE(watch->quiet()) << "a query still runs";
    feed->release();
    executor.join();
}

TEST_F(Watch, WithoutATaskInHandIsQuietAtOnce) {
    feed->holdAfterOutcome();
    EXPECT_TRUE(watch->quiet());
}

TEST(WatchWithoutTables, IsQuiet) {
    const host::TableSet none({});
    host::OutcomeFeed feed(none);
    TaskWatch watch(none, feed);
    feed.holdAfterOutcome();
    EXPECT_TRUE(watch.quiet());
}

TEST(WatchWithoutColumns, CountsNothing) {
    MadeUpTable requests("KAGREQT", {{"transid", 0, 8, OXA_TYPE_CHARACTER}});
    MadeUpTable outcomes("KAGDYST", {{"transid", 0, 8, OXA_TYPE_CHARACTER}});
    requests.RegisterWithManager();
    outcomes.RegisterWithManager();
    const host::TableSet tables(oxa::tables());
    host::OutcomeFeed feed(tables);
    TaskWatch watch(tables, feed);
    {
        TaskWatch::Request request(watch, *tables.find("KAGREQT"));
        request.answered({std::string(8, 'x'), 8});
    }
    outcomes.publish(std::string(8, 'x'));
    EXPECT_TRUE(watch.quiet());
}

}  // namespace
