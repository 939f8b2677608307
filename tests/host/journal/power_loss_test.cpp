// ctest-label: threaded
// What is left of a journal when the power goes: whatever was synced, and nothing else.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <exception>
#include <iostream>
#include <random>

#include "host/journal/commit_step.h"
#include "host/journal/journal_fixture.h"
#include "host/journal/lossy_files.h"

namespace {

using host::CommitStep;
using host::Database;
using host::Task;
using host::TaskState;
using host::TaskWay;

class PowerLoss : public JournalTest {
protected:
    /// Does this in a process of its own that loses its power at the end of it, or earlier.
    template <typename Work>
    void withPowerLoss(Work work) {
        const pid_t child = ::fork();
        if (child == 0) {
            writeOnlyWhatIsSynced();
            try {
                work();
            } catch (const std::exception& error) {
                std::cerr << error.what() << std::endl;
                ::_exit(1);
            }
            ::_exit(9);
        }
        int status = 0;
        ASSERT_EQ(::waitpid(child, &status, 0), child);
        ASSERT_EQ(WEXITSTATUS(status), 9);
    }
    /// One row in a database with this durability; how many are left of it.
    std::int64_t leftOfOne(const char* synchronous) {
        const std::string file = scratch.path(synchronous);
        const std::string pragma = std::string("PRAGMA synchronous = ") + synchronous;
        {
            Database made(file);
            made.run("PRAGMA journal_mode = WAL; CREATE TABLE t (a INTEGER)");
        }
        withPowerLoss([&] {
            Database database(file);
            database.run(pragma.c_str());
            database.run("INSERT INTO t VALUES (1)");
        });
        return Database(file).number("SELECT count(*) FROM t");
    }
};

TEST_F(PowerLoss, TakesWhatWasNotSynced) {
    EXPECT_EQ(leftOfOne("OFF"), 0) << "else this layer would show nothing";
    EXPECT_EQ(leftOfOne("FULL"), 1);
}

TEST_F(PowerLoss, LeavesWhatWasAcceptedHandedOverAndEnded) {
    withPowerLoss([this] {
        open();
        journal->saveOutcome({ended(entered("over"))}, "row");
        Task task = entered("running");
        task.run = journal->run();
        journal->save(task);
        entered("waiting");
    });
    open();
    EXPECT_EQ(stateOf("over"), TaskState::Done);
    EXPECT_EQ(stateOf("running"), TaskState::Interrupted);
    EXPECT_EQ(stateOf("waiting"), TaskState::Queued);
    EXPECT_EQ(journal->recovered().fault, "");
}

TEST_F(PowerLoss, LeavesAWishToCancel) {
    withPowerLoss([this] {
        open();
        Task task = entered("t1");
        task.run = journal->run();
        journal->save(task);
        journal->cancel(task.number);
    });
    open();
    EXPECT_EQ(stateOf("t1"), TaskState::Cancelled);
}

/// After so many steps of transactions the power goes.
int stepsLeft = 0;
void loseAtStep(CommitStep) {
    if (--stepsLeft == 0) ::_exit(9);
}

TEST_F(PowerLoss, AtAnyMomentLosesNothingThatWasAnsweredAndKeepsTheJournalSound) {
    const unsigned seed = std::random_device()();
    std::cout << "seed " << seed << std::endl;
    std::mt19937 random(seed);
    int number = 0;
    for (int round = 0; round < 12; ++round) {
        stepsLeft = std::uniform_int_distribution<int>(1, 40)(random);
        const std::string answered = "answered" + std::to_string(round);
        withPowerLoss([&] {
            open();
            host::commitHook = loseAtStep;
            for (int i = 0; i < 20; ++i) {
                const Task task = entered("t" + std::to_string(number + i));
                scratch.write(answered, std::to_string(i + 1));
                if (i % 3 == 0) journal->saveOutcome({ended(task)}, "row");
            }
        });
        open();
        EXPECT_EQ(journal->recovered().fault, "") << "round " << round;
        const std::string last = scratch.read(answered);
        for (int i = 0; i < std::atoi(last.c_str()); ++i) {
            EXPECT_TRUE(journal->find("t" + std::to_string(number + i)).has_value())
                << "round " << round << " task " << i;
        }
        journal.reset();
        number += 20;
    }
}

}  // namespace
