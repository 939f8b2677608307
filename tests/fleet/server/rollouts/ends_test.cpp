/// What roll-outs make of the ends that hosts tell.
#include <gtest/gtest.h>

#include <string>

#include "fleet/server/rollouts/end_states.h"
#include "fleet/server/rollouts/short_reason.h"

namespace {

TEST(EndStates, FailuresAreAllThatMayBeASignOfHarm) {
    for (const char* const end : {"failed", "refused", "interrupted", "unknown", "never heard of"})
        EXPECT_TRUE(fleet::isFailure(end)) << end;
    for (const char* const end : {"done", "cancelled", "expired"})
        EXPECT_FALSE(fleet::isFailure(end)) << end;
}

TEST(EndStates, WhatDidNotSucceedIsTriedAgain) {
    for (const char* const end : {"failed", "refused", "interrupted", "expired"})
        EXPECT_TRUE(fleet::mayTryAgain(end, false)) << end;
    for (const char* const end : {"done", "cancelled"})
        EXPECT_FALSE(fleet::mayTryAgain(end, true)) << end;
    EXPECT_FALSE(fleet::mayTryAgain("unknown", false));
    EXPECT_TRUE(fleet::mayTryAgain("unknown", true));
}

std::string reasonIn(const std::string& task) {
    fleet::Outcome outcome;
    outcome.task = task;
    return fleet::shortReason(outcome);
}

TEST(ShortReason, IsTheTasksOwn) {
    EXPECT_EQ(reasonIn(R"({"reason":"no such product","events":[{"RETVAL":3}]})"),
              "no such product");
}

TEST(ShortReason, IsElseWhatTheLastEventSays) {
    EXPECT_EQ(reasonIn(R"({"reason":"","events":[{"RETVAL":1},
                          {"RETVAL":12,"RETMSGID":"M12","RETMSGPARM":"ux"},null]})"),
              "return code 12, M12, ux");
    EXPECT_EQ(reasonIn(R"({"events":[{"RETVAL":0}]})"), "return code 0");
}

TEST(ShortReason, IsEmptyForDocumentsThatSayNothing) {
    for (const char* const task :
         {"", "{}", "[]", "no JSON", R"({"reason":[]})", R"({"events":{}})", R"({"events":[]})",
          R"({"events":[7]})", R"({"events":[{"RETVAL":{}}]})"})
        EXPECT_EQ(reasonIn(task), "") << task;
}

TEST(ShortReason, IsOneLineOfBoundedLengthAndWholeCharacters) {
    EXPECT_EQ(reasonIn(R"({"reason":"a\nb\u0000c\u007fd"})"), "a b c d");
    std::string two;
    for (int i = 0; i < 400; ++i)
        two += "\xC3\xA4";
    EXPECT_EQ(reasonIn(R"({"reason":")" + two + R"("})"), two.substr(0, 300));
    EXPECT_EQ(reasonIn(R"({"reason":"x)" + two + R"("})"), "x" + two.substr(0, 298));
}

}  // namespace
