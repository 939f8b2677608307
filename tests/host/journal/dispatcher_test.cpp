// ctest-label: threaded
#include "host/journal/dispatcher.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <unistd.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <future>
#include <thread>

#include "host/made_up_table.h"
#include "support/gate.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

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
            EXPECT_EQ(journal.cancel(task.number), host::Journal::Cancel::Ended);
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

TEST_F(Dispatching, TheOutcomeOfOneTaskRecordsTheHandOverOfTheNext) {
    constexpr unsigned kTasks = 20;
    Task last;
    for (unsigned i = 0; i < kTasks; ++i)
        last = enter("t" + std::to_string(i));
    const std::uint64_t before = journal.transactions();
    Dispatcher dispatcher(journal, *list, [this](const Task& task) {
        accept(task);
        EXPECT_EQ(journal.byNumber(task.number)->run, journal.run());
        outcomes.publish(row(task.transid));
        return std::optional<Task>();
    });
    start(dispatcher);
    EXPECT_EQ(endOf(last), TaskState::Done);
    EXPECT_LE(journal.transactions() - before, kTasks * 13U / 10U) << "beside the acceptance";
}

TEST_F(Dispatching, ALoneTaskTakesThreeCommitsFromItsAcceptanceToItsOutcome) {
    constexpr unsigned kTasks = 8;
    Dispatcher dispatcher(journal, *list, [this](const Task& task) {
        accept(task);
        outcomes.publish(row(task.transid));
        return std::optional<Task>();
    });
    start(dispatcher);
    const std::uint64_t before = journal.transactions();
    for (unsigned i = 0; i < kTasks; ++i) {
        const Task task = enter("t" + std::to_string(i));
        dispatcher.wake();
        EXPECT_EQ(endOf(task), TaskState::Done);
    }
    // Now and then what can wait is written by itself.
    EXPECT_LE(journal.transactions() - before, kTasks * 3U + 6U);
}

/// What the plug-in got by a query: it waits in the plug-in's own queue.
class BesideAQuery : public Dispatching {
protected:
    void ask(const std::string& transid, const std::string& command) {
        const host::Query query{tables->find("KAGREQT"),
                                {{"TRANSID", OPER_EQ, transid},
                                 {"COMMAND", OPER_EQ, command},
                                 {"PRODUCT", OPER_EQ, "ux"}}};
        host::TaskList::Request request(*list, query, "somebody");
        const std::string reply = row(transid);
        host::Heard heard;
        heard.answer = 0;
        EXPECT_TRUE(request.answered({reply, static_cast<unsigned>(reply.size())}, heard));
    }
    Task enterFor(const std::string& product, const std::string& command = "STOP") {
        Task task;
        task.transid = product;
        task.way = host::TaskWay::Journal;
        task.conditions = {{"TRANSID", OPER_EQ, product},
                           {"COMMAND", OPER_EQ, command},
                           {"PRODUCT", OPER_EQ, product}};
        journal.enter(task);
        return task;
    }
};

TEST_F(BesideAQuery, ATaskWaitsForWhatMayChangeItsProduct) {
    ask("q1", "INSTALL");
    const Task task = enterFor("ux");
    std::atomic<bool> isInstalled{false};
    Dispatcher dispatcher(journal, *list, [&](const Task& next) {
        EXPECT_TRUE(isInstalled) << "the guards looked at it too early";
        return accept(next);
    });
    start(dispatcher);
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    EXPECT_EQ(journal.find(task.id)->state, TaskState::Queued);
    isInstalled = true;
    outcomes.publish(row("q1"));
    EXPECT_TRUE(eventually([&] { return journal.find(task.id)->state == TaskState::Running; }));
    outcomes.publish(row("ux"));
    EXPECT_EQ(endOf(task), TaskState::Done);
}

TEST_F(BesideAQuery, ATaskThatWaitsSoCanBeCancelled) {
    ask("q1", "INSTALL");
    const Task task = enterFor("ux");
    Dispatcher dispatcher(journal, *list, [&](const Task& next) { return accept(next); });
    start(dispatcher);
    EXPECT_TRUE(
        eventually([&] { return journal.cancel(task.number) == host::Journal::Cancel::Ended; }));
}

TEST_F(BesideAQuery, ATaskDoesNotWaitForOtherProductsOrForWhatChangesNothing) {
    ask("q1", "START");
    const Task task = enterFor("ux");
    std::atomic<int> accepted{0};
    Dispatcher dispatcher(journal, *list, [&](const Task& next) {
        accept(next);
        ++accepted;
        return std::optional<Task>();
    });
    start(dispatcher);
    EXPECT_TRUE(eventually([&] { return accepted == 1; }));
    outcomes.publish(row("q1"));
    outcomes.publish(row("ux"));
    EXPECT_EQ(endOf(task), TaskState::Done);
    ask("q2", "INSTALL");
    const Task other = enterFor("lz");
    dispatcher.wake();
    EXPECT_TRUE(eventually([&] { return accepted == 2; }));
}

TEST_F(Dispatching, OneThatIsTooLateIsNotHandedOverWithTheOutcomeBefore) {
    const Task first = enter("t1");
    Task late;
    late.transid = "t2";
    late.way = host::TaskWay::Journal;
    late.conditions = {{"TRANSID", OPER_EQ, "t2"}, {"COMMAND", OPER_EQ, "START"}};
    late.expires = host::WallClock::now() - std::chrono::hours(1);
    journal.enter(late);
    Dispatcher dispatcher(journal, *list, [this](const Task& task) {
        accept(task);
        outcomes.publish(row(task.transid));
        return std::optional<Task>();
    });
    start(dispatcher);
    EXPECT_EQ(endOf(late), TaskState::Expired);
    EXPECT_EQ(journal.find(first.id)->state, TaskState::Done);
    EXPECT_THAT(handedOver, ElementsAre("t1"));
}

