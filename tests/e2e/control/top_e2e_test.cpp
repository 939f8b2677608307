// The host at a glance, in a terminal.
// ctest-label: threaded

#include <gmock/gmock.h>

#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/host/terminal.h"

namespace {

using nlohmann::json;
using testing::HasSubstr;

TEST(Top, ShowsWhatTheHostIsAtUntilCtrlC) {
    if (!Terminal::isThere()) GTEST_SKIP() << "no tmux";
    ScriptHome home;
    home.products({"ux"}, "exit 0");
    home.agentScript("echo the first step; until [ -e '" + home.files().path("gate") +
                     "' ]; do sleep 0.02; done");
    const ManagedHost host(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, {},
                           ManagedHost::Guards::On);
    const Terminal terminal(zavctlPath() + " --socket " + host.socket() + " top");
    EXPECT_TRUE(terminal.comesToShow("Nothing is at work.")) << terminal.shown();
    const auto task = host.startZavctl({"start", "ux", "--transid", "T1"});
    EXPECT_TRUE(terminal.comesToShow("T1: START ux, running")) << terminal.shown();
    home.files().write("gate", "");
    EXPECT_EQ(task->wait(std::chrono::seconds(60)).status, 0);
    EXPECT_TRUE(terminal.comesToShow("done")) << terminal.shown();
    EXPECT_THAT(terminal.shown(), HasSubstr("T1"));
    terminal.type("C-c");
    EXPECT_TRUE(eventually([&] { return !terminal.isOpen(); }, std::chrono::seconds(60)));
}

TEST(Top, IsADocumentForPrograms) {
    ScriptHome home;
    const ManagedHost host(home.path());
    const ProgramResult result = host.zavctl({"--json", "top"});
    EXPECT_EQ(result.status, 0) << result.err;
    const json document = json::parse(result.out);
    for (const char* member : {"health", "ready", "work", "instances", "recent"})
        EXPECT_TRUE(document.contains(member)) << member;
    EXPECT_EQ(document["work"], json::array());
}

}  // namespace
