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
    EXPECT_EQ(0, QVS_NCS_RegisterAgentInterface());
    ASSERT_EQ(1u, registrations.size());
    const Registration& made = registrations[0];
    EXPECT_EQ(&uuid__nil, made.object);
    EXPECT_EQ(QVS_Agent_v1_server_epv_locator(), made.stubs);
    EXPECT_EQ(&ZAV::BinaryDataTransfer,
              static_cast<const QVS_Agent_v1_mgr_epv*>(made.manager)->BinaryDataTransfer);
    EXPECT_STREQ("QVS_Agent_v1", made.interface->name);
    EXPECT_EQ(1u, made.interface->version);
    EXPECT_EQ(1u, made.interface->operations);
    EXPECT_EQ(1u, made.stubs->count);
    const uuid__t& id = made.interface->id;
    EXPECT_EQ(0xb1fb0fb3u, id.time_high);
    EXPECT_EQ(0x03c4u, id.time_low);
    EXPECT_EQ(0u, id.reserved);
    EXPECT_EQ(2u, id.family);
    EXPECT_THAT(id.host, testing::ElementsAre(0x00, 0x00, 0x09, 0x35, 0x18, 0x3d, 0x00));
}

TEST_F(InterfaceRegistration, ReturnsTheRuntimesStatusWithoutAWordOrASecondTry) {
    TraceCapture trace("ERROR DETAIL");
    for (const std::uint32_t status : {1u, 0x1C010003u, 0xFFFFFFFFu}) {
        answer = status;
        EXPECT_EQ(static_cast<int>(status), QVS_NCS_RegisterAgentInterface());
    }
    EXPECT_EQ(3u, registrations.size());
    EXPECT_THAT(trace.errors(), testing::IsEmpty());
    EXPECT_THAT(trace.details(), testing::IsEmpty());
}

TEST_F(InterfaceRegistration, ItsStatusIsThatOfTheStartUp) {
    const ScratchDir scratch;
    ::setenv("TOVRINHOME", scratch.makeDir("home").c_str(), 1);
    ::setenv("QVSDEPLOY_AGENTDEPOT", scratch.makeDir("depot").c_str(), 1);
    answer = 4711;
    EXPECT_EQ(4711, Initialize_Mgmt_Functions());
    EXPECT_EQ(1u, registrations.size());
    ::unsetenv("TOVRINHOME");
    ::unsetenv("QVSDEPLOY_AGENTDEPOT");
}

}  // namespace
