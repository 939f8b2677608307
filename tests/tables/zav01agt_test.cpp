// ctest-label: threaded
#include "tables/zav01agt.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <clocale>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "support/fake_sleep.h"
#include "support/host/program.h"
#include "support/process/thread_state.h"
#include "support/row_text.h"
#include "support/scoped_env.h"
#include "support/trace_capture.h"
#include "tables/table_checks.h"
#include "tasks/home.h"
#include "tasks/zavtasks.h"

namespace {

using Texts = std::vector<std::string>;
using Made = MadeRequest<zav_kagreqt_manager, zav_kagreqt_agent>;

const std::vector<ExpectedColumn> kColumns = {
    {"ORIGINNODE", "originnode", 0, 64, 9},  {"TRANSID", "transid", 64, 84, 9},
    {"COMMAND", "command", 148, 16, 9},      {"PRODUCT", "product", 164, 32, 9},
    {"CONTEXT", "context", 196, 3072, 9},    {"OPTIONAL", "optional", 3268, 32, 9},
    {"UACONFIG", "uaconfig", 3300, 32, 9},   {"UASCRIPT", "uascript", 3332, 512, 9},
    {"RETVAL", "retval", 3844, 4, 3},        {"VERSION", "version", 3848, 12, 9},
    {"RETMSGID", "retmsgid", 3860, 16, 9},   {"RETMSGPARM", "retmsgparm", 3876, 256, 9},
    {"TARGETMSN", "targetmsn", 4132, 64, 9},
};

zav_kagreqt_data_t rowOf(const char* transid, int retval = 0) {
    TaskQueueElem task;
    task.setTransid(transid);
    task.ReturnStatus(retval);
    return task.getReturnResults();
}

/// The table as requesters see it, with all commands supported and no executor.
class RequestTable : public testing::Test {
protected:
    RequestTable() {
        oxa::setOriginNode("this-node");
        zav_kagreqt_init();
        commands.clear();
        for (const char* command : {"START", "STOP", "RESTART", "INSTALL", "UNINSTALL", "GETCONFIG",
                                    "SETCONFIG", "COMPLETE_INSTALL", "REMOVEINSTANCE"}) {
            commands.push_back(command);
        }
        taskQueue = {};
        fake_sleep::reset();
    }

    static std::vector<zav_kagreqt_data_t> query(const std::vector<oxa::Predicate>& where) {
        oxa::Rows rows;
        EXPECT_EQ(oxa::query("KAGREQT", where, rows), 0);
        std::vector<zav_kagreqt_data_t> found(rows.count());
        if (!found.empty()) std::memcpy(found.data(), rows.bytes.data(), rows.bytes.size());
        return found;
    }

