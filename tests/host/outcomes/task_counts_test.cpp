#include "host/outcomes/task_counts.h"

#include <gtest/gtest.h>

#include <map>

namespace {

using host::Task;
using host::TaskCounts;
using host::TaskState;

Task taskOf(const std::string& command, TaskState state) {
    Task task;
    task.request = {{"COMMAND", command}};
    task.state = state;
    return task;
}

/// The ends that there were, as "COMMAND state".
std::map<std::string, std::uint64_t> endsIn(const TaskCounts& counts) {
    std::map<std::string, std::uint64_t> ends;
    counts.eachEnd([&](std::string_view command, std::string_view state, std::uint64_t count) {
        if (count > 0) ends[std::string(command) + " " + std::string(state)] = count;
    });
    return ends;
}

TEST(CountsOfTasks, TellCommandsAndEndsApart) {
    TaskCounts counts;
    counts.add(taskOf("START", TaskState::Done));
    counts.add(taskOf("START", TaskState::Done));
    counts.add(taskOf("START", TaskState::Failed));
    counts.add(taskOf("GETCONFIG", TaskState::Refused));
    EXPECT_EQ(endsIn(counts),
              (std::map<std::string, std::uint64_t>{
                  {"START done", 2}, {"START failed", 1}, {"GETCONFIG refused", 1}}));
}

TEST(CountsOfTasks, HaveOneSeriesForAllCommandsThatThePluginDoesNotKnow) {
    TaskCounts counts;
    for (int i = 0; i < 100; ++i)
        counts.add(taskOf("MADE-UP-" + std::to_string(i), TaskState::Refused));
    counts.add(taskOf("", TaskState::Refused));
    EXPECT_EQ(endsIn(counts), (std::map<std::string, std::uint64_t>{{"other refused", 101}}));
}

TEST(CountsOfTasks, HaveEveryCommandAndEveryEndFromTheStart) {
    const TaskCounts counts;
    std::map<std::string, int> commands;
    counts.eachEnd([&](std::string_view command, std::string_view, std::uint64_t count) {
        ++commands[std::string(command)];
        EXPECT_EQ(count, 0U);
    });
    EXPECT_EQ(commands, (std::map<std::string, int>{{"START", 6},
                                                    {"STOP", 6},
                                                    {"RESTART", 6},
                                                    {"INSTALL", 6},
                                                    {"UNINSTALL", 6},
                                                    {"SETCONFIG", 6},
                                                    {"REMOVEINSTANCE", 6},
                                                    {"GETCONFIG", 6},
                                                    {"COMPLETE_INSTALL", 6},
                                                    {"other", 6}}));
}

TEST(CountsOfTasks, MeasureOnlyTasksThatRan) {
    TaskCounts counts;
    Task ran = taskOf("STOP", TaskState::Done);
    ran.started = host::WallClock::time_point(std::chrono::seconds(100));
    ran.ended = *ran.started + std::chrono::seconds(7);
    counts.add(ran);
    Task expired = taskOf("STOP", TaskState::Expired);
    expired.ended = ran.ended;
    counts.add(expired);
    const metrics::Histogram::Snapshot taken = counts.durations().at("STOP").snapshot();
    EXPECT_EQ(taken.count, 1U);
    EXPECT_EQ(taken.sum, std::chrono::seconds(7));
    EXPECT_EQ(counts.durations().at("START").snapshot().count, 0U);
}

}  // namespace
