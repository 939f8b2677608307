#include "tasks/required_parameter.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/row_text.h"
#include "support/trace_capture.h"
#include "tasks/zavtqelm.h"

namespace {

using Texts = std::vector<std::string>;

std::string messageOf(TaskQueueElem task) {
    task.ReturnStatus(0);
    const zav_kagreqt_data_t row = task.getReturnResults();
    return trimmedField(row.retmsgid) + "|" + trimmedField(row.retmsgparm);
}

TaskQueueElem taskWithMessage() {
    TaskQueueElem task;
    task.setRetmsgid("old");
    task.setRetmsgparm("parameter");
    return task;
}

TEST(RequiredParameterOk, KeepsCodeAndMessageWhenThereIsAValue) {
    TaskQueueElem task = taskWithMessage();
    const TraceCapture trace;
    EXPECT_EQ(requiredParameterOk("X", "value", task, TASK_NO_COMMAND, TASK_NO_TRANSID),
              TASK_NO_COMMAND);
    EXPECT_TRUE(trace.errors().empty());
    EXPECT_EQ(messageOf(task), "old|parameter");
}

TEST(RequiredParameterOk, ReplacesCodeAndMessageWhenThereIsNone) {
    TaskQueueElem task = taskWithMessage();
    const TraceCapture trace;
    EXPECT_EQ(requiredParameterOk("X", "", task, TASK_NO_COMMAND, TASK_NO_TRANSID),
              TASK_NO_TRANSID);
    EXPECT_EQ(trace.errors("zavtasks"),
              (Texts{"ZAV1002E No [X] specified, it is a required parameter"}));
    EXPECT_EQ(messageOf(task), "ZAV1002E|");
}

TEST(RequiredParameterOk, AcceptsAValueOfBlanks) {
    TaskQueueElem task;
    EXPECT_EQ(requiredParameterOk("X", " ", task, TASK_OK, TASK_NO_TRANSID), TASK_OK);
}

}  // namespace
