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
    EXPECT_EQ("", narrow(joinValues({})));
    EXPECT_EQ("a", narrow(joinValues({"a"})));
    EXPECT_EQ("a,,b", narrow(joinValues({"a", "", "b"})));
}

TEST(MessageParameters, HoldNumbersInDecimal) {
    EXPECT_EQ("0", narrow(decimal(0)));
    EXPECT_EQ("-7", narrow(decimal(-7)));
    EXPECT_EQ("2147483647", narrow(decimal(2147483647)));
}

TEST(MessageParameters, HoldSomeExitCodesAsOneCharacter) {
    EXPECT_EQ("A", narrow(asCharacter(65)));
    ASSERT_EQ(1u, asCharacter(0x1234041).length());
    EXPECT_EQ(0x4041, asCharacter(0x1234041)[0]);
}

TEST(MessageParameters, BeginWithCommandAndProduct) {
    TaskQueueElem task;
    task.setCommand("SETCONFIG");
    task.setProduct("ux");
    EXPECT_EQ("SETCONFIG,ux", narrow(commandAndProduct(task)));
}

TEST(SetFailure, PutsMessageIdAndParameterIntoTheTask) {
    TaskQueueElem task;
    const TraceCapture trace;
    EXPECT_EQ(TASK_INSTALL_FAILED, setFailure(task, TASK_INSTALL_FAILED, "why"));
    EXPECT_EQ("ZAV1031E", trimmedField(rowOf(task).retmsgid));
    EXPECT_EQ("why", trimmedField(rowOf(task).retmsgparm));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(FailTask, AlsoTracesAnErrorThatBeginsWithTheMessageId) {
    TaskQueueElem task;
    const TraceCapture capture;
    const ZAV::Trace trace(traceUnit);
    EXPECT_EQ(TASK_NO_DPTYPE, failTask(trace(), task, TASK_NO_DPTYPE, "file",
                                       "%s Bad code [%d] from [%s]", 3, "x"));
    EXPECT_EQ((std::vector<std::string>{"ZAV1023E Bad code [3] from [x]"}),
              capture.errors("failure_test"));
    EXPECT_EQ("ZAV1023E", trimmedField(rowOf(task).retmsgid));
    EXPECT_EQ("file", trimmedField(rowOf(task).retmsgparm));
}

}  // namespace