    /// The one row that answers a request.
    static zav_kagreqt_data_t answer(const std::vector<oxa::Predicate>& where) {
        const auto rows = query(where);
        EXPECT_EQ(rows.size(), 1u);
        return rows.empty() ? zav_kagreqt_data_t{} : rows[0];
    }
};

// ---- Schema -------------------------------------------------------------------------------------

TEST(RequestTableSchema, DescribesItsColumns) {
    Made request("KAGREQT");
    expectColumns(*request, kColumns);
    expectColumnBounds(*request);
}

TEST(RequestTableSchema, ComparesColumnsByTheirAttributeNames) {
    Made request("KAGREQT");
    expectComparisons(*request, 4196, kColumns);
}

TEST(RequestTableSchema, KeepsTheFrameworksOrderOfVirtualFunctions) {
    expectRequestSlots<zav_kagreqt_base, zav_kagreqt_agent>();
    expectManagerSlots<zav_kagreqt_manager>();
}

TEST(RequestTableSchema, AccessorsPointIntoTheRow) {
    Made request("KAGREQT");
    zav_kagreqt_data_t rows[] = {rowOf("tx-0", 10), rowOf("tx-1", 11)};
    ASSERT_EQ(request->AddData(rows, 2), 0);
    ASSERT_EQ(request->NumDataItems(), 2);
    char* const base = request->Data(1);
    EXPECT_EQ(request->_get_value_originnode(1), base + 0);
    EXPECT_EQ(request->_get_value_transid(1), base + 64);
    EXPECT_EQ(request->_get_value_command(1), base + 148);
    EXPECT_EQ(request->_get_value_product(1), base + 164);
    EXPECT_EQ(request->_get_value_context(1), base + 196);
    EXPECT_EQ(request->_get_value_optional(1), base + 3268);
    EXPECT_EQ(request->_get_value_uaconfig(1), base + 3300);
    EXPECT_EQ(request->_get_value_uascript(1), base + 3332);
    EXPECT_EQ(reinterpret_cast<char*>(request->_get_value_retval(1)), base + 3844);
    EXPECT_EQ(request->_get_value_version(1), base + 3848);
    EXPECT_EQ(request->_get_value_retmsgid(1), base + 3860);
    EXPECT_EQ(request->_get_value_retmsgparm(1), base + 3876);
    EXPECT_EQ(request->_get_value_targetmsn(1), base + 4132);
    EXPECT_EQ(*request->_get_value_retval(1), 11);
    EXPECT_EQ(reinterpret_cast<char*>(request->GetRow(1)), base);
}

TEST(RequestTableSchema, DataIndexesAreThoseOfHeldRows) {
    Made request("KAGREQT");
    EXPECT_FALSE(request->CheckDataIndex(0));
    zav_kagreqt_data_t row = rowOf("tx");
    request->AddData(&row, 1);
    EXPECT_TRUE(request->CheckDataIndex(0));
    EXPECT_FALSE(request->CheckDataIndex(1));
    EXPECT_FALSE(request->CheckDataIndex(-1));
}

TEST(RequestTableSchema, MakesRoomForOneRowAtATime) {
    Made request("KAGREQT");
    EXPECT_EQ(request->AllocationDefault(), 1u);
}

TEST(RequestTableSchema, AddsOnlyRowsThatTheFilterWants) {
    Made request("KAGREQT", {{"TRANSID", OPER_EQ, "x"}});
    zav_kagreqt_data_t rows[] = {rowOf("x", 1), rowOf("y", 2), rowOf("x", 3)};
    TraceCapture trace;
    EXPECT_EQ(request->AddData(rows, 3), 0);
    EXPECT_EQ(trace.details("zav01agt"),
              (Texts{"Passing row 0 to InsertRow().", "Passing row 2 to InsertRow()."}));
    ASSERT_EQ(request->NumDataItems(), 2);
    EXPECT_EQ(*request->_get_value_retval(1), 3);
    EXPECT_EQ(request->IsRowException(&rows[0]), 1);
    EXPECT_EQ(request->IsRowException(&rows[1]), 0);
}

/// A request that has room for one row only.
class FullRequest : public zav_kagreqt_agent {
public:
    explicit FullRequest(TableManager* manager) : zav_kagreqt_agent(nullptr, nullptr, manager) {}
    int InsertRow(char* row) override {
        ++inserts;
        return inserts > 1 ? 4711 : zav_kagreqt_agent::InsertRow(row);
    }
    int inserts = 0;
};

TEST(RequestTableSchema, AFailedInsertIsTheLastOne) {
    zav_kagreqt_manager manager("ZAV", "KAGREQT");
    FullRequest request(&manager);
    zav_kagreqt_data_t rows[] = {rowOf("a"), rowOf("b"), rowOf("c")};
    EXPECT_EQ(request.AddData(rows, 3), 4711);
    EXPECT_EQ(request.inserts, 2);
    EXPECT_EQ(request.NumDataItems(), 1);
    EXPECT_EQ(request.TakeSample(), 4711) << "a sample ends as its insert does";
}

TEST(RequestTableSchema, AddingNothingSucceeds) {
    Made request("KAGREQT");
    EXPECT_EQ(request->AddData(nullptr, 0), 0);
    EXPECT_EQ(request->NumDataItems(), 0);
}

TEST(RequestTableSchema, PrintsItselfAndItsRows) {
    Made request("KAGREQT");
    TaskQueueElem task("node", "tx", "START", "ux", "ctx", "opt", "conf", "script", "0620", "m:UX");
    task.setRetmsgid("ZAV1024E");
    task.setRetmsgparm("parm");
    task.ReturnStatus(1024);
    zav_kagreqt_data_t row = task.getReturnResults();
    request->AddData(&row, 1);
    TraceCapture trace;
    request->PrintSelf();
    Texts lines = trace.details("zav01agt");
    ASSERT_GE(lines.size(), 4u);
    char head[100];
    std::snprintf(head, sizeof head, "zav_kagreqt_base @%p <%u,%u>",
                  static_cast<const void*>(&*request), request->ObjectNumber(),
                  request->UseCount());
    const Texts expected = {
        head,
        "\t::appl=ZAV,table=KAGREQT,interval=0,samptype=0",
        "\t_data {",
        "\t\tcount=1, allocated=1, allocSize=1",
        "\t\t{",
        "\t\toriginnode=\"" + padded("node", 64) + "\"",
        "\t\ttransid=\"" + padded("tx", 84) + "\"",
        "\t\tcommand=\"" + padded("START", 16) + "\"",
        "\t\tproduct=\"" + padded("ux", 32) + "\"",
        "\t\tcontext=\"" + padded("ctx", 3072) + "\"",
        "\t\toptional=\"" + padded("opt", 32) + "\"",
        "\t\tuaconfig=\"" + padded("conf", 32) + "\"",
        "\t\tuascript=\"" + padded("script", 512) + "\"",
        "\t\tretval=1024",
        "\t\tversion=\"" + padded("0620", 12) + "\"",
        "\t\tretmsgid=\"" + padded("ZAV1024E", 16) + "\"",
        "\t\tretmsgparm=\"" + padded("parm", 256) + "\"",
        "\t\ttargetmsn=\"" + padded("m:UX", 64) + "\"",
        "\t\t}",
        "\t}",
    };
    EXPECT_EQ(lines, expected);
}

TEST(RequestTableSchema, PrintsNothingWhenDetailIsOff) {
    Made request("KAGREQT");
    TraceCapture trace("ERROR");
    request->PrintSelf();
    EXPECT_TRUE(trace.lines().empty());
}

// ---- Start-up -----------------------------------------------------------------------------------

TEST(RequestTableInit, RegistersTheTable) {
    EXPECT_STREQ(zav_kagreqt_application, "ZAV");
    EXPECT_STREQ(zav_kagreqt_table, "KAGREQT");
    zav_kagreqt_manager* const former = zav_kagreqt_static_manager;
    EXPECT_EQ(zav_kagreqt_init(), 0);
    ASSERT_NE(zav_kagreqt_static_manager, nullptr);
    EXPECT_NE(zav_kagreqt_static_manager, former);
    EXPECT_STREQ(zav_kagreqt_static_manager->ApplicationName(), "ZAV");
    EXPECT_STREQ(zav_kagreqt_static_manager->TableName(), "KAGREQT");
    bool found = false;
    for (const oxa::Table& table : oxa::tables()) {
        found = found || (table.application == "ZAV" && table.name == "KAGREQT");
    }
    EXPECT_TRUE(found);
}

// ---- Requests -----------------------------------------------------------------------------------

TEST_F(RequestTable, ARequestWithoutFilterIs1002) {
    const zav_kagreqt_data_t row = answer({});
    EXPECT_EQ(row.retval, 1002);
    EXPECT_EQ(fieldText(row.retmsgid), padded("ZAV1002E", 16));
    EXPECT_EQ(fieldText(row.retmsgparm), padded("", 256));
    EXPECT_EQ(fieldText(row.originnode), padded("this-node", 64));
    EXPECT_EQ(fieldText(row.transid), padded("", 84));
}

TEST_F(RequestTable, TheAnswerRepeatsTheRequest) {
    const zav_kagreqt_data_t row = answer({{"TRANSID", OPER_EQ, "tx-1"},
                                           {"COMMAND", OPER_EQ, "START"},
                                           {"PRODUCT", OPER_EQ, "ux"},
                                           {"CONTEXT", OPER_EQ, "ctx"},
                                           {"OPTIONAL", OPER_EQ, "opt"},
                                           {"UACONFIG", OPER_EQ, "conf"},
                                           {"UASCRIPT", OPER_EQ, "script"},
                                           {"VERSION", OPER_EQ, "0620"},
                                           {"TARGETMSN", OPER_EQ, "m:UX"}});
    EXPECT_EQ(trimmedField(row.originnode), "this-node");
    EXPECT_EQ(trimmedField(row.transid), "tx-1");
    EXPECT_EQ(trimmedField(row.command), "START");
    EXPECT_EQ(trimmedField(row.product), "ux");
    EXPECT_EQ(trimmedField(row.context), "ctx");
    EXPECT_EQ(trimmedField(row.optional), "opt");
    EXPECT_EQ(trimmedField(row.uaconfig), "conf");
    EXPECT_EQ(trimmedField(row.uascript), "script");
    EXPECT_EQ(trimmedField(row.version), "0620");
    EXPECT_EQ(trimmedField(row.targetmsn), "m:UX");
    EXPECT_EQ(row.retval, 0);
    EXPECT_EQ(trimmedField(row.retmsgid), "");
    ASSERT_EQ(taskQueue.size(), 1u);
    EXPECT_TRUE(taskQueue.front().getTransid() == "tx-1");
}

TEST_F(RequestTable, LowerCaseNamesMatchNothing) {
    const zav_kagreqt_data_t row = answer(
        {{"transid", OPER_EQ, "tx"}, {"command", OPER_EQ, "START"}, {"product", OPER_EQ, "ux"}});
    EXPECT_EQ(row.retval, 1002);
    EXPECT_EQ(trimmedField(row.retmsgid), "ZAV1002E");
    EXPECT_TRUE(taskQueue.empty());
}

TEST_F(RequestTable, AColumnNamedTwiceKeepsTheLastValue) {
    const std::vector<oxa::Predicate> where = {{"TRANSID", OPER_EQ, "tx"},
                                               {"COMMAND", OPER_EQ, "GETCONFIG"},
                                               {"COMMAND", OPER_EQ, "STOP"}};
    Made request("KAGREQT", where);
    TraceCapture trace;
    request->TakeSample();
    EXPECT_EQ(trace.count('D', "Going to run command STOP"), 1);
}

TEST_F(RequestTable, ColumnsOfTheOutcomeSayNothingAboutTheRequest) {
    const zav_kagreqt_data_t row = answer({{"COMMAND", OPER_EQ, "START"},
                                           {"TRANSID", OPER_EQ, "tx"},
                                           {"PRODUCT", OPER_EQ, "ux"},
                                           {"ORIGINNODE", OPER_NE, "elsewhere"},
                                           {"RETVAL", OPER_LT, "5"},
                                           {"RETMSGID", OPER_NE, "x"},
                                           {"RETMSGPARM", OPER_NE, "x"}});
    EXPECT_EQ(trimmedField(row.originnode), "this-node");
    EXPECT_EQ(trimmedField(row.retmsgid), "");
}

TEST_F(RequestTable, TheAnswerMustSatisfyTheFilterToo) {
    EXPECT_TRUE(query({{"COMMAND", OPER_EQ, "START"},
                       {"TRANSID", OPER_EQ, "tx"},
                       {"PRODUCT", OPER_EQ, "ux"},
                       {"RETVAL", OPER_EQ, "1003"}})
                    .empty());
    EXPECT_EQ(taskQueue.size(), 1u);
}

TEST_F(RequestTable, ValuesAreTakenAsTheyAre) {
    const zav_kagreqt_data_t row = answer(
        {{"COMMAND", OPER_EQ, "START "}, {"TRANSID", OPER_EQ, " tx "}, {"PRODUCT", OPER_EQ, "ux"}});
    EXPECT_EQ(row.retval, 1006);
    EXPECT_EQ(fieldText(row.retmsgparm), padded("START ", 256));
    EXPECT_EQ(fieldText(row.transid), padded(" tx ", 84));
}

TEST_F(RequestTable, AValueThatWasCutStillGetsItsAnswer) {
    const std::string context(3073, 'c');
    TraceCapture trace;
    const zav_kagreqt_data_t row = answer({{"COMMAND", OPER_EQ, "INSTALL"},
                                           {"TRANSID", OPER_EQ, "tx"},
                                           {"PRODUCT", OPER_EQ, "ux"},
                                           {"VERSION", OPER_EQ, "0620"},
                                           {"CONTEXT", OPER_EQ, context}});
    EXPECT_EQ(row.retval, 0);
    EXPECT_EQ(fieldText(row.context), std::string(3072, 'c'));
    EXPECT_EQ(trace.errors("zavtqelm").size(), 1u);
    ASSERT_EQ(taskQueue.size(), 1u);
    EXPECT_EQ(taskQueue.front().getContext().length(), 3073u);
}

/// Sets the process's code page while it exists.
class CodePage {
public:
    explicit CodePage(const char* locale) : former_(::setlocale(LC_CTYPE, nullptr)) {
        ::setlocale(LC_CTYPE, locale);
        ZAV::String::initialize();
    }
    ~CodePage() {
        ::setlocale(LC_CTYPE, former_.c_str());
        ZAV::String::initialize();
    }
    CodePage(const CodePage&) = delete;
    CodePage& operator=(const CodePage&) = delete;

private:
    const std::string former_;
};

TEST_F(RequestTable, ARequestWhoseTextTheCodePageCutsIsQueuedWithoutAnAnswer) {
    const CodePage utf8("C.UTF-8");
    const auto ask = [](const std::string& product) {
        return query({{"COMMAND", OPER_EQ, "START"},
                      {"TRANSID", OPER_EQ, "tx"},
                      {"PRODUCT", OPER_EQ, product}});
    };
    // The row has room for one byte per character and one more; the filter holds all bytes.
    const auto answered = ask("u\u00E9");
    ASSERT_EQ(answered.size(), 1u);
    EXPECT_EQ(fieldText(answered[0].product), padded("u\u00E9", 32));
    EXPECT_TRUE(ask("\u00E9\u00E9").empty());
    ASSERT_EQ(taskQueue.size(), 2u);
    EXPECT_EQ(taskQueue.back().getProduct().length(), 2u);
}

TEST_F(RequestTable, AnAnswerIsTraced) {
    TraceCapture trace;
    answer({{"TRANSID", OPER_EQ, "tx"}});
    EXPECT_EQ(trace.details("zav01agt"), (Texts{"Passing row 0 to InsertRow()."}));
}

TEST_F(RequestTable, GetconfigIsAnsweredWithTheConfiguration) {
    const ScratchDir scratch;
    const std::string home = scratch.path();
    scratch.script("bin/cinfo",
                   "echo '\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"'\n"
                   "echo '\"ax\",\"Shared\",\"lx8266\",\"06200000\",\"100\"'\n");
    const std::string translator = scratch.script(
        "agtqvs6/lx8266/bin/zav_xa", "echo noise\necho INSTANCE=$2\nexit ${FAKE_EXIT:-0}\n");
    ZAV_TOVRINHOME = home.c_str();
    const std::vector<oxa::Predicate> where = {
        {"COMMAND", OPER_EQ, "GETCONFIG"}, {"TRANSID", OPER_EQ, "tx"}, {"PRODUCT", OPER_EQ, "ux"}};
    const zav_kagreqt_data_t good = answer(where);
    EXPECT_EQ(good.retval, 0) << trimmedField(good.retmsgparm);
    EXPECT_EQ(trimmedField(good.context).substr(0, 12), "INSTANCE=-pc");

    const ScopedEnv failing("FAKE_EXIT", "3");
    const zav_kagreqt_data_t bad = answer(where);
    EXPECT_EQ(bad.retval, 1008);
    EXPECT_EQ(trimmedField(bad.retmsgid), "ZAV1008E");
    EXPECT_EQ(trimmedField(bad.retmsgparm).substr(0, 13), "GETCONFIG,ux,");
    ZAV_TOVRINHOME = nullptr;
}

// ---- Events -------------------------------------------------------------------------------------

class RequestEvents : public testing::Test {
protected:
    RequestEvents() { zav_kagreqt_init(); }

