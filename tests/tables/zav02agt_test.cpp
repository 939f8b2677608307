// ctest-label: threaded
#include "tables/zav02agt.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "support/host/outcomes.h"
#include "support/row_text.h"
#include "support/trace_capture.h"
#include "tables/table_checks.h"
#include "tasks/zavtqelm.h"

namespace {

using Texts = std::vector<std::string>;
using Made = MadeRequest<zav_kagdyst_manager, zav_kagdyst_agent>;

const std::vector<ExpectedColumn> kColumns = {
    {"ORIGINNODE", "originnode", 0, 64, 9}, {"TRANSID", "transid", 64, 84, 9},
    {"COMMAND", "command", 148, 16, 9},     {"RETVAL", "retval", 164, 4, 3},
    {"RETMSGID", "retmsgid", 168, 16, 9},   {"RETMSGPARM", "retmsgparm", 184, 256, 9},
    {"TARGETMSN", "targetmsn", 440, 64, 9},
};

zav_kagdyst_data_t rowOf(const char* transid, int retval = 0) {
    zav_kagdyst_data_t row;
    std::memset(&row, ' ', sizeof row);
    TaskQueueElem::SetValueAndPad(row.transid, sizeof row.transid, transid);
    row.retval = retval;
    return row;
}

TEST(StatusTableSchema, DescribesItsColumns) {
    Made request("KAGDYST");
    expectColumns(*request, kColumns);
    expectColumnBounds(*request);
}

TEST(StatusTableSchema, ComparesColumnsByTheirAttributeNames) {
    Made request("KAGDYST");
    expectComparisons(*request, 504, kColumns);
}

TEST(StatusTableSchema, KeepsTheFrameworksOrderOfVirtualFunctions) {
    expectRequestSlots<zav_kagdyst_base, zav_kagdyst_agent>();
    expectManagerSlots<zav_kagdyst_manager>();
}

TEST(StatusTableSchema, AccessorsPointIntoTheRow) {
    Made request("KAGDYST");
    zav_kagdyst_data_t rows[] = {rowOf("tx-0"), rowOf("tx-1", 5)};
    ASSERT_EQ(request->AddData(rows, 2), 0);
    char* const base = request->Data(1);
    EXPECT_EQ(request->_get_value_originnode(1), base + 0);
    EXPECT_EQ(request->_get_value_transid(1), base + 64);
    EXPECT_EQ(request->_get_value_command(1), base + 148);
    EXPECT_EQ(reinterpret_cast<char*>(request->_get_value_retval(1)), base + 164);
    EXPECT_EQ(request->_get_value_retmsgid(1), base + 168);
    EXPECT_EQ(request->_get_value_retmsgparm(1), base + 184);
    EXPECT_EQ(request->_get_value_targetmsn(1), base + 440);
    EXPECT_EQ(*request->_get_value_retval(1), 5);
    EXPECT_TRUE(request->CheckDataIndex(1));
    EXPECT_FALSE(request->CheckDataIndex(2));
    EXPECT_EQ(request->AllocationDefault(), 1u);
}

TEST(StatusTableSchema, PrintsItselfAndItsRows) {
    Made request("KAGDYST", {}, 1);
    zav_kagdyst_data_t row = rowOf("tx", -3);
    request->AddData(&row, 1);
    TraceCapture trace;
    request->PrintSelf();
    char head[100];
    std::snprintf(head, sizeof head, "zav_kagdyst_base @%p <%u,%u>",
                  static_cast<const void*>(&*request), request->ObjectNumber(),
                  request->UseCount());
    const Texts expected = {
        head,
        "\t::appl=ZAV,table=KAGDYST,interval=0,samptype=1",
        "\t_data {",
        "\t\tcount=1, allocated=1, allocSize=1",
        "\t\t{",
        "\t\toriginnode=\"" + padded("", 64) + "\"",
        "\t\ttransid=\"" + padded("tx", 84) + "\"",
        "\t\tcommand=\"" + padded("", 16) + "\"",
        "\t\tretval=-3",
        "\t\tretmsgid=\"" + padded("", 16) + "\"",
        "\t\tretmsgparm=\"" + padded("", 256) + "\"",
        "\t\ttargetmsn=\"" + padded("", 64) + "\"",
        "\t\t}",
        "\t}",
    };
    EXPECT_EQ(trace.details("zav02agt"), expected);
}

TEST(StatusTable, IsRegisteredUnderItsNames) {
    EXPECT_STREQ(zav_kagdyst_application, "ZAV");
    EXPECT_STREQ(zav_kagdyst_table, "KAGDYST");
    ASSERT_EQ(zav_kagdyst_init(), 0);
    EXPECT_STREQ(zav_kagdyst_static_manager->ApplicationName(), "ZAV");
    EXPECT_STREQ(zav_kagdyst_static_manager->TableName(), "KAGDYST");
}

TEST(StatusTable, APlainQueryIsAnsweredWithoutRows) {
    ASSERT_EQ(zav_kagdyst_init(), 0);
    zav_kagdyst_data_t row = rowOf("before");
    publishDeployStatus(&row, 1);
    oxa::Rows rows;
    EXPECT_EQ(oxa::query("KAGDYST", {}, rows), 0);
    EXPECT_EQ(rows.count(), 0u);
}

TEST(StatusTable, EventsReachWhoeverWantsThem) {
    Outcomes all;
    Outcomes mine({{"TRANSID", OPER_EQ, "x"}});
    Outcomes failures({{"RETVAL", OPER_NE, "0"}});
    zav_kagdyst_data_t rows[] = {rowOf("x"), rowOf("y", 1024), rowOf("xx")};
    TraceCapture trace;
    EXPECT_EQ(publishDeployStatus(rows, 3), 0);
    EXPECT_EQ(all.rows().size(), 3u);
    ASSERT_EQ(mine.rows().size(), 1u);
    EXPECT_EQ(trimmedField(mine.rows()[0].transid), "x");
    ASSERT_EQ(failures.rows().size(), 1u);
    EXPECT_EQ(failures.rows()[0].retval, 1024);
    EXPECT_EQ(trace.details("zav02agt"),
              (Texts{"Passing row 0 to InsertRow().", "Passing row 1 to InsertRow().",
                     "Passing row 2 to InsertRow().", "Passing row 0 to InsertRow().",
                     "Passing row 1 to InsertRow()."}));
}

TEST(StatusTable, EventsArePublishedByteForByte) {
    Outcomes all;
    zav_kagdyst_data_t row;
    for (std::size_t i = 0; i < sizeof row; ++i) {
        reinterpret_cast<char*>(&row)[i] = static_cast<char>(i);
    }
    publishDeployStatus(&row, 1);
    const auto rows = all.rows();
    ASSERT_EQ(rows.size(), 1u);
    EXPECT_EQ(std::memcmp(&row, &rows[0], sizeof row), 0);
}

TEST(StatusTable, ARefusalIsReturnedAndKeepsNothingFromTheOthers) {
    ASSERT_EQ(zav_kagdyst_init(), 0);
    const auto slow =
        oxa::subscribe("KAGDYST", {}, [](const oxa::Rows&) -> int { return OXA_OVERFLOW; });
    Outcomes others;
    zav_kagdyst_data_t row = rowOf("x");
    EXPECT_EQ(publishDeployStatus(&row, 1), OXA_OVERFLOW);
    EXPECT_EQ(others.rows().size(), 1u);
}

TEST(StatusTable, WithoutManagerTheStatusIsLost) {
    zav_kagdyst_manager* const kept = std::exchange(zav_kagdyst_static_manager, nullptr);
    zav_kagdyst_data_t row = rowOf("x");
    EXPECT_EQ(publishDeployStatus(&row, 1), 0);
    zav_kagdyst_static_manager = kept;
}

TEST(StatusTable, SubscriptionsOutliveANewRegistration) {
    Outcomes outcomes;
    ASSERT_EQ(zav_kagdyst_init(), 0);
    zav_kagdyst_data_t row = rowOf("x");
    publishDeployStatus(&row, 1);
    EXPECT_EQ(outcomes.rows().size(), 1u);
}

TEST(StatusTable, SubscribersComeAndGoWhileEventsArrive) {
    ASSERT_EQ(zav_kagdyst_init(), 0);
    std::atomic<bool> done{false};
    std::thread executor([&done] {
        zav_kagdyst_data_t row = rowOf("x");
        while (!done)
            EXPECT_EQ(publishDeployStatus(&row, 1), 0);
    });
    std::vector<std::thread> subscribers;
    for (int i = 0; i < 3; ++i) {
        subscribers.emplace_back([] {
            for (int n = 0; n < 50; ++n) {
                Outcomes outcomes;
                EXPECT_GE(outcomes.waitFor(1).size(), 1u);
            }
        });
    }
    for (std::thread& subscriber : subscribers)
        subscriber.join();
    done = true;
    executor.join();
}

}  // namespace
