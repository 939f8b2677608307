#include "host/journal/recovery.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <fstream>
#include <thread>

#include "host/journal/commit_step.h"
#include "host/journal/journal_fixture.h"
#include "host/process/start_error.h"

namespace {

using host::CommitStep;
using host::Task;
using host::TaskState;
using host::TaskWay;

class Recovery : public JournalTest {
protected:
    /// What is in line, in its order.
    std::vector<std::string> line() {
        std::vector<std::string> transids;
        while (const std::optional<Task> task = journal->nextInLine()) {
            transids.push_back(task->transid);
            journal->save(ended(*task));
        }
        return transids;
    }
    Task running(const std::string& transid, TaskWay way = TaskWay::Query) {
        Task task = entered(transid, way);
        task.run = journal->run();
        task.state = TaskState::Running;
        task.started = host::WallClock::now();
        journal->save(task);
        return task;
    }
    /// The transaction of the first one's outcome hands over the second one, on paper.
    Task recordedAhead() {
        const Task first = running("t1", TaskWay::Journal);
        const Task second = entered("t2");
        journal->handOverWithOutcomes(true);
        journal->saveOutcome({ended(first)}, "row");
        EXPECT_EQ(journal->takeHandedOver(), second.number);
        return *journal->byNumber(second.number);
    }
};

TEST_F(Recovery, OnlyTheOldestThatWasHandedOverIsInterrupted) {
    open();
    running("q1");
    entered("q2", TaskWay::Query);
    entered("t1");
    entered("q3", TaskWay::Query);
    open();
    EXPECT_FALSE(journal->recovered().clean);
    EXPECT_EQ(journal->recovered().waiting, 3);
    EXPECT_EQ(stateOf("q1"), TaskState::Interrupted);
    EXPECT_NE(journal->find("q1")->reason, "");
    EXPECT_EQ(stateOf("q2"), TaskState::Queued);
    EXPECT_THAT(line(), testing::ElementsAre("q2", "t1", "q3"));
}

TEST_F(Recovery, WhatOvertookInTheQueueIsTheOldest) {
    open();
    const Task waited = entered("t1");
    entered("q1", TaskWay::Query);
    Task handedOver = waited;
    handedOver.run = journal->run();
    journal->save(handedOver);
    open();
    EXPECT_EQ(stateOf("q1"), TaskState::Interrupted);
    EXPECT_EQ(stateOf("t1"), TaskState::Queued);
}

TEST_F(Recovery, WhatThePluginGotWhileTheNextWasAboutToBeHandedOverIsTheOldest) {
    open();
    recordedAhead();
    entered("q1", TaskWay::Query);
    open();
    EXPECT_EQ(stateOf("q1"), TaskState::Interrupted);
    EXPECT_EQ(stateOf("t2"), TaskState::Queued);
}

TEST_F(Recovery, WhatThePluginGotAfterTheHandOverIsNot) {
    open();
    journal->handsOver(recordedAhead().number);
    entered("q1", TaskWay::Query);
    open();
    EXPECT_EQ(stateOf("t2"), TaskState::Interrupted);
    EXPECT_EQ(stateOf("q1"), TaskState::Queued);
}

TEST_F(Recovery, WhatIsTakenBackBeforeItsHandOverWaitsInLine) {
    open();
    const Task ahead = recordedAhead();
    journal->takeBack(ahead.number);
    EXPECT_EQ(journal->nextInLine()->number, ahead.number);
    entered("q1", TaskWay::Query);
    EXPECT_EQ(journal->nextInLine()->number, ahead.number);
    EXPECT_EQ(journal->cancel(ahead.number), host::Journal::Cancel::Ended);
}

TEST_F(Recovery, WhatWasOnlyRecordedAsHandedOverWaitsAfterAnOrderlyEnd) {
    open();
    recordedAhead();
    journal->endCleanly(false);
    open();
    EXPECT_EQ(journal->recovered().interrupted, "");
    EXPECT_EQ(stateOf("t2"), TaskState::Queued);
}

TEST_F(Recovery, WhatWasNeverHandedOverJustWaits) {
    open();
    entered("t1");
    entered("t2");
    open();
    EXPECT_EQ(journal->recovered().interrupted, "");
    EXPECT_THAT(line(), testing::ElementsAre("t1", "t2"));
}

TEST_F(Recovery, AnInterruptedTaskRunsAgainForThoseWhoWantThat) {
    host::Journal::Settings rerun = settings();
    rerun.rerunInterrupted = true;
    open(rerun);
    running("t1", TaskWay::Journal);
    open(rerun);
    EXPECT_TRUE(journal->recovered().runsAgain);
    EXPECT_EQ(journal->nextInLine()->transid, "t1");
}

TEST_F(Recovery, WhatEndsTheHostThreeTimesIsNotRunAgain) {
    host::Journal::Settings rerun = settings();
    rerun.rerunInterrupted = true;
    open(rerun);
    Task task = entered("t1");
    for (int i = 0; i < host::kMostInterruptions; ++i) {
        ASSERT_EQ(stateOf("t1"), TaskState::Queued) << i;
        task.run = journal->run();
        journal->save(task);
        open(rerun);
    }
    EXPECT_EQ(stateOf("t1"), TaskState::Interrupted);
    EXPECT_FALSE(journal->recovered().runsAgain);
}

TEST_F(Recovery, WhatOrderlyEndsCutOffDoesNotCountAsWhatEndsTheHost) {
    host::Journal::Settings rerun = settings();
    rerun.rerunInterrupted = true;
    open(rerun);
    Task task = entered("t1");
    for (int i = 0; i < host::kMostInterruptions + 1; ++i) {
        ASSERT_EQ(stateOf("t1"), TaskState::Queued) << i;
        task.run = journal->run();
        journal->save(task);
        journal->endCleanly(false);
        open(rerun);
        EXPECT_TRUE(journal->recovered().runsAgain);
    }
    EXPECT_EQ(journal->find("t1")->interruptions, 0);
}

TEST_F(Recovery, AfterAQuietEndNothingIsInterrupted) {
    open();
    running("q1");
    entered("q2", TaskWay::Query);
    journal->endCleanly(true);
    open();
    EXPECT_TRUE(journal->recovered().clean);
    EXPECT_EQ(journal->recovered().interrupted, "");
    EXPECT_THAT(line(), testing::ElementsAre("q1", "q2"));
}

TEST_F(Recovery, AnEndThatCutsATaskOffInterruptsIt) {
    open();
    running("q1");
    entered("q2", TaskWay::Query);
    journal->endCleanly(false);
    open();
    EXPECT_TRUE(journal->recovered().clean);
    EXPECT_EQ(stateOf("q1"), TaskState::Interrupted);
    EXPECT_EQ(stateOf("q2"), TaskState::Queued);
}

TEST_F(Recovery, WhatWasToBeCancelledIs) {
    open();
    const Task first = running("q1");
    const Task second = running("t1", TaskWay::Journal);
    entered("q2", TaskWay::Query);
    EXPECT_EQ(journal->cancel(first.number), host::Journal::Cancel::Asked);
    EXPECT_EQ(journal->cancel(second.number), host::Journal::Cancel::Asked);
    EXPECT_TRUE(journal->find("q1")->cancel);
    open();
    EXPECT_EQ(stateOf("q1"), TaskState::Cancelled);
    EXPECT_EQ(stateOf("t1"), TaskState::Cancelled);
    EXPECT_EQ(stateOf("q2"), TaskState::Queued);
    EXPECT_EQ(journal->recovered().interrupted, "");
}

TEST_F(Recovery, AnInstallThatHasBegunStaysInHand) {
    host::Journal::Settings here = settings();
    here.boot = "one";
    open(here);
    Task task = running("t1", TaskWay::Journal);
    task.begun = true;
    journal->save(task);
    entered("t2");
    open(here);
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    EXPECT_EQ(journal->recovered().begun, task.id);
    EXPECT_FALSE(journal->recovered().bootedAnew);
    EXPECT_EQ(journal->recovered().interrupted, "");
    EXPECT_EQ(journal->recovered().waiting, 1);
    EXPECT_EQ(journal->nextInLine()->transid, "t2");
    here.boot = "two";
    open(here);
    EXPECT_EQ(journal->recovered().begun, task.id);
    EXPECT_TRUE(journal->recovered().bootedAnew);
}

TEST_F(Recovery, AQuietEndLeavesAnInstallThatHasBegunInHand) {
    open();
    Task task = running("t1", TaskWay::Journal);
    task.begun = true;
    journal->save(task);
    entered("q1", TaskWay::Query);
    journal->endCleanly(true);
    EXPECT_EQ(journal->notBegun(), 1);
    open();
    EXPECT_EQ(journal->recovered().begun, task.id);
    EXPECT_THAT(line(), testing::ElementsAre("q1"));
}

TEST_F(Recovery, EachRunHasANumberOfItsOwnAndTheIdentityStays) {
    open();
    const std::string identity = journal->identity();
    const std::int64_t first = journal->run();
    open();
    EXPECT_EQ(journal->identity(), identity);
    EXPECT_EQ(journal->run(), first + 1);
}

TEST_F(Recovery, ADamagedJournalIsSetAsideAndANewOneBegun) {
    open();
    const std::string identity = journal->identity();
    entered("t1");
    journal.reset();
    scratch.write("state/journal.db", std::string(20'000, 'x'));
    open();
    EXPECT_NE(journal->identity(), identity);
    EXPECT_NE(journal->recovered().fault, "");
    EXPECT_EQ(scratch.read("state/journal.db.damaged-1"), std::string(20'000, 'x'));
    EXPECT_EQ(journal->find("t1"), std::nullopt);
    entered("t2");
    open();
    EXPECT_EQ(stateOf("t2"), TaskState::Queued);
}

/// Overwrites the root of an index, which leaves the tables readable.
void damageIndex(const std::string& file) {
    host::Database database(file);
    database.number("PRAGMA wal_checkpoint(TRUNCATE)");
    database.run("PRAGMA writable_schema = ON");
    // An index that says it belongs to another column holds entries that are not in order.
    database.change(
        "UPDATE sqlite_master SET sql = 'CREATE INDEX tasks_by_transid ON tasks (accepted, "
        "number)' "
        "WHERE name = 'tasks_by_transid'");
}

TEST_F(Recovery, UnfinishedTasksOfADamagedJournalAreInterrupted) {
    open();
    entered("t1");
    journal->save(ended(entered("over")));
    entered("t2");
    journal.reset();
    damageIndex(scratch.path("state/journal.db"));
    open();
    EXPECT_NE(journal->recovered().setAside, "");
    EXPECT_EQ(journal->recovered().salvaged, 2);
    EXPECT_EQ(stateOf("t1"), TaskState::Interrupted);
    EXPECT_EQ(stateOf("t2"), TaskState::Interrupted);
    EXPECT_EQ(journal->find("t1")->value("PRODUCT"), "ux");
    EXPECT_EQ(journal->nextInLine(), std::nullopt);
}

TEST_F(Recovery, WhatRepetitionsNeedSurvivesDamage) {
    open();
    const std::string identity = journal->identity();
    Task task = asked("key");
    task.once = journal->hashOf("content");
    journal->enter(task);
    journal.reset();
    damageIndex(scratch.path("state/journal.db"));
    open();
    EXPECT_EQ(journal->recovered().formerIdentity, identity);
    ASSERT_TRUE(journal->findOnce("key").has_value());
    EXPECT_EQ(journal->findOnce("key")->once, journal->hashOf("content"));
    open();
    EXPECT_EQ(journal->recovered().formerIdentity, identity) << "what it left may still run";
}

TEST_F(Recovery, TheIdentityOfAJournalThatCannotBeReadIsKnown) {
    open();
    const std::string identity = journal->identity();
    journal.reset();
    scratch.write("state/journal.db", std::string(20'000, 'x'));
    open();
    EXPECT_EQ(journal->recovered().formerIdentity, identity);
}

TEST_F(Recovery, TheIdentityOfAJournalThatIsNotThereAnyMoreIsKnown) {
    open();
    const std::string identity = journal->identity();
    EXPECT_EQ(journal->recovered().formerIdentity, "");
    journal.reset();
    ASSERT_EQ(::unlink(scratch.path("state/journal.db").c_str()), 0);
    open();
    EXPECT_EQ(journal->recovered().formerIdentity, identity);
}

/// Overwrites the first page of a table.
void damageTable(const std::string& file, const char* name) {
    std::int64_t page = 0;
    std::int64_t size = 0;
    {
        host::Database database(file);
        page = database.number("SELECT rootpage FROM sqlite_master WHERE name = CAST(? AS TEXT)",
                               name);
        size = database.number("PRAGMA page_size");
    }
    std::fstream bytes(file, std::ios::in | std::ios::out | std::ios::binary);
    bytes.seekp((page - 1) * size);
    bytes << std::string(static_cast<std::size_t>(size), 'x');
    ASSERT_TRUE(bytes.good());
}

TEST_F(Recovery, DamageThatIsFoundAfterACleanEndDoesNotKeepTheHostFromStarting) {
    open();
    entered("t1");
    journal->endCleanly(true);
    journal.reset();
    damageTable(scratch.path("state/journal.db"), "runs");
    open();
    EXPECT_TRUE(journal->recovered().clean);
    EXPECT_NE(journal->recovered().setAside, "");
    EXPECT_EQ(stateOf("t1"), TaskState::Interrupted);
    entered("t2");
    EXPECT_EQ(journal->nextInLine()->transid, "t2");
}

TEST_F(Recovery, AJournalOfANewerHostIsNotTouched) {
    open();
    journal.reset();
    {
        host::Database database(scratch.path("state/journal.db"));
        database.run("PRAGMA user_version = 1000");
    }
    EXPECT_THROW(open(), host::StartError);
    host::Database database(scratch.path("state/journal.db"));
    EXPECT_EQ(database.number("PRAGMA user_version"), 1000);
}

// ---- Kills
// ---------------------------------------------------------------------------------------

void killBefore(CommitStep step) {
    if (step == CommitStep::BeforeCommit) ::_exit(9);
}
void killAfter(CommitStep step) {
    if (step == CommitStep::AfterCommit) ::_exit(9);
}

class Kills : public Recovery {
protected:
    /// Does this in a process of its own, which ends at the hook's word.
    template <typename Work>
    void inAProcessThatIsKilled(host::CommitHook hook, Work work) {
        const pid_t child = ::fork();
        if (child == 0) {
            open();
            work(hook);
            ::_exit(0);
        }
        int status = 0;
        ASSERT_EQ(::waitpid(child, &status, 0), child);
        ASSERT_EQ(WEXITSTATUS(status), 9) << "it was not killed";
        open();
    }
};

TEST_F(Kills, BeforeTheCommitOfTheAcceptanceThereIsNoTask) {
    inAProcessThatIsKilled(killBefore, [this](host::CommitHook hook) {
        host::commitHook = hook;
        entered("t1");
    });
    EXPECT_EQ(journal->find("t1"), std::nullopt);
}

TEST_F(Kills, AfterTheCommitOfTheAcceptanceTheTaskWaits) {
    inAProcessThatIsKilled(killAfter, [this](host::CommitHook hook) {
        host::commitHook = hook;
        entered("t1");
    });
    EXPECT_EQ(stateOf("t1"), TaskState::Queued);
}

TEST_F(Kills, AfterTheHandOverTheTaskIsInterrupted) {
    inAProcessThatIsKilled(killAfter, [this](host::CommitHook hook) {
        Task task = entered("t1");
        task.run = journal->run();
        host::commitHook = hook;
        journal->save(task);
    });
    EXPECT_EQ(stateOf("t1"), TaskState::Interrupted);
}

TEST_F(Kills, OnPurposeAfterTheJournalWasClosedLeaveTheTaskInterrupted) {
    inAProcessThatIsKilled(nullptr, [this](host::CommitHook) {
        Task task = entered("t1");
        task.run = journal->run();
        journal->save(task);
        journal->endCleanly(false);
        journal->close();
        std::atomic<bool> recorded{false};
        std::thread executor([&] {
            journal->saveOutcome({ended(task, TaskState::Failed)}, "row");
            recorded = true;
        });
        executor.detach();
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
        ::_exit(recorded ? 0 : 9);
    });
    EXPECT_EQ(stateOf("t1"), TaskState::Interrupted);
}

TEST_F(Kills, BeforeTheCommitOfTheOutcomeTheTaskIsInterruptedAndTheNextWaits) {
    inAProcessThatIsKilled(killBefore, [this](host::CommitHook hook) {
        const Task task = running("q1");
        entered("q2", TaskWay::Query);
        host::commitHook = hook;
        journal->saveOutcome({ended(task)}, "row");
    });
    EXPECT_EQ(stateOf("q1"), TaskState::Interrupted);
    EXPECT_EQ(stateOf("q2"), TaskState::Queued);
}

TEST_F(Kills, AfterTheCommitOfTheOutcomeTheTaskIsDoneAndTheNextInterrupted) {
    inAProcessThatIsKilled(killAfter, [this](host::CommitHook hook) {
        const Task task = running("q1");
        Task next = entered("q2", TaskWay::Query);
        next.state = TaskState::Running;
        next.started = host::WallClock::now();
        host::commitHook = hook;
        journal->saveOutcome({ended(task), next}, "row");
    });
    EXPECT_EQ(stateOf("q1"), TaskState::Done);
    EXPECT_EQ(stateOf("q2"), TaskState::Interrupted);
}

}  // namespace
