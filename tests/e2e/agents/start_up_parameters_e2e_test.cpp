// The universal agent's start-up parameters survive the end of the host.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <signal.h>

#include <filesystem>
#include <nlohmann/json.hpp>
#include <optional>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/host/universal_agent.h"

namespace {

using testing::HasSubstr;
using Guards = ManagedHost::Guards;

class StartUpParameters : public testing::Test {
protected:
    void start(Guards guards) {
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}},
                     std::vector<std::string>{}, guards);
    }
    /// An import whose task has come to the point before the change, which waits for openGate().
    void beginImport() {
        home.agentScript("[ $verb = start ] || until [ -e '" + gate() + "' ]; do sleep 0.02; done");
        import();
        ASSERT_TRUE(eventually([&] { return home.agentCalls().size() == 1; }));
    }
    void import() const {
        RawClient client(host->socket());
        const auto answer = client.post("/v1/query", home.importRequest().dump());
        ASSERT_EQ(answer.status, 200) << answer.body;
    }
    std::string gate() const { return home.files().path("gate"); }
    void openGate() const { home.files().write("gate", ""); }
    /// As the plug-in leaves the file when it is killed in rewriting it.
    void killAndCutOff() {
        host->program().signal(SIGKILL);
        ASSERT_EQ(host->program().wait().status, 128 + SIGKILL);
        openGate();
        home.files().write(home.kParameters, "|DATAPROVIDER|FI");
        host->start();
    }
    std::string parameters() const { return home.files().read(home.kParameters); }

    UniversalAgentHome home;
    std::optional<ManagedHost> host;
};

TEST_F(StartUpParameters, ThatAKilledHostHasCutOffAreRestored) {
    start(Guards::On);
    const std::string before = parameters();
    beginImport();
    killAndCutOff();
    EXPECT_EQ(parameters(), before);
    EXPECT_THAT(host->program().err(), HasSubstr("restored " + home.path() + "/config/"));
}

TEST_F(StartUpParameters, StayCutOffWithoutGuards) {
    start(Guards::Off);
    beginImport();
    killAndCutOff();
    EXPECT_EQ(parameters(), "|DATAPROVIDER|FI");
}

TEST_F(StartUpParameters, AreTheNewOnesOnceTheImportIsDone) {
    start(Guards::On);
    beginImport();
    openGate();
    EXPECT_TRUE(eventually([&] { return home.agentCalls().size() == 2; })) << "it is started again";
    EXPECT_THAT(parameters(), HasSubstr("|DATAPROVIDER|FILE,SCRP|\n"));
    EXPECT_TRUE(eventually([&] { return !home.files().exists(home.kSavedParameters); }));
}

}  // namespace