    /// A subscription that answers every dispatch with `status`.
    std::unique_ptr<oxa::Subscription> subscribe(int status,
                                                 const std::vector<oxa::Predicate>& where = {}) {
        return oxa::subscribe("KAGREQT", where, [this, status](const oxa::Rows& rows) {
            delivered_ += rows.count();
            return status;
        });
    }

    std::size_t delivered_ = 0;
};

TEST_F(RequestEvents, ReachEverySubscriberWhoseFilterWantsThem) {
    const auto all = subscribe(0);
    const auto some = subscribe(0, {{"TRANSID", OPER_EQ, "x"}});
    zav_kagreqt_data_t rows[] = {rowOf("x"), rowOf("y")};
    EXPECT_EQ(zav_kagreqt_manager::EventArrived(rows, 2), 0);
    EXPECT_EQ(delivered_, 3u);
    EXPECT_EQ(zav_kagreqt_manager::EventArrived(rows, 1), 0);
    EXPECT_EQ(delivered_, 5u);  // rows are not delivered twice
}

TEST_F(RequestEvents, ReturnTheLastRefusal) {
    const auto first = subscribe(OXA_OVERFLOW);
    const auto second = subscribe(OXA_GONE);
    const auto third = subscribe(0);
    zav_kagreqt_data_t row = rowOf("x");
    EXPECT_EQ(zav_kagreqt_manager::EventArrived(&row, 1), OXA_GONE);
    EXPECT_EQ(delivered_, 3u);
}

/// A table whose requests record how often they were in use when a row was inserted.
class WatchedManager : public zav_kagreqt_manager {
public:
    WatchedManager() : zav_kagreqt_manager("ZAV", "KAGREQT") {}
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override {
        auto request = std::make_unique<Watched>(detail, context, this);
        made = request.get();
        return request.release();
    }

