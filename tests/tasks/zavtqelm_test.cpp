#include "tasks/zavtqelm.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <utility>

#include "support/fake_sleep.h"
#include "support/host/outcomes.h"
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
        EXPECT_EQ(value.length(), 0u);
    }
    EXPECT_EQ(bytes(task.getReturnResults()), std::string(4196, '\0'));
}

TEST(TaskRecord, TakesItsTenValuesInOrder) {
    TaskQueueElem task("node", "tx-1", "START", "ux", "ctx", "opt", "uaconf", "script", "0620",
                       "host:UX");
    EXPECT_EQ(text(task.getTransid()), "tx-1");
    EXPECT_EQ(text(task.getCommand()), "START");
    EXPECT_EQ(text(task.getProduct()), "ux");
    EXPECT_EQ(text(task.getContext()), "ctx");
    EXPECT_EQ(text(task.getOptional()), "opt");
    EXPECT_EQ(text(task.getUaconfig()), "uaconf");
    EXPECT_EQ(text(task.getUascript()), "script");
    EXPECT_EQ(text(task.getVersion()), "0620");
    EXPECT_EQ(text(task.getTargetmsn()), "host:UX");
    task.ReturnStatus(0);
    const zav_kagreqt_data_t row = task.getReturnResults();
    EXPECT_EQ(fieldText(row.originnode), padded("node", 64));
    EXPECT_EQ(fieldText(row.retmsgid), padded("", 16));
    EXPECT_EQ(fieldText(row.retmsgparm), padded("", 256));
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
    EXPECT_EQ(trimmedField(row.originnode), "1");
    EXPECT_EQ(trimmedField(row.transid), "2");
    EXPECT_EQ(trimmedField(row.command), "3");
    EXPECT_EQ(trimmedField(row.product), "4");
    EXPECT_EQ(trimmedField(row.context), "5");
    EXPECT_EQ(trimmedField(row.optional), "6");
    EXPECT_EQ(trimmedField(row.uaconfig), "7");
    EXPECT_EQ(trimmedField(row.uascript), "8");
    EXPECT_EQ(trimmedField(row.version), "9");
    EXPECT_EQ(trimmedField(row.targetmsn), "10");
    EXPECT_EQ(trimmedField(row.retmsgid), "11");
    EXPECT_EQ(trimmedField(row.retmsgparm), "12");
    EXPECT_EQ(text(task.getTransid()), "2");
    EXPECT_EQ(text(task.getCommand()), "3");
    EXPECT_EQ(text(task.getTargetmsn()), "10");
}

TEST(TaskRecord, ACopyHasTheValuesAndTheRow) {
    TaskQueueElem task = sample();
    task.ReturnStatus(1024);
    const TaskQueueElem copy(task);
    EXPECT_EQ(bytes(copy.getReturnResults()), bytes(task.getReturnResults()));
    EXPECT_EQ(text(copy.getTransid()), "tx-1");

    task.setTransid("other");
    task.ReturnStatus(0);
    EXPECT_EQ(text(copy.getTransid()), "tx-1");
    EXPECT_EQ(copy.getReturnResults().retval, 1024);
}

TEST(TaskRecord, AMovedRecordHasTheValuesAndTheRow) {
    TaskQueueElem task = sample();
    task.ReturnStatus(1024);
    const std::string row = bytes(task.getReturnResults());
    TaskQueueElem moved(std::move(task));
    EXPECT_EQ(text(moved.getTransid()), "tx-1");
    EXPECT_EQ(bytes(moved.getReturnResults()), row);
    TaskQueueElem assigned;
    assigned = std::move(moved);
    EXPECT_EQ(text(assigned.getTargetmsn()), "host:UX");
    EXPECT_EQ(bytes(assigned.getReturnResults()), row);
}

TEST(SetValueAndPad, PadsWithBlanks) {
    TraceCapture trace;
    char field[8] = "######";
    TaskQueueElem::SetValueAndPad(field, 6, "ab");
    EXPECT_EQ(std::string(field, 8), std::string("ab    \0\0", 8));
    TaskQueueElem::SetValueAndPad(field, 6, "");
    EXPECT_EQ(std::string(field, 8), std::string("      \0\0", 8));
    EXPECT_TRUE(trace.errors().empty());
}

TEST(SetValueAndPad, AValueOfTheFieldsSizeFillsIt) {
    TraceCapture trace;
    char field[8] = "#######";
    TaskQueueElem::SetValueAndPad(field, 6, "abcdef");
    EXPECT_STREQ(field, "abcdef#");
    EXPECT_TRUE(trace.errors().empty());
}

TEST(SetValueAndPad, ALongerValueIsCutAndTraced) {
    TraceCapture trace;
    char field[8] = "#######";
    TaskQueueElem::SetValueAndPad(field, 6, "abcdefg");
    EXPECT_STREQ(field, "abcdef#");
    EXPECT_EQ(trace.errors("zavtqelm"),
              std::vector<std::string>{
                  "Result data \"abcdefg\" was truncated to \"abcdef\" because it exceeded the "
                  "maximum size of 6 characters"});
}

