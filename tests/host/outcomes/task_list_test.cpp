// ctest-label: threaded
#include "host/outcomes/task_list.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <optional>
#include <thread>

#include "host/commands/ear.h"
#include "host/journal/journal.h"
#include "host/made_up_table.h"
#include "support/full_disk.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"
#include "util/zavutil.h"

namespace {

using host::Heard;
using host::Task;
using host::TaskList;
using host::TaskState;
using testing::ElementsAre;

std::vector<ColumnInfo> taskColumns() {
    return {{"transid", 0, 8, OXA_TYPE_CHARACTER},
            {"command", 8, 16, OXA_TYPE_CHARACTER},
            {"context", 24, 8, OXA_TYPE_CHARACTER},
            {"retval", 32, 4, OXA_TYPE_INTEGER}};
}

std::string taskRow(const std::string& transid, const std::string& command, int retval,
                    const std::string& context = "") {
    return RowBuilder().text(transid, 8).text(command, 16).text(context, 8).integer(retval);
}

/// What the plug-in says of itself when it answers.
Heard answering(int retval) {
    Heard heard;
    heard.answer = retval;
    return heard;
}

class Tasks : public testing::Test {
protected:
    explicit Tasks(bool guarded = true) {
        requests.RegisterWithManager();
        outcomes.RegisterWithManager();
        tables.emplace(oxa::tables());
        feed.emplace(*tables);
        list.emplace(*tables, *feed, journal, guarded);
        host::hearCommands();
    }

    host::Query query(const std::string& transid, const std::string& command,
                      std::vector<oxa::Predicate> more = {}) const {
        host::Query made{tables->find("KAGREQT"),
                         {{"TRANSID", OPER_EQ, transid}, {"COMMAND", OPER_EQ, command}}};
        made.where.insert(made.where.end(), more.begin(), more.end());
        return made;
    }
    static oxa::Rows rows(const std::string& row) {
        return {row, static_cast<unsigned>(row.size())};
    }
    /// A request that is answered with this RETVAL.
    void ask(const std::string& transid, const std::string& command = "START", int retval = 0,
             const std::vector<oxa::Predicate>& more = {}) {
        TaskList::Request request(*list, query(transid, command, more), "somebody");
        request.answered(rows(taskRow(transid, command, retval)), answering(retval));
    }
    void publish(const std::string& transid, int retval = 0) {
        outcomes.publish(taskRow(transid, "START", retval));
    }
    TaskState stateOf(const std::string& transid) const {
        const std::optional<Task> task = list->find(transid);
        EXPECT_TRUE(task.has_value()) << transid;
        return task ? task->state : TaskState::Queued;
    }
    std::vector<std::string> transids(const TaskList::Filter& filter = {}) const {
        std::vector<std::string> found;
        for (const Task& task : list->newest(filter))
            found.emplace_back(task.value("TRANSID"));
        return found;
    }

