// ctest-label: threaded
#include "host/journal/dispatcher.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>

#include "host/made_up_table.h"
#include "support/gate.h"
#include "support/host/program.h"

namespace {

using host::Dispatcher;
using host::Task;
using host::TaskState;
using testing::ElementsAre;

std::vector<ColumnInfo> taskColumns() {
    return {{"transid", 0, 8, OXA_TYPE_CHARACTER},
            {"command", 8, 16, OXA_TYPE_CHARACTER},
            {"retval", 24, 4, OXA_TYPE_INTEGER}};
}

std::string row(const std::string& transid) {
    return RowBuilder().text(transid, 8).text("START", 16).integer(0);
}

/// A dispatcher whose plug-in is the test.
class Dispatching : public testing::Test {
protected:
    Dispatching() {
        requests.RegisterWithManager();
        outcomes.RegisterWithManager();
        tables.emplace(oxa::tables());
        feed.emplace(*tables);
        list.emplace(*tables, *feed, journal, true);
    }

    Task enter(const std::string& transid) {
        Task task;
        task.transid = transid;
        task.way = host::TaskWay::Journal;
        task.conditions = {{"TRANSID", OPER_EQ, transid}, {"COMMAND", OPER_EQ, "START"}};
        journal.enter(task);
        return task;
    }
    /// Gives the task to the plug-in, which accepts it.
    std::optional<Task> accept(const Task& task) {
        host::TaskList::Request request(*list, task);
        const std::string reply = row(task.transid);
        handedOver.push_back(task.transid);
        host::Heard heard;
        heard.answer = 0;
        EXPECT_TRUE(request.answered({reply, static_cast<unsigned>(reply.size())}, heard));
        return std::nullopt;
    }
    /// Waits for the end of the task.
    TaskState endOf(const Task& task) {
        std::promise<TaskState> over;
        list->awaitEnd(task.id, [&over](const Task& ended) { over.set_value(ended.state); });
        return over.get_future().get();
    }
    void start(Dispatcher& dispatcher) { dispatcher.start(leftovers, std::chrono::seconds(1)); }

    MadeUpTable requests{"KAGREQT", taskColumns()};
    MadeUpTable outcomes{"KAGDYST", taskColumns()};
    std::optional<host::TableSet> tables;
    std::optional<host::OutcomeFeed> feed;
    host::Journal journal{host::Journal::Settings{}};
    const host::Leftovers leftovers{"nobodys", 1};
    std::optional<host::TaskList> list;
    std::vector<std::string> handedOver;
};

TEST_F(Dispatching, TheNextTaskComesWhenTheOneBeforeIsOver) {
    const Task first = enter("t1");
    const Task second = enter("t2");
    Gate accepted;
    std::vector<TaskState> stateOfFirst;
    Dispatcher dispatcher(journal, *list, [&](const Task& task) {
        stateOfFirst.push_back(journal.find(first.id)->state);
        accept(task);
        if (task.id == first.id) accepted.pass();
        return std::optional<Task>();
    });
    start(dispatcher);
    ASSERT_TRUE(accepted.awaitArrival());
    EXPECT_EQ(journal.find(second.id)->state, TaskState::Queued);
    accepted.open();
    outcomes.publish(row("t1"));
    EXPECT_EQ(endOf(first), TaskState::Done);
    EXPECT_TRUE(eventually([&] { return journal.find(second.id)->state == TaskState::Running; }));
    outcomes.publish(row("t2"));
    EXPECT_EQ(endOf(second), TaskState::Done);
    EXPECT_THAT(handedOver, ElementsAre("t1", "t2"));
    EXPECT_THAT(stateOfFirst, ElementsAre(TaskState::Queued, TaskState::Done));
}

TEST_F(Dispatching, OneThatIsEnteredLaterWakesTheDispatcher) {
    Dispatcher dispatcher(journal, *list, [this](const Task& task) {
        accept(task);
        outcomes.publish(row(task.transid));
        return std::optional<Task>();
    });
    start(dispatcher);
    for (const char* transid : {"t1", "t2"}) {
        const Task task = enter(transid);
        dispatcher.wake();
        EXPECT_EQ(endOf(task), TaskState::Done);
    }
}

TEST_F(Dispatching, OneThatThePluginDoesNotGetEndsAsItIsTold) {
    const Task first = enter("t1");
    Dispatcher dispatcher(journal, *list, [](const Task& task) {
        Task ended = task;
        ended.state = TaskState::Refused;
        ended.ended = host::WallClock::now();
        ended.guard = "product";
        return std::optional<Task>(ended);
    });
    start(dispatcher);
    EXPECT_EQ(endOf(first), TaskState::Refused);
    EXPECT_EQ(journal.find(first.id)->guard, "product");
}

TEST_F(Dispatching, WhatCannotBeKeptIsTriedAgain) {
    const Task first = enter("t1");
    int tries = 0;
    Dispatcher dispatcher(journal, *list, [&](const Task& task) {
        if (++tries == 1) throw host::NotKept("the disk is full");
        accept(task);
        outcomes.publish(row(task.transid));
        return std::optional<Task>();
    });
    start(dispatcher);
    EXPECT_EQ(endOf(first), TaskState::Done);
    EXPECT_EQ(tries, 2);
}

TEST_F(Dispatching, ACancelledTaskIsPassedOver) {
    const Task first = enter("t1");
    const Task second = enter("t2");
    Dispatcher dispatcher(journal, *list, [&](const Task& task) {
        // Somebody cancels it after it was chosen and before it is handed over.
        if (task.id == first.id) {
            EXPECT_TRUE(journal.cancel(task.number));
        }
        accept(task);
        outcomes.publish(row(task.transid));
        return std::optional<Task>();
    });
    start(dispatcher);
    EXPECT_EQ(endOf(second), TaskState::Done);
    EXPECT_EQ(journal.find(first.id)->state, TaskState::Cancelled);
    EXPECT_THAT(handedOver, ElementsAre("t2"));
}

TEST_F(Dispatching, NothingIsHandedOverAfterTheStop) {
    Dispatcher dispatcher(journal, *list, [this](const Task& task) { return accept(task); });
    dispatcher.stop();
    enter("t1");
    start(dispatcher);
    dispatcher.wake();
    EXPECT_EQ(journal.waiting(), 1);
}

}  // namespace