TEST(ReturnStatus, FillsEveryByteOfTheRow) {
    TaskQueueElem task = sample();
    task.ReturnStatus(1024);
    const std::string expected = padded("node", 64) + padded("tx-1", 84) + padded("START", 16) +
                                 padded("ux", 32) + padded("ctx", 3072) + padded("INSTANCE", 32) +
                                 padded("uaconf", 32) + padded("script", 512) + integerBytes(1024) +
                                 padded("062000000", 12) + padded("ZAV1024E", 16) +
                                 padded("the command", 256) + padded("host:UX", 64);
    ASSERT_EQ(expected.size(), 4196u);
    EXPECT_EQ(bytes(task.getReturnResults()), expected);
}

TEST(ReturnStatus, EmptyFieldsBecomeBlanks) {
    TaskQueueElem task;
    task.ReturnStatus(0);
    std::string expected(4196, ' ');
    expected.replace(3844, 4, 4, '\0');
    EXPECT_EQ(bytes(task.getReturnResults()), expected);
}

TEST(ReturnStatus, IsTracedAndSendsNothing) {
    TaskQueueElem task = sample();
    Outcomes outcomes;
    fake_sleep::reset();
    TraceCapture trace;
    task.ReturnStatus(1024);
    EXPECT_EQ(trace.details("zavtqelm"),
              std::vector<std::string>{"Returning status return code [1024], message id "
                                       "[ZAV1024E] parms [the command]"});
    EXPECT_TRUE(outcomes.rows().empty());
    EXPECT_TRUE(fake_sleep::slept().empty());
}

TEST(ReturnStatus, AContextOneTooLongIsCutWithOneTraceLine) {
    TaskQueueElem task = sample();
    const std::string value(3073, 'x');
    task.setContext(value.c_str());
    TraceCapture trace;
    task.ReturnStatus(0);
    EXPECT_EQ(fieldText(task.getReturnResults().context), std::string(3072, 'x'));
    EXPECT_EQ(fieldText(task.getReturnResults().optional), padded("INSTANCE", 32));
    EXPECT_EQ(trace.errors(),
              std::vector<std::string>{
                  "Result data \"" + value + "\" was truncated to \"" + std::string(3072, 'x') +
                  "\" because it exceeded the maximum size of 3072 characters"});
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
    EXPECT_EQ(bytes(task.getReturnResults()), expected);
    EXPECT_EQ(widthsOfCuts(trace),
              (std::vector<int>{64, 84, 16, 32, 3072, 32, 32, 512, 12, 16, 256, 64}));
}

TEST(ReturnAsyncStatus, PublishesOneRow) {
    TaskQueueElem task = sample();
    Outcomes outcomes;
    task.returnAsyncStatus(1024);
    const auto rows = outcomes.rows();
    ASSERT_EQ(rows.size(), 1u);
    const std::string expected = padded("node", 64) + padded("tx-1", 84) + padded("START", 16) +
                                 integerBytes(1024) + padded("ZAV1024E", 16) +
                                 padded("the command", 256) + padded("host:UX", 64);
    ASSERT_EQ(expected.size(), 504u);
    EXPECT_EQ(bytes(rows[0]), expected);
}

TEST(ReturnAsyncStatus, SleepsOneSecondBeforeTheRow) {
    static std::vector<unsigned> sleptBefore;
    sleptBefore.clear();
    ASSERT_EQ(zav_kagdyst_init(), 0);
    fake_sleep::reset();
    const auto subscription = oxa::subscribe("KAGDYST", {}, [](const oxa::Rows&) {
        sleptBefore = fake_sleep::slept();
        return 0;
    });
    TaskQueueElem task = sample();
    task.returnAsyncStatus(0);
    EXPECT_EQ(sleptBefore, std::vector<unsigned>{1});
    EXPECT_EQ(fake_sleep::slept(), std::vector<unsigned>{1});
}

TEST(ReturnAsyncStatus, IsTraced) {
    TaskQueueElem task = sample();
    TraceCapture trace;
    task.returnAsyncStatus(0);
    EXPECT_EQ(trace.details("zavtqelm"),
              std::vector<std::string>{"Returning aysnc status return code [0], message id "
                                       "[ZAV1024E] parms [the command]"});
}

TEST(ReturnAsyncStatus, LeavesTheRequestsRowAlone) {
    TaskQueueElem task = sample();
    task.ReturnStatus(0);
    const std::string before = bytes(task.getReturnResults());
    task.setRetmsgid("ZAV1025E");
    task.returnAsyncStatus(1025);
    EXPECT_EQ(bytes(task.getReturnResults()), before);
}

TEST(ReturnAsyncStatus, CutsWhatIsTooLong) {
    TaskQueueElem task = sample();
    const std::string value(257, 'z');
    task.setRetmsgparm(value.c_str());
    Outcomes outcomes;
    TraceCapture trace;
    task.returnAsyncStatus(1024);
    const auto rows = outcomes.rows();
    ASSERT_EQ(rows.size(), 1u);
    EXPECT_EQ(fieldText(rows[0].retmsgparm), std::string(256, 'z'));
    EXPECT_EQ(fieldText(rows[0].targetmsn), padded("host:UX", 64));
    EXPECT_EQ(trace.errors("zavtqelm").size(), 1u);
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
    ASSERT_EQ(rows.size(), 1u);
    std::string expected(504, 'y');
    expected.replace(164, 4, integerBytes(7));
    EXPECT_EQ(bytes(rows[0]), expected);
    EXPECT_EQ(widthsOfCuts(trace), (std::vector<int>{64, 84, 16, 64, 16, 256}));
}

}  // namespace
