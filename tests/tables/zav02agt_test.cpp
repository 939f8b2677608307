// ctest-label: threaded
#include "tables/zav02agt.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "support/outcomes.h"
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
    ASSERT_EQ(0, request->AddData(rows, 2));
    char* const base = request->Data(1);
    EXPECT_EQ(base + 0, request->_get_value_originnode(1));
    EXPECT_EQ(base + 64, request->_get_value_transid(1));
    EXPECT_EQ(base + 148, request->_get_value_command(1));
    EXPECT_EQ(base + 164, reinterpret_cast<char*>(request->_get_value_retval(1)));
    EXPECT_EQ(base + 168, request->_get_value_retmsgid(1));
    EXPECT_EQ(base + 184, request->_get_value_retmsgparm(1));
    EXPECT_EQ(base + 440, request->_get_value_targetmsn(1));
    EXPECT_EQ(5, *request->_get_value_retval(1));
    EXPECT_TRUE(request->CheckDataIndex(1));
    EXPECT_FALSE(request->CheckDataIndex(2));
    EXPECT_EQ(1u, request->AllocationDefault());
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
    EXPECT_EQ(expected, trace.details("zav02agt"));
}

TEST(StatusTable, IsRegisteredUnderItsNames) {
    EXPECT_STREQ("ZAV", zav_kagdyst_application);
    EXPECT_STREQ("KAGDYST", zav_kagdyst_table);
    ASSERT_EQ(0, zav_kagdyst_init());
    EXPECT_STREQ("ZAV", zav_kagdyst_static_manager->ApplicationName());
    EXPECT_STREQ("KAGDYST", zav_kagdyst_static_manager->TableName());
}

TEST(StatusTable, APlainQueryIsAnsweredWithoutRows) {
    ASSERT_EQ(0, zav_kagdyst_init());
    zav_kagdyst_data_t row = rowOf("before");
    publishDeployStatus(&row, 1);
    oxa::Rows rows;
    EXPECT_EQ(0, oxa::query("KAGDYST", {}, rows));
    EXPECT_EQ(0u, rows.count());
}

TEST(StatusTable, EventsReachWhoeverWantsThem) {
    Outcomes all;
    Outcomes mine({{"TRANSID", OPER_EQ, "x"}});
    Outcomes failures({{"RETVAL", OPER_NE, "0"}});
    zav_kagdyst_data_t rows[] = {rowOf("x"), rowOf("y", 1024), rowOf("xx")};
    TraceCapture trace;
    EXPECT_EQ(0, publishDeployStatus(rows, 3));
    EXPECT_EQ(3u, all.rows().size());
    ASSERT_EQ(1u, mine.rows().size());
    EXPECT_EQ("x", trimmedField(mine.rows()[0].transid));
    ASSERT_EQ(1u, failures.rows().size());
    EXPECT_EQ(1024, failures.rows()[0].retval);
    EXPECT_EQ((Texts{"Passing row 0 to InsertRow().", "Passing row 1 to InsertRow().",
                     "Passing row 2 to InsertRow().", "Passing row 0 to InsertRow().",
                     "Passing row 1 to InsertRow()."}),
              trace.details("zav02agt"));
}

TEST(StatusTable, EventsArePublishedByteForByte) {
    Outcomes all;
    zav_kagdyst_data_t row;
    for (std::size_t i = 0; i < sizeof row; ++i) {
        reinterpret_cast<char*>(&row)[i] = static_cast<char>(i);
    }
    publishDeployStatus(&row, 1);
    const auto rows = all.rows();
    ASSERT_EQ(1u, rows.size());
    EXPECT_EQ(0, std::memcmp(&row, &rows[0], sizeof row));
}

TEST(StatusTable, ARefusalIsReturnedAndKeepsNothingFromTheOthers) {
    ASSERT_EQ(0, zav_kagdyst_init());
    const auto slow =
        oxa::subscribe("KAGDYST", {}, [](const oxa::Rows&) -> int { return OXA_OVERFLOW; });
    Outcomes others;
    zav_kagdyst_data_t row = rowOf("x");
    EXPECT_EQ(OXA_OVERFLOW, publishDeployStatus(&row, 1));
    EXPECT_EQ(1u, others.rows().size());
}

TEST(StatusTable, WithoutManagerTheStatusIsLost) {
    zav_kagdyst_manager* const kept = std::exchange(zav_kagdyst_static_manager, nullptr);
    zav_kagdyst_data_t row = rowOf("x");
    EXPECT_EQ(0, publishDeployStatus(&row, 1));
    zav_kagdyst_static_manager = kept;
}

TEST(StatusTable, SubscriptionsOutliveANewRegistration) {
    Outcomes outcomes;
    ASSERT_EQ(0, zav_kagdyst_init());
    zav_kagdyst_data_t row = rowOf("x");
    publishDeployStatus(&row, 1);
    EXPECT_EQ(1u, outcomes.rows().size());
}

TEST(StatusTable, SubscribersComeAndGoWhileEventsArrive) {
    ASSERT_EQ(0, zav_kagdyst_init());
    std::atomic<bool> done{false};
    std::thread executor([&done] {
        zav_kagdyst_data_t row = rowOf("x");
        while (!done)
            EXPECT_EQ(0, publishDeployStatus(&row, 1));
    });
    std::vector<std::thread> subscribers;
    for (int i = 0; i < 3; ++i) {
        subscribers.emplace_back([] {
            for (int n = 0; n < 50; ++n) {
                Outcomes outcomes;
                EXPECT_LE(1u, outcomes.waitFor(1).size());
            }
        });
    }
    for (std::thread& subscriber : subscribers)
        subscriber.join();
    done = true;
    executor.join();
}

}  // namespace
