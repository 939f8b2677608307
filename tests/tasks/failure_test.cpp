#include "tasks/failure.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/row_text.h"
#include "support/trace_capture.h"

using ZAV::String;

namespace {

RAS1_UNIT traceUnit{"failure_test"};

std::string narrow(const String& text) {
    return static_cast<const char*>(text.c_str());
}

zav_kagreqt_data_t rowOf(TaskQueueElem task) {
    task.ReturnStatus(0);
    return task.getReturnResults();
}

TEST(MessageParameters, AreJoinedByCommas) {
    EXPECT_EQ(narrow(joinValues({})), "");
    EXPECT_EQ(narrow(joinValues({"a"})), "a");
    EXPECT_EQ(narrow(joinValues({"a", "", "b"})), "a,,b");
}

TEST(MessageParameters, HoldNumbersInDecimal) {
    EXPECT_EQ(narrow(decimal(0)), "0");
    EXPECT_EQ(narrow(decimal(-7)), "-7");
    EXPECT_EQ(narrow(decimal(2147483647)), "2147483647");
}

TEST(MessageParameters, HoldSomeExitCodesAsOneCharacter) {
    EXPECT_EQ(narrow(asCharacter(65)), "A");
    ASSERT_EQ(asCharacter(0x1234041).length(), 1u);
    EXPECT_EQ(asCharacter(0x1234041)[0], 0x4041);
}

TEST(MessageParameters, BeginWithCommandAndProduct) {
    TaskQueueElem task;
    task.setCommand("SETCONFIG");
    task.setProduct("ux");
    EXPECT_EQ(narrow(commandAndProduct(task)), "SETCONFIG,ux");
}

TEST(SetFailure, PutsMessageIdAndParameterIntoTheTask) {
    TaskQueueElem task;
    const TraceCapture trace;
    EXPECT_EQ(setFailure(task, TASK_INSTALL_FAILED, "why"), TASK_INSTALL_FAILED);
    EXPECT_EQ(trimmedField(rowOf(task).retmsgid), "ZAV1031E");
    EXPECT_EQ(trimmedField(rowOf(task).retmsgparm), "why");
    EXPECT_TRUE(trace.errors().empty());
}

TEST(FailTask, AlsoTracesAnErrorThatBeginsWithTheMessageId) {
    TaskQueueElem task;
    const TraceCapture capture;
    const ZAV::Trace trace(traceUnit);
    EXPECT_EQ(failTask(trace(), task, TASK_NO_DPTYPE, "file", "%s Bad code [%d] from [%s]", 3, "x"),
              TASK_NO_DPTYPE);
    EXPECT_EQ(capture.errors("failure_test"),
              (std::vector<std::string>{"ZAV1023E Bad code [3] from [x]"}));
    EXPECT_EQ(trimmedField(rowOf(task).retmsgid), "ZAV1023E");
    EXPECT_EQ(trimmedField(rowOf(task).retmsgparm), "file");
}

}  // namespace
