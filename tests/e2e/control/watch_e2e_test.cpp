// The list of agents that is shown again and again.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <signal.h>

#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/starter_home.h"
#include "support/host/terminal.h"

namespace {

using testing::HasSubstr;

class WatchedAgents : public testing::Test {
protected:
    void endAgent() const {
        const ProgramResult agents = host.zavctl({"--json", "agents"});
        const auto instances = nlohmann::json::parse(agents.out).at("instances");
        ASSERT_EQ(instances.size(), 1U) << agents.out;
        const pid_t process = instances[0].at("pid").get<pid_t>();
        ASSERT_GT(process, 1) << agents.out;
        EXPECT_EQ(::kill(process, SIGKILL), 0);
    }

    StarterHome home{"ux"};
    const ManagedHost host{home.path(), home.environment(), {}, ManagedHost::Guards::On};
};

TEST_F(WatchedAgents, AreShownInPlaceInATerminalUntilCtrlC) {
    if (!Terminal::isThere()) GTEST_SKIP() << "no tmux";
    const Terminal terminal(zavctlPath() + " --socket " + host.socket() + " agents --watch");
    EXPECT_TRUE(terminal.comesToShow("Monitoring agent")) << terminal.shown();
    EXPECT_EQ(terminal.shown().find("running"), std::string::npos);
    EXPECT_EQ(host.zavctl({"start", "ux"}).status, 0);
    EXPECT_TRUE(terminal.comesToShow("running")) << terminal.shown();
    const std::string shown = terminal.shown();
    EXPECT_EQ(shown.find("PRODUCT"), shown.rfind("PRODUCT  VERSION")) << shown;
    endAgent();
    EXPECT_TRUE(terminal.comesToShow("should run, does not")) << terminal.shown();
    terminal.type("C-c");
    EXPECT_TRUE(eventually([&] { return !terminal.isOpen(); }));
}

TEST_F(WatchedAgents, AreWrittenAnewOnlyWhenTheyHaveChangedWhereThereIsNoTerminal) {
    Program watch({zavctlPath(), "--socket", host.socket(), "agents", "--watch"});
    ASSERT_TRUE(watch.awaitOutput("Monitoring agent", std::chrono::seconds(60))) << watch.err();
    EXPECT_EQ(host.zavctl({"start", "ux"}).status, 0);
    ASSERT_TRUE(watch.awaitOutput("running", std::chrono::seconds(60))) << watch.out();
    watch.signal(SIGINT);
    const ProgramResult ended = watch.wait();
    EXPECT_EQ(ended.status, 130) << ended.err;
    std::size_t pages = 0;
    for (std::size_t at = 0; (at = ended.out.find("PRODUCT  VERSION", at)) != std::string::npos;
         ++at)
        ++pages;
    EXPECT_LE(pages, 3U) << ended.out << "before, perhaps while it starts, and then";
    EXPECT_GE(pages, 2U) << ended.out;
    EXPECT_EQ(ended.out.find('\x1b'), std::string::npos) << ended.out;
}

TEST_F(WatchedAgents, AreWatchedNoLongerThanTheTimeOut) {
    const ProgramResult ended = host.zavctl({"--timeout", "5", "agents", "--watch"});
    EXPECT_EQ(ended.status, 0) << ended.err;
    EXPECT_THAT(ended.out, HasSubstr("Monitoring agent"));
}

}  // namespace
