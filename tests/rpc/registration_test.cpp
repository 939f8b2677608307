// How the file transfer interface is registered with the runtime, and what happens to its answer.
// ctest-label: threaded
#include <gmock/gmock.h>

#include <cstdlib>
#include <vector>

#include "mgmt/zavmgmt.h"
#include "rpc/zavagts.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"

namespace {

struct Registration {
    const uuid__t* object;
    const rpc__if_spec* interface;
    const rpc__server_epv* stubs;
    const void* manager;
};
std::vector<Registration> registrations;
std::uint32_t answer = 0;

}  // namespace

// This definition replaces the embedded runtime's.
extern "C" void rpc__register_mgr(const uuid__t* object, const rpc__if_spec* interface,
                                  const rpc__server_epv* stubs, const void* manager,
                                  std::uint32_t* status) {
    registrations.push_back({object, interface, stubs, manager});
    *status = answer;
}

namespace {

class InterfaceRegistration : public testing::Test {
protected:
    InterfaceRegistration() {
        registrations.clear();
        answer = 0;
    }
};

TEST_F(InterfaceRegistration, OffersTheInterfaceForTheNilObject) {
    EXPECT_EQ(QVS_NCS_RegisterAgentInterface(), 0);
    ASSERT_EQ(registrations.size(), 1u);
    const Registration& made = registrations[0];
    EXPECT_EQ(made.object, &uuid__nil);
    EXPECT_EQ(QVS_Agent_v1_server_epv_locator(), made.stubs);
    EXPECT_EQ(static_cast<const QVS_Agent_v1_mgr_epv*>(made.manager)->BinaryDataTransfer,
              &ZAV::BinaryDataTransfer);
    EXPECT_STREQ(made.interface->name, "QVS_Agent_v1");
    EXPECT_EQ(made.interface->version, 1u);
    EXPECT_EQ(made.interface->operations, 1u);
    EXPECT_EQ(made.stubs->count, 1u);
    const uuid__t& id = made.interface->id;
    EXPECT_EQ(id.time_high, 0xb1fb0fb3u);
    EXPECT_EQ(id.time_low, 0x03c4u);
    EXPECT_EQ(id.reserved, 0u);
    EXPECT_EQ(id.family, 2u);
    EXPECT_THAT(id.host, testing::ElementsAre(0x00, 0x00, 0x09, 0x35, 0x18, 0x3d, 0x00));
}

TEST_F(InterfaceRegistration, ReturnsTheRuntimesStatusWithoutAWordOrASecondTry) {
    TraceCapture trace("ERROR DETAIL");
    for (const std::uint32_t status : {1u, 0x1C010003u, 0xFFFFFFFFu}) {
        answer = status;
        EXPECT_EQ(QVS_NCS_RegisterAgentInterface(), static_cast<int>(status));
    }
    EXPECT_EQ(registrations.size(), 3u);
    EXPECT_THAT(trace.errors(), testing::IsEmpty());
    EXPECT_THAT(trace.details(), testing::IsEmpty());
}

TEST_F(InterfaceRegistration, ItsStatusIsThatOfTheStartUp) {
    const ScratchDir scratch;
    ::setenv("TOVRINHOME", scratch.makeDir("home").c_str(), 1);
    ::setenv("QVSDEPLOY_AGENTDEPOT", scratch.makeDir("depot").c_str(), 1);
    answer = 4711;
    EXPECT_EQ(Initialize_Mgmt_Functions(), 4711);
    EXPECT_EQ(registrations.size(), 1u);
    ::unsetenv("TOVRINHOME");
    ::unsetenv("QVSDEPLOY_AGENTDEPOT");
}

}  // namespace