    MadeUpTable requests{"KAGREQT", taskColumns()};
    MadeUpTable outcomes{"KAGDYST", taskColumns()};
    std::optional<host::TableSet> tables;
    std::optional<host::OutcomeFeed> feed;
    host::Journal journal{host::Journal::Settings{}};
    std::optional<TaskList> list;
};

TEST_F(Tasks, TheOldestRunsAndTheOthersWait) {
    ask("t1");
    ask("t2");
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    EXPECT_EQ(stateOf("t2"), TaskState::Queued);
    publish("t1");
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
    EXPECT_EQ(stateOf("t2"), TaskState::Running);
    publish("t2", 1024);
    EXPECT_EQ(stateOf("t2"), TaskState::Failed);
}

TEST_F(Tasks, AProductMayChangeFromTheReplyToTheOutcomeOfAnInstall) {
    EXPECT_FALSE(list->mayChange("ux"));
    {
        const TaskList::Request asked(*list, query("t0", "INSTALL", {{"PRODUCT", OPER_EQ, "ux"}}),
                                      "somebody");
        EXPECT_FALSE(list->mayChange("ux")) << "nobody has accepted it";
    }
    ask("t1", "INSTALL", 0, {{"PRODUCT", OPER_EQ, "ux"}});
    ask("t2", "INSTALL", 1003, {{"PRODUCT", OPER_EQ, "um"}});
    EXPECT_TRUE(list->mayChange("ux"));
    EXPECT_TRUE(list->mayChange("UX"));
    EXPECT_FALSE(list->mayChange("um")) << "refused";
    EXPECT_FALSE(list->mayChange(""));
    publish("t1", 1024);
    EXPECT_FALSE(list->mayChange("ux"));
    for (const char* command : {"START", "STOP", "RESTART"}) {
        ask(command, command, 0, {{"PRODUCT", OPER_EQ, "ux"}});
        EXPECT_FALSE(list->mayChange("ux")) << command;
    }
}

TEST_F(Tasks, AProductMayChangeUntilTheSecondOutcomeOfAnInstallThatRestarts) {
    ask("t1", "INSTALL", 0,
        {{"PRODUCT", OPER_EQ, "ux"}, {"OPTIONAL", OPER_EQ, "REQUIRES_RESTART"}});
    publish("t1");
    EXPECT_TRUE(list->mayChange("ux"));
    publish("t1");
    EXPECT_FALSE(list->mayChange("ux"));
}

TEST_F(Tasks, KnowWhoAskedForWhatAndWhen) {
    const auto before = host::WallClock::now();
    ask("t1", "STOP", 0, {{"PRODUCT", OPER_EQ, "lz"}, {"PRODUCT", OPER_EQ, "ux"}});
    publish("t1");
    const std::optional<Task> task = list->find("t1");
    ASSERT_TRUE(task.has_value());
    EXPECT_EQ(task->asker, "somebody");
    EXPECT_EQ(task->value("COMMAND"), "STOP");
    EXPECT_EQ(task->value("PRODUCT"), "ux") << "the plug-in takes the last value";
    EXPECT_EQ(task->value("VERSION"), "");
    ASSERT_TRUE(task->started && task->ended);
    EXPECT_LE(before, task->accepted);
    EXPECT_LE(task->accepted, *task->started);
    EXPECT_LE(*task->started, *task->ended);
    EXPECT_LE(*task->ended, host::WallClock::now());
    EXPECT_EQ(task->reply, taskRow("t1", "STOP", 0));
    EXPECT_THAT(task->outcomes, ElementsAre(taskRow("t1", "START", 0)));
}

TEST_F(Tasks, AreFoundByIdentifierAndTheNewestByItsTransaction) {
    ask("same");
    const std::string first = list->find("same")->id;
    ask("same");
    const std::string second = list->find("same")->id;
    EXPECT_NE(first, second);
    EXPECT_EQ(list->find(first)->state, TaskState::Running);
    EXPECT_EQ(list->find(second)->state, TaskState::Queued);
    publish("same");
    EXPECT_EQ(list->find(first)->state, TaskState::Done);
    EXPECT_EQ(list->find(second)->state, TaskState::Running);
    EXPECT_FALSE(list->find("other").has_value());
}

TEST_F(Tasks, ARefusedRequestIsOverAtOnceAndHoldsNobodyUp) {
    ask("t1", "NOSUCH", 1003);
    ask("t2");
    EXPECT_EQ(stateOf("t1"), TaskState::Refused);
    EXPECT_EQ(list->find("t1")->started, std::nullopt);
    EXPECT_EQ(stateOf("t2"), TaskState::Running);
}

TEST_F(Tasks, OneThatRunsAtOnceIsOverWithItsAnswer) {
    ask("t1");
    ask("t2", "GETCONFIG");
    ask("t3", "COMPLETE_INSTALL", 1010);
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    EXPECT_EQ(stateOf("t2"), TaskState::Done);
    EXPECT_EQ(stateOf("t3"), TaskState::Failed);
}

TEST_F(Tasks, AnOutcomeThatComesBeforeTheReplyIsItsOwn) {
    {
        TaskList::Request request(*list, query("t1", "START"), "somebody");
        publish("t1", 1024);
        EXPECT_FALSE(list->find("t1").has_value()) << "nobody knows yet that it was accepted";
        request.answered(rows(taskRow("t1", "START", 0)), answering(0));
    }
    EXPECT_EQ(stateOf("t1"), TaskState::Failed);
    const std::optional<Task> task = list->find("t1");
    EXPECT_LE(task->accepted, *task->ended);
}

TEST_F(Tasks, AnOutcomeIsNotThatOfARequestWhichRunsAtOnce) {
    ask("t1");
    TaskList::Request request(*list, query("t1", "GETCONFIG"), "somebody");
    publish("t1");
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
    EXPECT_EQ(list->find("t1")->value("COMMAND"), "START");
}

TEST_F(Tasks, ARequestWhoseConditionsHideItsReplyIsATask) {
    {
        TaskList::Request request(*list, query("t1", "START"), "somebody");
        request.answered({}, answering(0));
    }
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    EXPECT_EQ(list->find("t1")->reply, "");
    publish("t1");
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
}

TEST_F(Tasks, ARequestWithoutAnswerIsNone) {
    { const TaskList::Request request(*list, query("t1", "START"), "somebody"); }
    {
        TaskList::Request request(*list, query("t2", "START"), "somebody");
        request.answered({}, {});
    }
    EXPECT_THAT(transids(), ElementsAre());
    publish("t1");
    EXPECT_FALSE(list->find("t1").has_value());
}

TEST_F(Tasks, QueriesOnOtherTablesAreNone) {
    {
        TaskList::Request request(*list, {tables->find("KAGDYST"), {}}, "somebody");
        request.answered(rows(taskRow("t1", "START", 0)), {});
    }
    EXPECT_THAT(transids(), ElementsAre());
}

TEST_F(Tasks, AnInstallWithARestartIsOverWithItsSecondOutcome) {
    ask("t1", "INSTALL", 0, {{"OPTIONAL", OPER_EQ, "REQUIRES_RESTART"}});
    publish("t1");
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    publish("t1", 1010);
    EXPECT_EQ(stateOf("t1"), TaskState::Failed);
    EXPECT_EQ(list->find("t1")->outcomes.size(), 2U);
    ask("t2", "INSTALL", 0, {{"OPTIONAL", OPER_EQ, "REQUIRES_RESTART"}});
    publish("t2", 1010);
    EXPECT_EQ(stateOf("t2"), TaskState::Failed) << "it did not begin";
}

TEST_F(Tasks, AConfigurationIsNotKept) {
    for (const char* command : {"SETCONFIG", "GETCONFIG"}) {
        TaskList::Request request(*list, query("t1", command, {{"CONTEXT", OPER_EQ, "secret"}}),
                                  "somebody");
        Heard heard = answering(0);
        heard.commands.emplace_back().out.append("secret");
        request.answered(rows(taskRow("t1", command, 0, "secret")), heard);
        if (std::string(command) == "SETCONFIG") publish("t1");
        const std::optional<Task> task = list->find("t1");
        EXPECT_EQ(task->reply, taskRow("t1", command, 0)) << command;
        for (const host::Command& ran : task->commands)
            EXPECT_EQ(ran.out.text(), "") << command;
    }
    EXPECT_EQ(list->newest({{}, {}, "SETCONFIG"}).at(0).value("CONTEXT"), "");
    ask("t2", "INSTALL", 0, {{"CONTEXT", OPER_EQ, "./install.sh"}});
    EXPECT_EQ(list->find("t2")->value("CONTEXT"), "./install.sh");
}

TEST_F(Tasks, LongValuesAreCut) {
    ask("t1", "INSTALL", 0, {{"CONTEXT", OPER_EQ, std::string(100000, 'x')}});
    EXPECT_EQ(list->find("t1")->value("CONTEXT"), std::string(4096, 'x'));
}

TEST_F(Tasks, AreListedNewestFirstAsAskedFor) {
    ask("t1", "START", 0, {{"PRODUCT", OPER_EQ, "ux"}});
    ask("t2", "STOP", 0, {{"PRODUCT", OPER_EQ, "ux"}});
    ask("t3", "START", 0, {{"PRODUCT", OPER_EQ, "um"}});
    publish("t1");
    EXPECT_THAT(transids(), ElementsAre("t3", "t2", "t1"));
    EXPECT_THAT(transids({TaskState::Done}), ElementsAre("t1"));
    EXPECT_THAT(transids({{}, "ux"}), ElementsAre("t2", "t1"));
    EXPECT_THAT(transids({{}, {}, "START"}), ElementsAre("t3", "t1"));
    EXPECT_THAT(transids({{}, {}, {}, 2}), ElementsAre("t3", "t2"));
    EXPECT_THAT(transids({{}, {}, {}, 0}), ElementsAre());
}

TEST_F(Tasks, AnOutcomeIsKeptBeforeAnybodyElseSeesIt) {
    ask("t1");
    std::vector<TaskState> seen;
    const auto later = feed->subscribe({}, [&](const oxa::Rows&) {
        seen.push_back(journal.find("t1")->state);
        return static_cast<int>(OXA_OK);
    });
    publish("t1");
    EXPECT_THAT(seen, ElementsAre(TaskState::Done));
}

TEST_F(Tasks, WhileAnOutcomeCannotBeKeptTheExecutorWaitsAndTheTableIsFree) {
    ScratchDir scratch;
    host::Journal onDisk({scratch.path("state")});
    list.reset();
    list.emplace(*tables, *feed, onDisk, true);
    ask("t1");
    std::atomic<bool> seen{false};
    std::atomic<bool> next{false};
    const auto other = feed->subscribe({}, [&](const oxa::Rows&) {
        EXPECT_EQ(stateOf("t1"), TaskState::Done) << "it is kept before anybody else gets it";
        seen = true;
        return static_cast<int>(OXA_OK);
    });
    std::thread executor;
    {
        const FullDisk full;
        executor = std::thread([&] {
            publish("t1");
            next = true;
        });
        EXPECT_TRUE(eventually([&] { return !onDisk.trouble().empty(); }));
        EXPECT_EQ(outcomes.liveObjects(), 1U) << "which takes the table's lock";
        EXPECT_FALSE(seen);
        EXPECT_FALSE(next) << "the next task waits";
    }
    executor.join();
    EXPECT_TRUE(seen);
    EXPECT_EQ(onDisk.trouble(), "");
    list.reset();
}

TEST_F(Tasks, ARowThatBelongsToNoTaskHoldsNobodyUp) {
    publish("unknown");
    ask("t1");
    publish("t1");
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
}

TEST_F(Tasks, ThoseThatWereEnteredAreHandedOverLater) {
    Task task;
    task.transid = "t1";
    task.way = host::TaskWay::Journal;
    task.conditions = {{"TRANSID", OPER_EQ, "t1"}, {"COMMAND", OPER_EQ, "START"}};
    journal.enter(task);
    EXPECT_EQ(stateOf("t1"), TaskState::Queued);
    {
        TaskList::Request request(*list, *journal.nextInLine());
        request.answered(rows(taskRow("t1", "START", 0)), answering(0));
    }
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    EXPECT_EQ(journal.nextInLine(), std::nullopt);
    publish("t1");
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
}

TEST_F(Tasks, WhoWaitsHearsOfOneThatEndsWithoutHavingRun) {
    Task task;
    task.way = host::TaskWay::Journal;
    journal.enter(task);
    std::optional<TaskState> heard;
    list->awaitEnd(task.id, [&heard](const Task& over) { heard = over.state; });
    task.state = TaskState::Expired;
    task.ended = host::WallClock::now();
    list->end(task);
    EXPECT_EQ(heard, TaskState::Expired);
}

TEST_F(Tasks, WhoWaitsGetsTheTaskThatIsOver) {
    std::vector<std::string> heard;
    const auto note = [&heard](const Task& task) { heard.emplace_back(task.value("TRANSID")); };
    ask("t1");
    ask("t2");
    EXPECT_NE(list->awaitEnd(list->find("t1")->id, note), 0U);
    EXPECT_NE(list->awaitEnd(list->find("t2")->id, note), 0U);
    const std::uint64_t cancelled = list->awaitEnd(list->find("t2")->id, note);
    list->cancel(cancelled);
    EXPECT_THAT(heard, ElementsAre());
    publish("t1");
    EXPECT_THAT(heard, ElementsAre("t1"));
    EXPECT_EQ(list->awaitEnd(list->find("t1")->id, note), 0U);
    EXPECT_THAT(heard, ElementsAre("t1", "t1"));
    publish("t2");
    EXPECT_THAT(heard, ElementsAre("t1", "t1", "t2"));
}

/// Runs a command as a thread of the plug-in does.
void work(const std::string& command) {
    int rc = 0;
    ZAV::String out;
    ZAV::String err;
    ZAV::Util::runCommand(ZAV::String(command.c_str()), rc, out, err, ZAV::String(), false);
}

TEST_F(Tasks, GetTheCommandsThatTheExecutorRanForThem) {
    const ScratchDir scratch;
    const std::string first = scratch.script("first", "echo one");
    const std::string second = scratch.script("second", "exit 3");
    ask("t1");
    ask("t2");
    std::thread executor([&] {
        work(first);
        publish("t1");
        work(second);
        work(first);
        publish("t2", 1024);
    });
    executor.join();
    const std::vector<host::Command> ofFirst = list->find("t1")->commands;
    ASSERT_EQ(ofFirst.size(), 1U);
    EXPECT_EQ(ofFirst[0].line, first);
    EXPECT_EQ(ofFirst[0].out.text(), "one\n");
    const std::vector<host::Command> ofSecond = list->find("t2")->commands;
    ASSERT_EQ(ofSecond.size(), 2U);
    EXPECT_EQ(ofSecond[0].exit, 3);
    EXPECT_EQ(ofSecond[1].exit, 0);
}

TEST_F(Tasks, OneThatIsCancelledWhileItRunsKeepsItsRow) {
    const ScratchDir scratch;
    const std::string script =
        scratch.script("script", "echo >'" + scratch.path("begun") + "'\nexec sleep 60");
    ask("t1");
    std::thread executor([&] {
        work(script);
        publish("t1");
    });
    EXPECT_TRUE(eventually([&] { return scratch.exists("begun"); }));
    const std::int64_t number = list->find("t1")->number;
    EXPECT_EQ(journal.cancel(number), host::Journal::Cancel::Asked);
    list->endCommandsOf(number);
    executor.join();
    const std::optional<Task> task = list->find("t1");
    EXPECT_EQ(task->state, TaskState::Cancelled);
    EXPECT_NE(task->reason, "");
    EXPECT_THAT(task->outcomes, ElementsAre(taskRow("t1", "START", 0)));
    EXPECT_EQ(task->commands.at(0).signal, SIGTERM);
    EXPECT_EQ(journal.cancel(number), host::Journal::Cancel::Over);
}

TEST_F(Tasks, OneThatIsCancelledTooLateEndsAsItWouldHave) {
    ask("t1");
    const std::int64_t number = list->find("t1")->number;
    EXPECT_EQ(journal.cancel(number), host::Journal::Cancel::Asked);
    list->endCommandsOf(number);
    publish("t1");  // no command of it ran any more
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
}

TEST_F(Tasks, OneThatIsCancelledInTheQueueEndsWhenItBegins) {
    const ScratchDir scratch;
    const std::string script = scratch.script("script", "echo >'" + scratch.path("ran") + "'");
    ask("t1");
    Task task;
    task.transid = "t2";
    task.way = host::TaskWay::Journal;
    task.conditions = {{"TRANSID", OPER_EQ, "t2"}, {"COMMAND", OPER_EQ, "START"}};
    journal.enter(task);
    {
        TaskList::Request request(*list, *journal.nextInLine());
        request.answered(rows(taskRow("t2", "START", 0)), answering(0));
    }
    EXPECT_EQ(journal.cancel(task.number), host::Journal::Cancel::Asked);
    list->endCommandsOf(task.number);
    std::thread([&] {
        publish("t1");
        work(script);
        publish("t2");
    }).join();
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
    EXPECT_EQ(stateOf("t2"), TaskState::Cancelled);
    EXPECT_FALSE(scratch.exists("ran"));
}

TEST_F(Tasks, OneThatIsCancelledOnItsWayToThePluginEndsWhenItBegins) {
    const ScratchDir scratch;
    const std::string script = scratch.script("script", "echo >'" + scratch.path("ran") + "'");
    Task task;
    task.transid = "t1";
    task.way = host::TaskWay::Journal;
    task.conditions = {{"TRANSID", OPER_EQ, "t1"}, {"COMMAND", OPER_EQ, "START"}};
    journal.enter(task);
    task.run = journal.run();
    journal.save(task);
    EXPECT_EQ(journal.cancel(task.number), host::Journal::Cancel::Asked);
    list->endCommandsOf(task.number);
    {
        TaskList::Request request(*list, task);
        request.answered(rows(taskRow("t1", "START", 0)), answering(0));
    }
    std::thread([&] {
        work(script);
        publish("t1");
    }).join();
    EXPECT_EQ(stateOf("t1"), TaskState::Cancelled);
    EXPECT_FALSE(scratch.exists("ran"));
}

TEST_F(Tasks, WhatThePluginHoldsInItsQueueCannotBeCancelled) {
    ask("t1");
    ask("t2");
    EXPECT_EQ(journal.cancel(list->find("t2")->number), host::Journal::Cancel::InPlugin);
    EXPECT_EQ(journal.cancel(99), host::Journal::Cancel::Unknown);
    EXPECT_EQ(stateOf("t2"), TaskState::Queued);
}

TEST_F(Tasks, AnInstallThatMayRestartTheHostIsKnown) {
    EXPECT_FALSE(list->mayRestartHost());
    ask("t1", "INSTALL", 0, {{"OPTIONAL", OPER_EQ, "REQUIRES_RESTART"}});
    EXPECT_TRUE(list->mayRestartHost());
    EXPECT_FALSE(list->restartsHost()) << "it has not begun";
    publish("t1");
    EXPECT_TRUE(list->restartsHost());
    EXPECT_TRUE(list->find("t1")->begun);
    publish("t1");
    EXPECT_FALSE(list->mayRestartHost());
    EXPECT_FALSE(list->restartsHost());
}

TEST_F(Tasks, WhoFollowsOneHearsWhatItsCommandsWrite) {
    const ScratchDir scratch;
    const std::string script = scratch.script("script", "echo out; echo bad >&2");
    ask("t1");
    ask("t2");
    std::string heard;
    const std::uint64_t follower =
        list->follow(list->find("t2")->number, [&heard](const host::OutputPiece& piece) {
            heard += (piece.isError ? "err:" : "out:") + std::string(piece.text) + '@' +
                     std::to_string(piece.end) + ' ';
        });
    std::thread([&] {
        work(script);  // of another task
        publish("t1");
        work(script);
        publish("t2");
    }).join();
    EXPECT_EQ(heard, "out:out\n@4 err:bad\n@4 ");
    list->unfollow(follower);
    ask("t3");
    std::thread([&] { work(script); }).join();
    EXPECT_EQ(heard, "out:out\n@4 err:bad\n@4 ");
}

TEST_F(Tasks, OneThatRunsBeforeItsReplyIsSeenHasItsCommandsSoFar) {
    const ScratchDir scratch;
    const std::string script = scratch.script(
        "script", "echo early; until [ -e '" + scratch.path("go") + "' ]; do sleep 0.02; done");
    Task entered;
    entered.transid = "t1";
    entered.way = host::TaskWay::Journal;
    entered.conditions = {{"TRANSID", OPER_EQ, "t1"}, {"COMMAND", OPER_EQ, "START"}};
    journal.enter(entered);
    TaskList::Request request(*list, entered);
    std::thread executor([&] {
        work(script);
        publish("t1");
    });
    std::optional<Task> task;
    EXPECT_TRUE(eventually([&] {
        task = list->find("t1");
        return task && !task->commands.empty() && task->commands.back().out.text() == "early\n";
    }));
    EXPECT_EQ(task->state, TaskState::Queued);
    scratch.write("go", "");
    executor.join();
    request.answered(rows(taskRow("t1", "START", 0)), answering(0));
    EXPECT_EQ(list->find("t1")->commands.size(), 1U);
}

TEST_F(Tasks, ASuccessWhoseCommandDiedOfASignalIsAFailure) {
    const ScratchDir scratch;
    ask("t1");
    std::thread([&] {
        work(scratch.script("script", "kill -9 $$"));
        publish("t1");
    }).join();
    EXPECT_EQ(stateOf("t1"), TaskState::Failed);
    EXPECT_EQ(list->find("t1")->commands.at(0).signal, SIGKILL);
}

/// A journal on a full disk.
class FullKeeper : public host::TaskKeeper {
public:
    const std::string& identity() const override { return name_; }
    std::int64_t run() const override { return 1; }
    void enter(Task&) override { throw host::NotKept("the disk is full"); }
    void enterSoon(Task) override {}
    void save(const Task&) override { throw host::NotKept("the disk is full"); }
    void handsOver(std::int64_t) override {}
    void handOver(const Task&) override { throw host::TooLate("it expired"); }
    void saveOutcome(const std::vector<Task>&, const std::string&) override {}
    void saveSoon(Task) override {}
    void keepRow(const std::string&, const std::string&) override {}
    void forget(std::int64_t) override {}
    std::vector<Task> newest(const host::TaskFilter&) override { return {}; }
    std::optional<Task> find(std::string_view) override { return std::nullopt; }

private:
    const std::string name_ = "full";
};

TEST_F(Tasks, OneThatCannotBeKeptIsHandedOverOnlyWithoutGuards) {
    FullKeeper full;
    TaskList guarded(*tables, *feed, full, true);
    try {
        TaskList::Request(guarded, query("t1", "START"), "somebody");
        ADD_FAILURE() << "handed over";
    } catch (const host::NotKept& failure) {
        EXPECT_STREQ(failure.what(), "the disk is full");
        EXPECT_EQ(failure.guard(), "journal");
    }
    TaskList unguarded(*tables, *feed, full, false);
    TaskList::Request request(unguarded, query("t1", "START"), "somebody");
    EXPECT_FALSE(request.answered(rows(taskRow("t1", "START", 0)), answering(0)));
}

TEST_F(Tasks, OneThatExpiresBeforeItsHandOverIsRecordedIsNotHandedOver) {
    FullKeeper keeper;
    TaskList guarded(*tables, *feed, keeper, true);
    Task task;
    task.transid = "t1";
    task.way = host::TaskWay::Journal;
    EXPECT_THROW(TaskList::Request(guarded, task), host::TooLate);
    EXPECT_FALSE(guarded.mayRestartHost());
}

/// Notes which states are kept before it goes on, and which later.
class NotingKeeper final : public FullKeeper {
public:
    void enter(Task& task) override { task.number = 1; }
    void save(const Task& task) override {
        if (full) FullKeeper::save(task);
        saved.push_back(task.state);
    }
    void saveSoon(Task task) override { savedSoon.push_back(task.state); }