TEST_F(Dispatching, OneThatExpiresWhileTheGuardsLookAtItIsNotHandedOver) {
    const Task late = enter("t1");
    const Task second = enter("t2");
    Dispatcher dispatcher(journal, *list, [&](const Task& task) {
        if (task.id == late.id) throw host::TooLate("it took too long");
        accept(task);
        outcomes.publish(row(task.transid));
        return std::optional<Task>();
    });
    start(dispatcher);
    EXPECT_EQ(endOf(late), TaskState::Expired);
    EXPECT_EQ(endOf(second), TaskState::Done);
    EXPECT_THAT(handedOver, ElementsAre("t2"));
}

TEST_F(Dispatching, WhatIsToBeDoneAloneIsDoneWhenNothingLivesAndNothingHasBegun) {
    enter("t1");
    const std::string mark = "nobodys-0-" + std::to_string(::getsid(0));
    Program left({"/bin/sh", "-c", "echo begun; exec sleep 60"}, "", {{"ZAVHOST_RUN", mark}});
    ASSERT_TRUE(left.awaitOutput("begun", std::chrono::seconds(20)));
    Gate alone;
    Dispatcher dispatcher(journal, *list, [this](const Task& task) { return accept(task); });
    dispatcher.start(leftovers, std::chrono::seconds(0), [&] {
        alone.pass();
        throw std::runtime_error("and what it throws is printed");
    });
    ASSERT_TRUE(alone.awaitArrival());
    EXPECT_EQ(left.wait().status, 128 + SIGKILL);
    EXPECT_EQ(journal.waiting(), 1);
    alone.open();
    EXPECT_TRUE(eventually([this] { return journal.waiting() == 0; }));
}

/// With an install that had begun when the last run ended.
class DispatchingAfterInstall : public Dispatching {
protected:
    DispatchingAfterInstall() {
        {
            host::Journal before{host::Journal::Settings{scratch.path("state")}};
            Task task;
            task.transid = "install";
            task.way = host::TaskWay::Journal;
            before.enter(task);
            task.state = TaskState::Running;
            task.run = before.run();
            task.begun = true;
            before.save(task);
            Task next;
            next.transid = "t1";
            next.way = host::TaskWay::Journal;
            next.conditions = {{"TRANSID", OPER_EQ, "t1"}, {"COMMAND", OPER_EQ, "START"}};
            before.enter(next);
        }
        kept.emplace(host::Journal::Settings{scratch.path("state")});
        keptFeed.emplace(*tables);
        keptList.emplace(*tables, *keptFeed, *kept, true);
    }
    static Task endedAs(Task task, TaskState state) {
        task.state = state;
        task.ended = host::WallClock::now();
        return task;
    }

    ScratchDir scratch;
    std::optional<host::Journal> kept;
    std::optional<host::OutcomeFeed> keptFeed;
    std::optional<host::TaskList> keptList;
};

TEST_F(DispatchingAfterInstall, NothingBeginsBeforeItIsOver) {
    int tries = 0;
    Gate handingOver;
    std::optional<TaskState> stateThen;
    Dispatcher dispatcher(
        *kept, *keptList,
        [&](const Task& task) {
            EXPECT_EQ(task.transid, "t1");
            stateThen = kept->find("install")->state;
            handingOver.pass();
            return std::optional<Task>(endedAs(task, TaskState::Refused));
        },
        [&](Task task) {
            EXPECT_EQ(task.transid, "install");
            if (++tries == 1) throw host::QueryFailed("not yet", false);
            return endedAs(std::move(task), TaskState::Failed);
        });
    EXPECT_TRUE(dispatcher.awaitsInstall());
    start(dispatcher);
    ASSERT_TRUE(handingOver.awaitArrival());
    EXPECT_FALSE(dispatcher.awaitsInstall());
    handingOver.open();
    EXPECT_EQ(stateThen, TaskState::Failed);
    EXPECT_EQ(tries, 2);
}

TEST_F(DispatchingAfterInstall, WhatIsLeftOfACancelledOneGetsTheSignalToEnd) {
    const Task task = *kept->find("install");
    EXPECT_EQ(kept->cancel(task.number), host::Journal::Cancel::Asked);
    const std::string mark = kept->identity() + "-1-" + std::to_string(::getsid(0));
    Program left({"/bin/sh", "-c", "echo begun; exec sleep 60"}, "", {{"ZAVHOST_RUN", mark}});
    ASSERT_TRUE(left.awaitOutput("begun", std::chrono::seconds(20)));
    const host::Leftovers found(kept->identity(), kept->run());
    Gate completing;
    Dispatcher dispatcher(
        *kept, *keptList,
        [](const Task& waiting) {
            return std::optional<Task>(endedAs(waiting, TaskState::Refused));
        },
        [&](Task install) {
            EXPECT_TRUE(install.cancel);
            completing.pass();
            return endedAs(std::move(install), TaskState::Cancelled);
        });
    dispatcher.start(found, std::chrono::hours(1));
    ASSERT_TRUE(completing.awaitArrival());
    EXPECT_EQ(left.wait().status, 128 + SIGTERM);
    completing.open();
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
