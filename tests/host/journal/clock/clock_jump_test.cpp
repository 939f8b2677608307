// ctest-label: threaded
// A date that jumps to and fro while a journal is at work.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

#include "faults/fault_injection.h"
#include "host/journal/journal_fixture.h"

namespace {

using host::Task;
using host::TaskState;

constexpr long kDay = 24 * 60 * 60;

class JournalsDate : public JournalTest {};

TEST_F(JournalsDate, NeverGoesBackForTasksThatExpire) {
    open();
    for (const long step : {kDay, -kDay}) {
        const faults::JumpingDate jumping(step);
        auto before = journal->latestTime();
        for (int look = 0; look < 10; ++look) {
            const auto now = journal->latestTime();
            EXPECT_GE(now, before);
            before = now;
        }
        EXPECT_GT(jumping.looks(), 0);
    }
}

TEST_F(JournalsDate, NeverGoesBackBehindWhatAnEarlierRunWroteDown) {
    open();
    const auto tomorrow = host::WallClock::now() + std::chrono::hours(24);
    Task task = ended(entered("t1"));
    task.ended = tomorrow;
    journal->save(task);
    open();
    EXPECT_GE(journal->latestTime(), tomorrow - std::chrono::microseconds(1));
}

TEST_F(JournalsDate, IsLookedAtInTheTransactionThatRecordsAHandOver) {
    open();
    Task late = asked("t1");
    late.expires = host::WallClock::now() + std::chrono::hours(1);
    journal->enter(late);
    Task handedOver = late;
    handedOver.run = journal->run();
    {
        const faults::JumpingDate jumping(kDay);
        for (int look = 0; look < 10; ++look)
            journal->latestTime();
        EXPECT_THROW(journal->handOver(handedOver), host::TooLate);
    }
    EXPECT_EQ(journal->find("t1")->run, std::nullopt);
    EXPECT_EQ(stateOf("t1"), TaskState::Queued);
}

TEST_F(JournalsDate, DoesNotDecideWhatComesNext) {
    open();
    std::vector<std::string> line;
    {
        const faults::JumpingDate jumping(kDay);
        for (const char* transid : {"t1", "t2", "t3", "t4"})
            entered(transid);
    }
    open();
    while (const std::optional<Task> task = journal->nextInLine()) {
        line.push_back(task->transid);
        const faults::JumpingDate jumping(-kDay);
        journal->save(ended(*task));
    }
    EXPECT_THAT(line, testing::ElementsAre("t1", "t2", "t3", "t4"));
    EXPECT_EQ(stateOf("t4"), TaskState::Done);
}

}  // namespace
