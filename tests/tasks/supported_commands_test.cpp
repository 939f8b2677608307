#include "tasks/supported_commands.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/trace_capture.h"
#include "tasks/task_state.h"

namespace {

using Texts = std::vector<std::string>;

class SupportedCommands : public testing::Test {
protected:
    SupportedCommands() { commands = {"START", "REMOVEINSTANCE", "GETCONFIG"}; }
    ~SupportedCommands() override { commands.clear(); }
};

TEST_F(SupportedCommands, AreThoseInTheListSpelledExactlySo) {
    EXPECT_TRUE(isSupportedTask("START"));
    EXPECT_TRUE(isSupportedTask("GETCONFIG"));
    EXPECT_FALSE(isSupportedTask("getconfig"));
    EXPECT_FALSE(isSupportedTask("START "));
    EXPECT_FALSE(isSupportedTask("STOP"));
    EXPECT_FALSE(isSupportedTask(""));
}

TEST_F(SupportedCommands, MayBeAdded) {
    EXPECT_FALSE(isSupportedTask("EXTRA"));
    commands.push_back("EXTRA");
    EXPECT_TRUE(isSupportedTask("EXTRA"));
}

TEST_F(SupportedCommands, AreNoneInAnEmptyList) {
    commands.clear();
    EXPECT_FALSE(isSupportedTask("START"));
}

TEST_F(SupportedCommands, AreTracedAtDetailLevelAndOthersAsErrors) {
    const TraceCapture trace;
    isSupportedTask("START");
    isSupportedTask("DANCE");
    EXPECT_EQ(trace.details("zavtasks"), (Texts{"Command START is supported"}));
    EXPECT_EQ(trace.errors("zavtasks"), (Texts{"Command DANCE is NOT supported"}));
}

TEST_F(SupportedCommands, AreListedInOrderWithCommasBetweenThem) {
    const TraceCapture trace;
    getSupportedTasks();
    EXPECT_EQ(trace.details("zavtasks"),
              (Texts{"Commands supported are: START,REMOVEINSTANCE,GETCONFIG"}));
}

TEST_F(SupportedCommands, AreNotListedWithoutDetailTraces) {
    const TraceCapture trace("ERROR");
    getSupportedTasks();
    EXPECT_TRUE(trace.lines().empty());
}

}  // namespace
