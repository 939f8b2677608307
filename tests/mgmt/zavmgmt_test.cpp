// Start-up. Cases that need a fresh process are skipped when start-up has run in this one.
// ctest-label: threaded
#include "mgmt/zavmgmt.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "embedded/oxa_host.h"
#include "support/fake_sleep.h"
#include "support/host/outcomes.h"
#include "support/host/script_home.h"
#include "support/row_text.h"
#include "support/scoped_env.h"
#include "support/trace_capture.h"
#include "tables/zav01agt.h"
#include "tables/zav02agt.h"
#include "tables/zav03agt.h"
#include "tasks/zavtasks.h"

namespace {

using Texts = std::vector<std::string>;

std::ptrdiff_t threadCount() {
    const std::filesystem::directory_iterator threads("/proc/self/task");
    return std::distance(begin(threads), end(threads));
}

Texts tableNames() {
    Texts names;
    for (const oxa::Table& table : oxa::tables())
        names.push_back(table.name);
    return names;
}

bool isStarted() {
    return zav_kagreqt_static_manager != nullptr;
}

/// One home for all cases of this process, because start-up keeps its directories.
ScriptHome& home() {
    static ScriptHome& instance = *new ScriptHome;
    return instance;
}

class StartUp : public testing::Test {
protected:
    StartUp() { fake_sleep::reset(); }
    ~StartUp() override { ::unsetenv("TOVRINHOME"); }

    static void TearDownTestSuite() { std::filesystem::remove_all(home().files().path()); }

    static void setHome(const std::string& path) { ::setenv("TOVRINHOME", path.c_str(), 1); }

    const ScopedEnv depot_{"QVSDEPLOY_AGENTDEPOT", home().files().makeDir("depot")};
};

TEST_F(StartUp, WithoutAHomeTheLibraryStaysInert) {
    if (isStarted()) GTEST_SKIP() << "started by an earlier case of this process";
    ::unsetenv("TOVRINHOME");
    const std::ptrdiff_t threads = threadCount();
    TraceCapture trace;
    EXPECT_EQ(Initialize_Mgmt_Functions(), 0);
    EXPECT_EQ(trace.errors(), (Texts{"No value for TOVRINHOME - MANAGEMENT FUNCTIONS DISABLED"}));
    EXPECT_TRUE(trace.details("zavmgmt").empty());
    EXPECT_EQ(ZAV_TOVRINHOME, nullptr);
    EXPECT_EQ(tableNames(), Texts{});
    oxa::Rows rows;
    EXPECT_EQ(oxa::query("KAGREQT", {}, rows), OXA_GONE);
    EXPECT_EQ(zav_kagreqt_static_manager, nullptr);
    EXPECT_EQ(zav_kinagt_static_manager, nullptr);
    EXPECT_EQ(zav_kagdyst_static_manager, nullptr);
    EXPECT_FALSE(initialized);
    EXPECT_EQ(threadCount(), threads);
}

TEST_F(StartUp, TheHomeIsTheVariablesValueItself) {
    setHome("/opt/tovrin");
    EXPECT_EQ(Initialize_Tovrin_Home(), ::getenv("TOVRINHOME"));
    EXPECT_EQ(ZAV_TOVRINHOME, ::getenv("TOVRINHOME"));
    ::unsetenv("TOVRINHOME");
    TraceCapture trace;
    EXPECT_EQ(Initialize_Tovrin_Home(), nullptr);
    EXPECT_EQ(ZAV_TOVRINHOME, nullptr);
    EXPECT_EQ(trace.errors(), (Texts{"No value for TOVRINHOME - MANAGEMENT FUNCTIONS DISABLED"}));
}

TEST_F(StartUp, AnEmptyHomeCountsAsOne) {
    if (isStarted()) GTEST_SKIP() << "started by an earlier case of this process";
    const ScopedEnv noDepot("QVSDEPLOY_AGENTDEPOT", nullptr);
    setHome("");
    TraceCapture trace;
    EXPECT_EQ(Initialize_Mgmt_Functions(), 0);
    ASSERT_NE(ZAV_TOVRINHOME, nullptr);
    EXPECT_STREQ(ZAV_TOVRINHOME, "");
    EXPECT_EQ(tableNames(), (Texts{"KAGREQT", "KINAGT", "KAGDYST"}));
    EXPECT_EQ(trace.count('E', "ZAV1010E No Agent Depot directory set"), 1);
    EXPECT_FALSE(initialized);
}

TEST_F(StartUp, RegistersEverythingInOrder) {
    setHome(home().path());
    TraceCapture trace;
    EXPECT_EQ(Initialize_Mgmt_Functions(), 0);
    EXPECT_EQ(trace.details("zavmgmt"),
              (Texts{"Calling ZAV Table initialization", "Calling ZAV Task Manager initialization",
                     "Calling ZAV RPC calls initialization",
                     "Done calling ZAV initialization routines"}));
    Texts initialisers;
    for (const TraceLine& line : trace.lines()) {
        const bool isEntry = line.level == 'F' && line.text.compare(0, 5, "Entry") == 0;
        const bool isOne =
            line.function.size() > 5 && (line.function.rfind("_init") == line.function.size() - 5 ||
                                         line.function == "QVS_NCS_RegisterAgentInterface");
        if (isEntry && isOne) initialisers.push_back(line.function);
    }
    EXPECT_EQ(initialisers, (Texts{"zav_kagreqt_init", "zav_kinagt_init", "zav_kagdyst_init",
                                   "zav_taskmgr_init", "QVS_NCS_RegisterAgentInterface"}));
    EXPECT_EQ(tableNames(), (Texts{"KAGREQT", "KINAGT", "KAGDYST"}));
    EXPECT_TRUE(initialized);
    EXPECT_EQ(commands.size(), 9u);
}

TEST_F(StartUp, ASecondCallStartsNoSecondExecutor) {
    setHome(home().path());
    ASSERT_EQ(Initialize_Mgmt_Functions(), 0);
    const std::ptrdiff_t threads = threadCount();
    zav_kagreqt_manager* const former = zav_kagreqt_static_manager;
    EXPECT_EQ(Initialize_Mgmt_Functions(), 0);
    EXPECT_EQ(threadCount(), threads);
    EXPECT_NE(zav_kagreqt_static_manager, former);
    EXPECT_EQ(commands.size(), 9u);
    EXPECT_EQ(tableNames(), (Texts{"KAGREQT", "KINAGT", "KAGDYST"}));
}

TEST_F(StartUp, ARequestTravelsTheWholeWay) {
    setHome(home().path());
    ASSERT_EQ(Initialize_Mgmt_Functions(), 0);
    Outcomes outcomes({{"TRANSID", OPER_EQ, "tx-1"}});
    oxa::Rows rows;
    ASSERT_EQ(oxa::query("KAGREQT",
                         {{"COMMAND", OPER_EQ, "START"},
                          {"TRANSID", OPER_EQ, "tx-1"},
                          {"PRODUCT", OPER_EQ, "ux"}},
                         rows),
              0);
    ASSERT_EQ(rows.count(), 1u);
    const auto found = outcomes.waitFor(1);
    ASSERT_EQ(found.size(), 1u);
    EXPECT_EQ(found[0].retval, 0);
    EXPECT_EQ(home().agentCalls().back(), "-h " + home().path() + " start ux");
}

}  // namespace
