#include "tasks/zavtqelm.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <utility>

#include "support/fake_sleep.h"
#include "support/outcomes.h"
#include "support/row_text.h"
#include "support/trace_capture.h"
#include "tables/zav02agt.h"

using ZAV::String;

namespace {

std::string text(const String& value) {
    return static_cast<const char*>(value.c_str());
}

TaskQueueElem sample() {
    TaskQueueElem task("node", "tx-1", "START", "ux", "ctx", "INSTANCE", "uaconf", "script",
                       "062000000", "host:UX");
    task.setRetmsgid("ZAV1024E");
    task.setRetmsgparm("the command");
    return task;
}

/// The row's bytes in memory.
template <typename Row>
std::string bytes(const Row& row) {
    return std::string(reinterpret_cast<const char*>(&row), sizeof row);
}

std::string integerBytes(int value) {
    return std::string(reinterpret_cast<const char*>(&value), sizeof value);
}

/// The widths to which values were truncated, in the order in which the fields are written.
std::vector<int> widthsOfCuts(const TraceCapture& trace) {
    const std::string before = "exceeded the maximum size of ";
    std::vector<int> widths;
    for (const std::string& line : trace.errors("zavtqelm")) {
        widths.push_back(std::stoi(line.substr(line.find(before) + before.size())));
    }
    return widths;
}

TEST(TaskRecord, IsEmptyAtFirst) {
    const TaskQueueElem task;
    for (const String& value : {task.getCommand(), task.getTransid(), task.getProduct(),
                                task.getContext(), task.getOptional(), task.getUaconfig(),
                                task.getUascript(), task.getVersion(), task.getTargetmsn()}) {
        EXPECT_EQ(0u, value.length());
    }
    EXPECT_EQ(std::string(4196, '\0'), bytes(task.getReturnResults()));
}

TEST(TaskRecord, TakesItsTenValuesInOrder) {
    TaskQueueElem task("node", "tx-1", "START", "ux", "ctx", "opt", "uaconf", "script", "0620",
                       "host:UX");
    EXPECT_EQ("tx-1", text(task.getTransid()));
    EXPECT_EQ("START", text(task.getCommand()));
    EXPECT_EQ("ux", text(task.getProduct()));
    EXPECT_EQ("ctx", text(task.getContext()));
    EXPECT_EQ("opt", text(task.getOptional()));
    EXPECT_EQ("uaconf", text(task.getUaconfig()));
    EXPECT_EQ("script", text(task.getUascript()));
    EXPECT_EQ("0620", text(task.getVersion()));
    EXPECT_EQ("host:UX", text(task.getTargetmsn()));
    task.ReturnStatus(0);
    const zav_kagreqt_data_t row = task.getReturnResults();
    EXPECT_EQ(padded("node", 64), fieldText(row.originnode));
    EXPECT_EQ(padded("", 16), fieldText(row.retmsgid));
    EXPECT_EQ(padded("", 256), fieldText(row.retmsgparm));
}

TEST(TaskRecord, SettersReplaceTheValuesOneByOne) {
    TaskQueueElem task = sample();
    task.setOriginnode("1");
    task.setTransid("2");
    task.setCommand("3");
    task.setProduct("4");
    task.setContext("5");
    task.setOptional("6");
    task.setUaconfig("7");
    task.setUascript("8");
    task.setVersion("9");
    task.setTargetmsn("10");
    task.setRetmsgid("11");
    task.setRetmsgparm("12");
    task.ReturnStatus(1);
    const zav_kagreqt_data_t row = task.getReturnResults();
    EXPECT_EQ("1", trimmedField(row.originnode));
    EXPECT_EQ("2", trimmedField(row.transid));
    EXPECT_EQ("3", trimmedField(row.command));
    EXPECT_EQ("4", trimmedField(row.product));
    EXPECT_EQ("5", trimmedField(row.context));
    EXPECT_EQ("6", trimmedField(row.optional));
    EXPECT_EQ("7", trimmedField(row.uaconfig));
    EXPECT_EQ("8", trimmedField(row.uascript));
    EXPECT_EQ("9", trimmedField(row.version));
    EXPECT_EQ("10", trimmedField(row.targetmsn));
    EXPECT_EQ("11", trimmedField(row.retmsgid));
    EXPECT_EQ("12", trimmedField(row.retmsgparm));
    EXPECT_EQ("2", text(task.getTransid()));
    EXPECT_EQ("3", text(task.getCommand()));
    EXPECT_EQ("10", text(task.getTargetmsn()));
}

TEST(TaskRecord, ACopyHasTheValuesAndTheRow) {
    TaskQueueElem task = sample();
    task.ReturnStatus(1024);
    const TaskQueueElem copy(task);
    EXPECT_EQ(bytes(task.getReturnResults()), bytes(copy.getReturnResults()));
    EXPECT_EQ("tx-1", text(copy.getTransid()));

    task.setTransid("other");
    task.ReturnStatus(0);
    EXPECT_EQ("tx-1", text(copy.getTransid()));
    EXPECT_EQ(1024, copy.getReturnResults().retval);
}

TEST(TaskRecord, AMovedRecordHasTheValuesAndTheRow) {
    TaskQueueElem task = sample();
    task.ReturnStatus(1024);
    const std::string row = bytes(task.getReturnResults());
    TaskQueueElem moved(std::move(task));
    EXPECT_EQ("tx-1", text(moved.getTransid()));
    EXPECT_EQ(row, bytes(moved.getReturnResults()));
    TaskQueueElem assigned;
    assigned = std::move(moved);
    EXPECT_EQ("host:UX", text(assigned.getTargetmsn()));
    EXPECT_EQ(row, bytes(assigned.getReturnResults()));
}

TEST(SetValueAndPad, PadsWithBlanks) {
    TraceCapture trace;
    char field[8] = "######";
    TaskQueueElem::SetValueAndPad(field, 6, "ab");
    EXPECT_EQ(std::string("ab    \0\0", 8), std::string(field, 8));
    TaskQueueElem::SetValueAndPad(field, 6, "");
    EXPECT_EQ(std::string("      \0\0", 8), std::string(field, 8));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(SetValueAndPad, AValueOfTheFieldsSizeFillsIt) {
    TraceCapture trace;
    char field[8] = "#######";
    TaskQueueElem::SetValueAndPad(field, 6, "abcdef");
    EXPECT_STREQ("abcdef#", field);
    EXPECT_TRUE(trace.errors().empty());
}

TEST(SetValueAndPad, ALongerValueIsCutAndTraced) {
    TraceCapture trace;
    char field[8] = "#######";
    TaskQueueElem::SetValueAndPad(field, 6, "abcdefg");
    EXPECT_STREQ("abcdef#", field);
    EXPECT_EQ(
        std::vector<std::string>{
            "Result data \"abcdefg\" was truncated to \"abcdef\" because it exceeded the "
            "maximum size of 6 characters"},
        trace.errors("zavtqelm"));
}

TEST(ReturnStatus, FillsEveryByteOfTheRow) {
    TaskQueueElem task = sample();
    task.ReturnStatus(1024);
    const std::string expected = padded("node", 64) + padded("tx-1", 84) + padded("START", 16) +
                                 padded("ux", 32) + padded("ctx", 3072) + padded("INSTANCE", 32) +
                                 padded("uaconf", 32) + padded("script", 512) + integerBytes(1024) +
                                 padded("062000000", 12) + padded("ZAV1024E", 16) +
                                 padded("the command", 256) + padded("host:UX", 64);
    ASSERT_EQ(4196u, expected.size());
    EXPECT_EQ(expected, bytes(task.getReturnResults()));
}

TEST(ReturnStatus, EmptyFieldsBecomeBlanks) {
    TaskQueueElem task;
    task.ReturnStatus(0);
    std::string expected(4196, ' ');
    expected.replace(3844, 4, 4, '\0');
    EXPECT_EQ(expected, bytes(task.getReturnResults()));
}

TEST(ReturnStatus, IsTracedAndSendsNothing) {
    TaskQueueElem task = sample();
    Outcomes outcomes;
    fake_sleep::reset();
    TraceCapture trace;
    task.ReturnStatus(1024);
    EXPECT_EQ(std::vector<std::string>{"Returning status return code [1024], message id "
                                       "[ZAV1024E] parms [the command]"},
              trace.details("zavtqelm"));
    EXPECT_TRUE(outcomes.rows().empty());
    EXPECT_TRUE(fake_sleep::slept().empty());
}

TEST(ReturnStatus, AContextOneTooLongIsCutWithOneTraceLine) {
    TaskQueueElem task = sample();
    const std::string value(3073, 'x');
    task.setContext(value.c_str());
    TraceCapture trace;
    task.ReturnStatus(0);
    EXPECT_EQ(std::string(3072, 'x'), fieldText(task.getReturnResults().context));
    EXPECT_EQ(padded("INSTANCE", 32), fieldText(task.getReturnResults().optional));
    EXPECT_EQ(
        std::vector<std::string>{"Result data \"" + value + "\" was truncated to \"" +
                                 std::string(3072, 'x') +
                                 "\" because it exceeded the maximum size of 3072 characters"},
        trace.errors());
}

TEST(ReturnStatus, EveryFieldIsCutToItsOwnWidth) {
    const std::string longer(4000, 'y');
    const String value(longer.c_str());
    TaskQueueElem task(value, value, value, value, value, value, value, value, value, value);
    task.setRetmsgid(value);
    task.setRetmsgparm(value);
    TraceCapture trace;
    task.ReturnStatus(7);
    std::string expected(4196, 'y');
    expected.replace(3844, 4, integerBytes(7));
    EXPECT_EQ(expected, bytes(task.getReturnResults()));
    EXPECT_EQ((std::vector<int>{64, 84, 16, 32, 3072, 32, 32, 512, 12, 16, 256, 64}),
              widthsOfCuts(trace));
}

TEST(ReturnAsyncStatus, PublishesOneRow) {
    TaskQueueElem task = sample();
    Outcomes outcomes;
    task.returnAsyncStatus(1024);
    const auto rows = outcomes.rows();
    ASSERT_EQ(1u, rows.size());
    const std::string expected = padded("node", 64) + padded("tx-1", 84) + padded("START", 16) +
                                 integerBytes(1024) + padded("ZAV1024E", 16) +
                                 padded("the command", 256) + padded("host:UX", 64);
    ASSERT_EQ(504u, expected.size());
    EXPECT_EQ(expected, bytes(rows[0]));
}

TEST(ReturnAsyncStatus, SleepsOneSecondBeforeTheRow) {
    static std::vector<unsigned> sleptBefore;
    sleptBefore.clear();
    ASSERT_EQ(0, zav_kagdyst_init());
    fake_sleep::reset();
    const auto subscription = oxa::subscribe("KAGDYST", {}, [](const oxa::Rows&) {
        sleptBefore = fake_sleep::slept();
        return 0;
    });
    TaskQueueElem task = sample();
    task.returnAsyncStatus(0);
    EXPECT_EQ(std::vector<unsigned>{1}, sleptBefore);
    EXPECT_EQ(std::vector<unsigned>{1}, fake_sleep::slept());
}

TEST(ReturnAsyncStatus, IsTraced) {
    TaskQueueElem task = sample();
    TraceCapture trace;
    task.returnAsyncStatus(0);
    EXPECT_EQ(std::vector<std::string>{"Returning aysnc status return code [0], message id "
                                       "[ZAV1024E] parms [the command]"},
              trace.details("zavtqelm"));
}

TEST(ReturnAsyncStatus, LeavesTheRequestsRowAlone) {
    TaskQueueElem task = sample();
    task.ReturnStatus(0);
    const std::string before = bytes(task.getReturnResults());
    task.setRetmsgid("ZAV1025E");
    task.returnAsyncStatus(1025);
    EXPECT_EQ(before, bytes(task.getReturnResults()));
}

TEST(ReturnAsyncStatus, CutsWhatIsTooLong) {
    TaskQueueElem task = sample();
    const std::string value(257, 'z');
    task.setRetmsgparm(value.c_str());
    Outcomes outcomes;
    TraceCapture trace;
    task.returnAsyncStatus(1024);
    const auto rows = outcomes.rows();
    ASSERT_EQ(1u, rows.size());
    EXPECT_EQ(std::string(256, 'z'), fieldText(rows[0].retmsgparm));
    EXPECT_EQ(padded("host:UX", 64), fieldText(rows[0].targetmsn));
    EXPECT_EQ(1u, trace.errors("zavtqelm").size());
}

TEST(ReturnAsyncStatus, CutsEveryFieldToItsOwnWidth) {
    const String value(std::string(300, 'y').c_str());
    TaskQueueElem task(value, value, value, value, value, value, value, value, value, value);
    task.setRetmsgid(value);
    task.setRetmsgparm(value);
    Outcomes outcomes;
    TraceCapture trace;
    task.returnAsyncStatus(7);
    const auto rows = outcomes.rows();
    ASSERT_EQ(1u, rows.size());
    std::string expected(504, 'y');
    expected.replace(164, 4, integerBytes(7));
    EXPECT_EQ(expected, bytes(rows[0]));
    EXPECT_EQ((std::vector<int>{64, 84, 16, 64, 16, 256}), widthsOfCuts(trace));
}

}  // namespace
