// ctest-label: threaded
#include "host/outcomes/task_watch.h"

#include <gtest/gtest.h>

#include <atomic>
#include <optional>
#include <thread>

#include "host/made_up_table.h"
#include "support/program.h"

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
        tables = oxa::tables();
        watch.emplace(tables);
    }

    const oxa::Table& requestTable() { return tables.at(0); }
    /// A request that was answered with one row.
    void answer(const std::string& row) {
        TaskWatch::Request request(*watch, requestTable());
        request.answered({row, static_cast<unsigned>(row.size())});
    }
    void publish(const std::string& transid) { outcomes.publish(taskRow(transid, "START", 0)); }

    MadeUpTable requests{"KAGREQT", taskColumns()};
    MadeUpTable outcomes{"KAGDYST", taskColumns()};
    std::vector<oxa::Table> tables;
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
        TaskWatch::Request request(*watch, tables.at(1));
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

TEST_F(Watch, HoldsTheExecutorAfterTheTaskInHandWhenAllOthersHaveItsOutcome) {
    answer(taskRow("t1", "START", 0));
    answer(taskRow("t2", "START", 0));
    std::atomic<int> seen{0};
    const auto subscriber = oxa::subscribe("KAGDYST", {}, [&](const oxa::Rows&) {
        ++seen;
        return static_cast<int>(OXA_OK);
    });
    watch->holdAfterTask();
    EXPECT_FALSE(watch->quiet());
    std::atomic<bool> next{false};
    std::thread executor([&] {
        publish("t1");
        next = true;
        publish("t2");
    });
    EXPECT_TRUE(eventually([&] { return watch->quiet(); }));
    EXPECT_EQ(1, seen);
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    EXPECT_FALSE(next) << "the second task would have begun";
    watch.reset();
    executor.join();
    EXPECT_EQ(2, seen);
}

TEST_F(Watch, WithoutATaskInHandTheEndIsNear) {
    watch->holdAfterTask();
    EXPECT_TRUE(watch->quiet());
}

TEST(WatchWithoutTables, IsQuiet) {
    TaskWatch watch({});
    watch.holdAfterTask();
    EXPECT_TRUE(watch.quiet());
}

}  // namespace
