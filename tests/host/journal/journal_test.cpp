// ctest-label: threaded
#include "host/journal/journal.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <thread>

#include "host/journal/commit_step.h"
#include "host/journal/journal_fixture.h"
#include "host/process/start_error.h"
#include "support/full_disk.h"
#include "support/gate.h"
#include "support/host/program.h"

namespace {

using host::Journal;
using host::Task;
using host::TaskState;
using host::TaskWay;
using testing::ElementsAre;
using testing::IsEmpty;

class Journals : public JournalTest {
protected:
    std::vector<std::string> transids(const host::TaskFilter& filter = {}) {
        std::vector<std::string> found;
        for (const Task& task : journal->newest(filter))
            found.push_back(task.transid);
        return found;
    }
    /// Events as texts.
    std::vector<std::string> events(std::int64_t after = 0, std::size_t most = 100) {
        std::vector<std::string> texts;
        for (const host::JournalEvent& event : journal->eventsAfter(after, most)) {
            const bool isRow = event.kind == host::EventKind::Row;
            texts.push_back(std::to_string(event.number) + (isRow ? " row of " : " end of ") +
                            std::to_string(event.task) + (isRow ? ": " + event.row : ""));
        }
        return texts;
    }
    /// Everything in the files of the journal's directory.
    std::string allBytes() const {
        std::string bytes;
        for (const auto& entry : std::filesystem::directory_iterator(scratch.path("state"))) {
            if (entry.path().filename() != "reserve") {
                bytes += scratch.read("state/" + entry.path().filename().string());
            }
        }
        return bytes;
    }
};

TEST_F(Journals, KeepEverythingAboutATask) {
    open();
    Task task = entered("t1");
    task.run = journal->run();
    task.state = TaskState::Running;
    task.started = host::WallClock::now();
    task.reply = std::string(500, ' ') + "reply";
    journal->save(task);
    task.outcomes = {"first", "second"};
    host::Command& command = task.commands.emplace_back();
    command.line = "/bin/TovrinAgent";
    command.pid = 17;
    command.exit = 3;
    command.timedOut = true;
    command.out.append("one\n");
    command.err.append(std::string("\xFF\0", 2));
    task = ended(task, TaskState::Failed);
    journal->saveOutcome({task}, "row");
    open();
    const std::optional<Task> kept = journal->find(task.id);
    ASSERT_TRUE(kept.has_value());
    EXPECT_EQ(kept->transid, "t1");
    EXPECT_EQ(kept->asker, "somebody");
    EXPECT_EQ(kept->state, TaskState::Failed);
    EXPECT_EQ(kept->run, 1);
    EXPECT_EQ(kept->boot, host::bootName());
    EXPECT_EQ(kept->value("PRODUCT"), "ux");
    EXPECT_EQ(kept->conditions.size(), 3U);
    EXPECT_EQ(kept->reply, task.reply);
    EXPECT_THAT(kept->outcomes, ElementsAre("first", "second"));
    EXPECT_EQ(host::WallClock::now() > kept->accepted, true);
    EXPECT_LE(kept->started, kept->ended);
    ASSERT_EQ(kept->commands.size(), 1U);
    EXPECT_EQ(kept->commands[0].line, "/bin/TovrinAgent");
    EXPECT_EQ(kept->commands[0].pid, 17);
    EXPECT_EQ(kept->commands[0].exit, 3);
    EXPECT_EQ(kept->commands[0].signal, std::nullopt);
    EXPECT_TRUE(kept->commands[0].timedOut);
    EXPECT_EQ(kept->commands[0].out.text(), "one\n");
    EXPECT_EQ(kept->commands[0].err.text(), std::string("\xFF\0", 2));
}

TEST_F(Journals, WarnOnceThatRequestsCannotBeRecorded) {
    open();
    const std::string warning =
        "the journal cannot record requests: the disk with " + scratch.path("state") + " is full\n";
    const auto enterInVain = [this] {
        Task task = asked("t");
        EXPECT_THROW(journal->enter(task), host::NotKept);
    };
    for (int i = 0; i < 2; ++i) {  // again when there was room meanwhile
        entered("there is room");
        std::filesystem::remove(scratch.path("state/reserve"));
        scratch.makeDir("state/reserve");
        testing::internal::CaptureStderr();
        enterInVain();
        EXPECT_THAT(testing::internal::GetCapturedStderr(), testing::EndsWith(warning));
        testing::internal::CaptureStderr();
        enterInVain();
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
        std::filesystem::remove(scratch.path("state/reserve"));
    }
}

TEST_F(Journals, FindTasksByIdentifierAndTheNewestByItsTransaction) {
    open();
    const Task first = entered("same");
    const Task second = entered("same");
    EXPECT_EQ(first.id, journal->identity() + "-1");
    EXPECT_EQ(journal->find(first.id)->number, first.number);
    EXPECT_EQ(journal->find("same")->id, second.id);
    EXPECT_EQ(journal->find("other"), std::nullopt);
    EXPECT_EQ(journal->find("0123456789abcdef-1"), std::nullopt);
}

TEST_F(Journals, ListTasksNewestFirstAsAskedFor) {
    open();
    journal->save(ended(entered("t1")));
    const Task second = entered("t2");
    entered("t3");
    EXPECT_THAT(transids(), ElementsAre("t3", "t2", "t1"));
    EXPECT_THAT(transids({TaskState::Done}), ElementsAre("t1"));
    EXPECT_THAT(transids({{}, "ux"}), ElementsAre("t3", "t2", "t1"));
    EXPECT_THAT(transids({{}, "um"}), IsEmpty());
    EXPECT_THAT(transids({{}, {}, "START"}), ElementsAre("t3", "t2", "t1"));
    EXPECT_THAT(transids({{}, {}, "STOP"}), IsEmpty());
    EXPECT_THAT(transids({{}, {}, {}, 2}), ElementsAre("t3", "t2"));
    EXPECT_THAT(transids({{}, {}, {}, 10, {}, second.number}), ElementsAre("t1"));
    EXPECT_THAT(transids({{}, {}, {}, 10, host::WallClock::now()}), IsEmpty());
}

TEST_F(Journals, ShowNobodyATaskThatMayYetBeNone) {
    open();
    Task task = asked("t1", TaskWay::Query);
    task.answered = false;
    journal->enter(task);
    EXPECT_THAT(transids(), IsEmpty());
    journal->forget(task.number);
    EXPECT_EQ(journal->find(task.id), std::nullopt);
}

TEST_F(Journals, KeepNoSecretOfWhatWasNoTask) {
    open();
    Task task = asked("t1", TaskWay::Query);
    task.answered = false;
    task.conditions = {{"COMMAND", OPER_EQ, "SETCONFIG"}, {"CONTEXT", OPER_EQ, "Tr0ub4dor"}};
    journal->enter(task);
    EXPECT_NE(allBytes().find("Tr0ub4dor"), std::string::npos);
    journal->forget(task.number);
    EXPECT_TRUE(eventually([this] { return allBytes().find("Tr0ub4dor") == std::string::npos; }));
}

TEST_F(Journals, KnowWhichProductsATaskMayChange) {
    open();
    Task start = asked("t1");
    journal->enter(start);
    EXPECT_FALSE(journal->mayChange("ux")) << "it only starts it";
    Task install = asked("t2");
    install.conditions = {{"COMMAND", OPER_EQ, "INSTALL"}, {"PRODUCT", OPER_EQ, "ux"}};
    journal->enter(install);
    EXPECT_TRUE(journal->mayChange("UX"));
    EXPECT_FALSE(journal->mayChange("px"));
    install.run = journal->run();
    journal->save(install);
    EXPECT_TRUE(journal->mayChange("ux")) << "it is on its way to the plug-in";
    journal->save(ended(install));
    EXPECT_FALSE(journal->mayChange("ux"));
}

TEST_F(Journals, LetTasksGoForwardOnly) {
    open();
    Task task = entered("t1");
    journal->save(ended(task));
    EXPECT_THROW(journal->save(task), host::StepBack);
    EXPECT_THROW(journal->save(ended(task, TaskState::Failed)), host::StepBack);
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
}

TEST_F(Journals, KeepWhatRanAtOnceWithoutACommitOfItsOwn) {
    // What can wait is written by itself after a second, so that a longer round tells nothing.
    constexpr int kMostRounds = 60;
    for (int round = 0; round < kMostRounds; ++round) {
        const auto begin = std::chrono::steady_clock::now();
        open();
        const std::uint64_t before = journal->transactions();
        journal->enterSoon(ended(asked("t1", TaskWay::AtOnce)));
        entered("t2");
        const std::uint64_t after = journal->transactions();
        const auto time = std::chrono::steady_clock::now() - begin;
        EXPECT_EQ(stateOf("t1"), TaskState::Done);
        if (time >= std::chrono::seconds(1)) continue;
        EXPECT_EQ(after, before + 1);
        return;
    }
    FAIL() << "no round took less than a second";
}

TEST_F(Journals, TellThatATaskHasBegunBeforeItIsWritten) {
    open();
    Task task = entered("t1");
    entered("t2");
    task.run = journal->run();
    journal->handOver(task);
    const std::uint64_t before = journal->transactions();
    std::atomic<int> changes{0};
    journal->whenChanged([&changes] { ++changes; });
    task.state = TaskState::Running;
    task.started = host::WallClock::now();
    journal->saveSoon(task);
    EXPECT_EQ(changes, 1);
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    EXPECT_EQ(journal->notBegun(), 1);
    const Journal::Unfinished unfinished = journal->unfinished();
    EXPECT_EQ(unfinished.queued, 1);
    EXPECT_EQ(unfinished.running, 1);
    EXPECT_EQ(unfinished.oldestQueued, journal->find("t2")->accepted);
    const std::vector<Task> running = journal->running();
    ASSERT_EQ(running.size(), 1U);
    EXPECT_EQ(running.front().id, task.id);
    EXPECT_EQ(running.front().started, task.started);
    EXPECT_EQ(journal->transactions(), before) << "a question costs no commit";
    journal->save(ended(task));
    EXPECT_EQ(journal->transactions(), before + 1);
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
    EXPECT_TRUE(journal->running().empty());
    journal->whenChanged({});
}

TEST_F(Journals, TellThatATaskHasBegunWhileOlderNewsOfItIsWritten) {
    open();
    Task task = entered("t1");
    task.run = journal->run();
    journal->handOver(task);
    task.answered = true;
    journal->saveSoon(task);
    task.state = TaskState::Running;
    // It begins while another task's transaction, which takes along what waits, is written.
    static Journal* beginsIn;
    static const Task* begins;
    beginsIn = &*journal;
    begins = &task;
    host::commitHook = [](host::CommitStep) {
        host::commitHook = nullptr;
        beginsIn->saveSoon(*begins);
    };
    entered("t2");
    EXPECT_TRUE(host::commitHook.load() == nullptr);
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    EXPECT_EQ(journal->running().size(), 1U);
    EXPECT_EQ(journal->unfinished().running, 1);
}

TEST_F(Journals, TellThatATaskHasBegunThoughTheDiskIsFull) {
    open();
    Task task = entered("t1");
    task.run = journal->run();
    journal->handOver(task);
    {
        const FullDisk full;
        task.state = TaskState::Running;
        journal->saveSoon(task);
        Task other = asked("t2");
        EXPECT_THROW(journal->enter(other), host::NotKept) << "the beginning was to go with it";
        EXPECT_EQ(stateOf("t1"), TaskState::Running);
        EXPECT_EQ(journal->running().size(), 1U);
    }
    entered("t3");
    EXPECT_EQ(stateOf("t1"), TaskState::Running);
    EXPECT_EQ(journal->running().size(), 1U);
}

TEST_F(Journals, TellThatAQuerysTaskHasBegunThoughNobodyFindsItYet) {
    open();
    Task task = asked("t1", TaskWay::Query);
    task.run = journal->run();
    task.answered = false;
    journal->enter(task);
    EXPECT_TRUE(journal->running().empty());
    task.answered = true;
    task.state = TaskState::Running;
    journal->saveSoon(task);
    ASSERT_EQ(journal->running().size(), 1U);
    EXPECT_EQ(journal->running().front().id, task.id);
    EXPECT_EQ(stateOf("t1"), TaskState::Running) << "who asks has it written";
    EXPECT_EQ(journal->running().size(), 1U);
}

TEST_F(Journals, GiveTheNextInLineInTheOrderOfAcceptance) {
    open();
    const Task first = entered("t1");
    entered("q", TaskWay::Query);
    const Task second = entered("t2");
    EXPECT_EQ(journal->waiting(), 2);
    EXPECT_EQ(journal->nextInLine()->id, first.id);
    journal->save(ended(first, TaskState::Expired));
    EXPECT_EQ(journal->nextInLine()->id, second.id);
    journal->save(ended(second, TaskState::Cancelled));
    EXPECT_EQ(journal->nextInLine(), std::nullopt);
    EXPECT_EQ(journal->waiting(), 0);
}

TEST_F(Journals, RecogniseARepetitionByItsContent) {
    open();
    Task task = asked("key");
    task.once = journal->hashOf("content");
    journal->enter(task);
    entered("key");
    EXPECT_EQ(journal->findOnce("key")->id, task.id);
    EXPECT_EQ(journal->findOnce("key")->once, journal->hashOf("content"));
    EXPECT_EQ(journal->findOnce("other"), std::nullopt);
    open();
    EXPECT_EQ(journal->findOnce("key")->once, journal->hashOf("content"));
}

TEST_F(Journals, HoldASecretWholeWhileTheTaskNeedsItAndNowhereAfterwards) {
    open();
    std::vector<Task> tasks;
    for (int i = 0; i < 20; ++i) {
        Task task = asked("t" + std::to_string(i));
        task.conditions = {{"COMMAND", OPER_EQ, "SETCONFIG"},
                           {"CONTEXT", OPER_EQ, "<password>Tr0ub4dor</password>"}};
        journal->enter(task);
        tasks.push_back(task);
    }
    EXPECT_EQ(journal->find("t0")->conditions.at(1).value, "<password>Tr0ub4dor</password>");
    EXPECT_EQ(journal->find("t0")->value("CONTEXT"), "") << "it is shown to nobody";
    EXPECT_NE(allBytes().find("Tr0ub4dor"), std::string::npos);
    for (const Task& task : tasks)
        journal->saveOutcome({ended(task)}, "row");
    EXPECT_TRUE(eventually([this] { return allBytes().find("Tr0ub4dor") == std::string::npos; }));
    EXPECT_EQ(journal->find("t0")->conditions.size(), 1U);
}

TEST_F(Journals, HoldPasswordsOfACommandWholeWhileTheTaskNeedsThemAndNowhereAfterwards) {
    open();
    Task task = asked("key:t1");
    task.conditions = {{"COMMAND", OPER_EQ, "INSTALL"},
                       {"TRANSID", OPER_EQ, "key:t1"},
                       {"CONTEXT", OPER_EQ, "./install.sh --password=Tr0ub4dor now"},
                       {"UASCRIPT", OPER_EQ, "pwd: 'Tr0ub4dor 2'"}};
    journal->enter(task);
    EXPECT_EQ(journal->find("key:t1")->conditions.at(2).value,
              "./install.sh --password=Tr0ub4dor now");
    EXPECT_EQ(journal->find("key:t1")->value("CONTEXT"), "./install.sh --password=*** now")
        << "it is shown to nobody";
    task.reason = "token=Tr0ub4dor is wrong";
    task.hint = "no secret: Tr0ub4dor";
    journal->saveOutcome({ended(task, TaskState::Failed)}, "row");
    EXPECT_TRUE(eventually([this] { return allBytes().find("Tr0ub4dor") == std::string::npos; }));
    const std::optional<Task> kept = journal->find("key:t1");
    EXPECT_EQ(kept->conditions.at(2).value, "./install.sh --password=*** now");
    EXPECT_EQ(kept->value("UASCRIPT"), "pwd: ***");
    EXPECT_EQ(kept->value("TRANSID"), "key:t1") << "a task is found by it";
    EXPECT_EQ(kept->reason, "token=*** is wrong");
    EXPECT_EQ(kept->hint, "no secret: ***");
}

TEST_F(Journals, CutLongValuesOfTasksThatAreOver) {
    open();
    Task task = asked("t1");
    task.conditions.push_back({"CONTEXT", OPER_EQ, std::string(100'000, 'x')});
    journal->enter(task);
    EXPECT_EQ(journal->find("t1")->conditions.at(3).value.size(), 100'000U);
    EXPECT_EQ(journal->find("t1")->value("CONTEXT").size(), 4096U);
    journal->save(ended(task));
    EXPECT_EQ(journal->find("t1")->conditions.at(3).value.size(), 4096U);
}

TEST_F(Journals, AcceptNothingOnAFullDiskAndGoOnWhenThereIsRoom) {
    open();
    entered("t1");
    {
        const FullDisk full;
        Task task = asked("t2");
        EXPECT_THROW(journal->enter(task), host::NotKept);
    }
    Task task = asked("t3");
    journal->enter(task);
    EXPECT_THAT(transids(), ElementsAre("t3", "t1"));
}

TEST_F(Journals, AnOutcomeWaitsUntilThereIsRoom) {
    open();
    const Task task = entered("t1");
    std::thread executor;
    {
        const FullDisk full;
        executor = std::thread([&] { journal->saveOutcome({ended(task)}, "row"); });
        EXPECT_TRUE(eventually([this] { return !journal->trouble().empty(); }));
    }
    executor.join();
    EXPECT_EQ(journal->trouble(), "");
    EXPECT_EQ(stateOf("t1"), TaskState::Done);
}

TEST_F(Journals, ForgetWhatIsOlderThanTheyKeep) {
    open();
    Task old = asked("old");
    old.state = TaskState::Done;
    old.ended = host::WallClock::now() - std::chrono::hours(24 * 31);
    journal->enter(old);
    journal->save(ended(entered("new")));
    Task waits = asked("waits");
    waits.accepted = *old.ended;
    journal->enter(waits);
    open();
    EXPECT_THAT(transids(), ElementsAre("waits", "new"));
}

TEST_F(Journals, ForgetWhatIsTooOldWhileTheyAreOpen) {
    Journal::Settings often = settings();
    often.pruneEvery = std::chrono::milliseconds(10);
    open(often);
    Task old = ended(entered("old"));
    old.ended = host::WallClock::now() - std::chrono::hours(24 * 31);
    journal->save(old);
    EXPECT_TRUE(eventually([this] { return !journal->find("old").has_value(); }));
}

TEST_F(Journals, KeepHardlyMoreRowsThanTheyAreTold) {
    Journal::Settings few = settings();
    few.keepRows = 2;
    open(few);
    for (int i = 0; i < 5; ++i) {
        Task task = entered("t" + std::to_string(i));
        task.outcomes = {"row"};
        journal->saveOutcome({ended(task)}, "row");
    }
    EXPECT_TRUE(eventually([this] { return journal->find("t2")->outcomes.empty(); }));
    EXPECT_THAT(journal->find("t4")->outcomes, ElementsAre("row"));
}

TEST_F(Journals, KeepOnlySoManyRowsButTheirTasks) {
    open();
    for (int i = 0; i < 5; ++i) {
        Task task = entered("t" + std::to_string(i));
        task.outcomes = {"row"};
        journal->saveOutcome({ended(task)}, "row");
    }
    host::Journal::Settings few = settings();
    few.keepRows = 2;
    open(few);
    EXPECT_EQ(transids().size(), 5U);
    EXPECT_THAT(journal->find("t2")->outcomes, IsEmpty());
    EXPECT_THAT(journal->find("t3")->outcomes, ElementsAre("row"));
}

TEST_F(Journals, MakeAnEventOfEveryRowAndEveryEnd) {
    open();
    EXPECT_EQ(journal->lastEvent().number, 0);
    Task task = entered("t1");
    task.state = TaskState::Running;
    task.outcomes = {"begun ***"};
    journal->saveOutcome({task}, "begun abc");
    task.outcomes.push_back("over ***");
    journal->saveOutcome({ended(task)}, "over abc");
    journal->keepRow("nobody's ***", "nobody's abc");
    EXPECT_EQ(journal->cancel(entered("t2").number), Journal::Cancel::Ended);
    EXPECT_EQ(journal->lastEvent().journal, journal->identity());
    EXPECT_THAT(events(), ElementsAre("1 row of 1: begun abc", "2 row of 1: over abc", "3 end of 1",
                                      "4 row of 0: nobody's abc", "5 end of 2"));
    open();
    EXPECT_EQ(journal->lastEvent().number, 5);
    EXPECT_THAT(events(), ElementsAre("1 row of 1: begun ***", "2 row of 1: over ***", "3 end of 1",
                                      "4 row of 0: nobody's ***", "5 end of 2"));
    EXPECT_THAT(events(3, 1), ElementsAre("4 row of 0: nobody's ***"));
    EXPECT_EQ(journal->byNumber(2)->state, TaskState::Cancelled);
    entered("t3", TaskWay::Query);
    open();
    EXPECT_THAT(events(5), ElementsAre("6 end of 3")) << "it was interrupted";
}

TEST_F(Journals, TellOfEventsBeforeTheOutcomeIsReportedAsKept) {
    open();
    std::int64_t last = 0;
    journal->whenEvents([&] { last = journal->lastEvent().number; });
    journal->saveOutcome({ended(entered("t1"))}, "row");
    EXPECT_EQ(last, 1);
    journal->whenEvents({});
}

TEST_F(Journals, GiveARowThatHadToWaitAsItCame) {
    open();
    Task task = entered("t1");
    task.outcomes = {"***"};
    std::thread executor;
    {
        const FullDisk full;
        executor = std::thread([&] { journal->saveOutcome({ended(task)}, "abc"); });
        EXPECT_TRUE(eventually([this] { return !journal->trouble().empty(); }));
        EXPECT_EQ(journal->lastEvent().number, 0);
    }
    executor.join();
    EXPECT_THAT(events(), ElementsAre("1 row of 1: abc", "2 end of 1"));
}

TEST_F(Journals, WithoutADirectoryAreInMemory) {
    Journal memory(Journal::Settings{});
    Task task = asked("t1");
    memory.enter(task);
    EXPECT_EQ(memory.find("t1")->id, task.id);
    memory.save(ended(task));
    EXPECT_EQ(memory.newest({}).size(), 1U);
}

TEST_F(Journals, OfTwoOnOneDirectoryTheSecondFailsOrIsInMemory) {
    open();
    EXPECT_THROW(Journal{settings()}, host::StartError);
    Journal::Settings yielding = settings();
    yielding.mayYield = true;
    Journal second(yielding);
    EXPECT_NE(second.identity(), journal->identity());
    Task task = asked("t1");
    second.enter(task);
    EXPECT_EQ(journal->find("t1"), std::nullopt);
}

TEST_F(Journals, ManyThreadsMayEnterTasksAndShareCommits) {
    open();
    const std::uint64_t before = journal->transactions();
    std::vector<std::thread> threads;
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([this, i] {
            for (int k = 0; k < 25; ++k)
                entered("t" + std::to_string(i));
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(journal->waiting(), 200);
    EXPECT_LE(journal->transactions() - before, 200U);
}

/// Holds up the first commit.
Gate firstCommit;

TEST_F(Journals, OfTwoHundredWhoSubmitAtOnceTenShareEachCommitAtLeast) {
    constexpr int kSubmitters = 200;
    open();
    journal->newest({});
    const std::uint64_t before = journal->transactions();
    host::commitHook = [](host::CommitStep step) {
        if (step == host::CommitStep::BeforeCommit) firstCommit.pass();
    };
    std::atomic<int> begun{0};
    std::vector<std::thread> submitters;
    for (int i = 0; i < kSubmitters; ++i) {
        submitters.emplace_back([this, i, &begun] {
            Task task = asked("t" + std::to_string(i));
            ++begun;
            journal->enter(task);
        });
    }
    EXPECT_TRUE(firstCommit.awaitArrival());
    EXPECT_TRUE(eventually([&] { return begun == kSubmitters; }));
    firstCommit.open();
    for (std::thread& submitter : submitters)
        submitter.join();
    host::commitHook = nullptr;
    EXPECT_EQ(journal->waiting(), kSubmitters);
    EXPECT_LE(journal->transactions() - before, kSubmitters / 10U);
}

}  // namespace
