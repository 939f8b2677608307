// Start-up when its steps fail. The steps below replace the library's in this program.
#include <gtest/gtest.h>

#include <cstdlib>
#include <stdexcept>
#include <string>
#include <vector>

#include "mgmt/zavmgmt.h"
#include "rpc/zavagts.h"
#include "support/trace_capture.h"
#include "tables/zav01agt.h"
#include "tables/zav02agt.h"
#include "tables/zav03agt.h"
#include "tasks/zavtasks.h"

namespace {

using Texts = std::vector<std::string>;

Texts steps;
int tableStatus = 0;
int interfaceStatus = 0;
bool taskManagerThrows = false;

int step(const char* name, int status) {
    steps.push_back(name);
    return status;
}

}  // namespace

int zav_kagreqt_init() {
    return step("KAGREQT", tableStatus);
}
int zav_kinagt_init() {
    return step("KINAGT", tableStatus);
}
int zav_kagdyst_init() {
    return step("KAGDYST", tableStatus);
}
void zav_taskmgr_init() {
    step("task manager", 0);
    if (taskManagerThrows) throw std::runtime_error("no task manager");
}
int QVS_NCS_RegisterAgentInterface() {
    return step("interface", interfaceStatus);
}

namespace {

class StartUpSteps : public testing::Test {
protected:
    StartUpSteps() {
        ::setenv("TOVRINHOME", "/opt/tovrin", 1);
        steps.clear();
        tableStatus = 0;
        interfaceStatus = 0;
        taskManagerThrows = false;
    }
    ~StartUpSteps() override { ::unsetenv("TOVRINHOME"); }
};

TEST_F(StartUpSteps, AreNoneWithoutAHome) {
    ::unsetenv("TOVRINHOME");
    EXPECT_EQ(Initialize_Mgmt_Functions(), 0);
    EXPECT_EQ(steps, Texts{});
}

TEST_F(StartUpSteps, GoOnWhenTablesCannotBeRegistered) {
    tableStatus = OXA_NO_MEMORY;
    EXPECT_EQ(Initialize_Mgmt_Functions(), 0);
    EXPECT_EQ(steps, (Texts{"KAGREQT", "KINAGT", "KAGDYST", "task manager", "interface"}));
}

TEST_F(StartUpSteps, EndWithTheStatusOfTheInterface) {
    interfaceStatus = 4711;
    const TraceCapture trace;
    EXPECT_EQ(Initialize_Mgmt_Functions(), 4711);
    EXPECT_EQ(trace.count('D', "Done calling ZAV initialization routines"), 1);
}

TEST_F(StartUpSteps, ThrowNothingAtTheHost) {
    taskManagerThrows = true;
    const TraceCapture trace;
    EXPECT_EQ(Initialize_Mgmt_Functions(), OXA_FAILED);
    EXPECT_EQ(steps, (Texts{"KAGREQT", "KINAGT", "KAGDYST", "task manager"}));
    EXPECT_EQ(trace.errors("zavmgmt"), (Texts{"Exception caught: no task manager"}));
}

}  // namespace
