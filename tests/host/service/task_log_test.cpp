// ctest-label: threaded
#include "host/service/task_log.h"

#include <gtest/gtest.h>

#include <vector>

#include "host/journal/journal_fixture.h"

namespace {

using host::Priority;
using host::Task;
using host::TaskLog;
using host::TaskState;
using Lines = std::vector<std::string>;

class LogOfTasks : public JournalTest {
protected:
    /// What a look says.
    Lines look(TaskLog& log) {
        lines.clear();
        log.look();
        return lines;
    }
    TaskLog::Say into() {
        return [this](Priority priority, const std::string& line, const std::string& task) {
            EXPECT_EQ(line.rfind("task " + task + " ", 0), 0U) << line;
            lines.push_back(std::to_string(static_cast<int>(priority)) + " " + line);
        };
    }
    static Task begun(Task task) {
        task.state = TaskState::Running;
        task.started = host::WallClock::now();
        return task;
    }
    Task enteredWithRequest(const std::string& transid) {
        Task task = asked(transid, host::TaskWay::Query);
        task.run = journal->run();
        task.request = {{"COMMAND", "START"}, {"PRODUCT", "ux"}};
        journal->enter(task);
        return task;
    }
    /// The end of a task as an outcome brings it.
    void end(Task task, TaskState state, int seconds) {
        task = ended(std::move(task), state);
        if (task.started) task.ended = *task.started + std::chrono::seconds(seconds);
        journal->save(task);
    }

    Lines lines;
};

TEST_F(LogOfTasks, SaysWhenATaskBeginsAndWhenItEnds) {
    open();
    TaskLog log(*journal, into());
    Task task = enteredWithRequest("T-1");
    EXPECT_EQ(look(log), Lines{}) << "it waits";
    task = begun(task);
    journal->save(task);
    EXPECT_EQ(look(log), Lines{"6 task " + task.id + " begins: START ux, asked for by somebody"});
    EXPECT_EQ(look(log), Lines{}) << "it goes on";
    end(task, TaskState::Done, 3);
    EXPECT_EQ(look(log), Lines{"6 task " + task.id + " is done after 3 s: START ux"});
    EXPECT_EQ(look(log), Lines{});
}

TEST_F(LogOfTasks, ATaskBetweenTwoLooksGetsBothLines) {
    open();
    TaskLog log(*journal, into());
    const Task task = begun(enteredWithRequest("T-1"));
    journal->save(task);
    end(task, TaskState::Failed, 0);
    EXPECT_EQ(look(log), (Lines{"6 task " + task.id + " begins: START ux, asked for by somebody",
                                "4 task " + task.id + " has failed after 0 s: START ux"}));
}

TEST_F(LogOfTasks, ATaskThatNeverBeganHasAnEndAndItsReason) {
    open();
    TaskLog log(*journal, into());
    Task task = enteredWithRequest("T-1");
    task.reason = "there is no product ux";
    end(task, TaskState::Refused, 0);
    EXPECT_EQ(look(log),
              Lines{"4 task " + task.id + " was refused: START ux; there is no product ux"});
}

TEST_F(LogOfTasks, WhatEndedBeforeIsNotTold) {
    open();
    end(begun(enteredWithRequest("T-1")), TaskState::Done, 1);
    TaskLog log(*journal, into());
    EXPECT_EQ(look(log), Lines{});
}

}  // namespace