    bool full = false;
    std::vector<TaskState> saved;
    std::vector<TaskState> savedSoon;
};

TEST_F(Tasks, ARefusalIsKeptBeforeItIsTold) {
    NotingKeeper keeper;
    TaskList tasks(*tables, *feed, keeper, true);
    const auto refuse = [&](const char* transid) {
        TaskList::Request request(tasks, query(transid, "NOSUCH"), "somebody");
        EXPECT_TRUE(request.answered(rows(taskRow(transid, "NOSUCH", 1003)), answering(1003)));
    };
    refuse("t1");
    EXPECT_EQ(keeper.saved, std::vector<TaskState>{TaskState::Refused});
    keeper.full = true;
    refuse("t2");
    EXPECT_EQ(keeper.savedSoon, std::vector<TaskState>{TaskState::Refused}) << "when there is room";
}

class TasksWithoutGuards : public Tasks {
protected:
    TasksWithoutGuards() : Tasks(false) {}
};

TEST_F(TasksWithoutGuards, AreJudgedByTheirResultAlone) {
    const ScratchDir scratch;
    ask("t1");
    std::thread([&] {
        work(scratch.script("script", "kill -9 $$"));
        publish("t1");
    }).join();
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
    EXPECT_EQ(list->find("t1")->commands.at(0).signal, SIGKILL);
}

TEST(TasksWithoutTables, ThereAreNone) {
    const host::TableSet none({});
    host::OutcomeFeed feed(none);
    host::Journal journal{host::Journal::Settings{}};
    TaskList list(none, feed, journal, true);
    EXPECT_TRUE(list.newest({}).empty());
    EXPECT_FALSE(list.find("t1").has_value());
}

}  // namespace