    struct Watched : zav_kagreqt_agent {
        using zav_kagreqt_agent::zav_kagreqt_agent;
        int InsertRow(char* row) override {
            useAtInsert = UseCount();
            return zav_kagreqt_agent::InsertRow(row);
        }
        unsigned useAtInsert = 0;
    };
    Watched* made = nullptr;
};

TEST_F(RequestEvents, KeepARequestInUseAndLeaveItEmpty) {
    WatchedManager manager;
    ASSERT_EQ(manager.RegisterWithManager(), 0);
    const auto subscription = subscribe(0);
    zav_kagreqt_data_t row = rowOf("x");
    EXPECT_EQ(manager.AddDataToEvent(&row, 1), 0);
    EXPECT_EQ(delivered_, 1u);
    EXPECT_EQ(manager.made->useAtInsert, 1u);
    EXPECT_EQ(manager.made->UseCount(), 0u);
    EXPECT_EQ(manager.made->NumDataItems(), 0);
}

TEST_F(RequestEvents, AreGivenUnderTheTablesLock) {
    std::atomic<bool> locked{false};
    std::atomic<pid_t> otherId{0};
    std::thread other;
    const auto subscription = oxa::subscribe("KAGREQT", {}, [&](const oxa::Rows&) {
        other = std::thread([&] {
            otherId = ::gettid();
            zav_kagreqt_static_manager->lock();
            locked = true;
            zav_kagreqt_static_manager->unlock();
        });
        const bool waits =
            eventually([&] { return locked || (otherId != 0 && isAsleep(otherId)); });
        return waits && !locked ? OXA_OK : OXA_GONE;
    });
    zav_kagreqt_data_t row = rowOf("x");
    EXPECT_EQ(zav_kagreqt_manager::EventArrived(&row, 1), OXA_OK);
    ASSERT_TRUE(other.joinable());
    other.join();
    EXPECT_TRUE(locked) << "the lock is given back";
}

TEST_F(RequestEvents, WithoutSubscribersNothingHappens) {
    zav_kagreqt_data_t row = rowOf("x");
    EXPECT_EQ(zav_kagreqt_manager::EventArrived(&row, 1), 0);
}

TEST_F(RequestEvents, WithoutManagerNothingHappens) {
    zav_kagreqt_manager* const kept = std::exchange(zav_kagreqt_static_manager, nullptr);
    zav_kagreqt_data_t row = rowOf("x");
    EXPECT_EQ(zav_kagreqt_manager::EventArrived(&row, 1), 0);
    zav_kagreqt_static_manager = kept;
}

}  // namespace
