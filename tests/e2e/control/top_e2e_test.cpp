// The host at a glance, in a terminal.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;
using testing::HasSubstr;

/// A terminal of 80 columns and 24 lines, in which one program runs.
class Terminal {
public:
    explicit Terminal(const std::string& command) {
        run({"new-session", "-d", "-x", "80", "-y", "24", command});
    }
    ~Terminal() { run({"kill-server"}); }
    Terminal(const Terminal&) = delete;
    Terminal& operator=(const Terminal&) = delete;

    std::string shown() const { return run({"capture-pane", "-p"}).out; }
    void type(const std::string& key) const { run({"send-keys", key}); }
    bool isOpen() const { return run({"has-session"}).status == 0; }

private:
    ProgramResult run(std::vector<std::string> words) const {
        const std::vector<std::string> tmux = {"/usr/bin/tmux", "-f", "/dev/null", "-S",
                                               scratch_.path("tmux")};
        words.insert(words.begin(), tmux.begin(), tmux.end());
        return runProgram(words, "", {{"LC_ALL", "C.UTF-8"}, {"TERM", "screen"}});
    }

    ScratchDir scratch_;
};

TEST(Top, ShowsWhatTheHostIsAtUntilCtrlC) {
    if (::access("/usr/bin/tmux", X_OK) != 0) GTEST_SKIP() << "no tmux";
    ScriptHome home;
    home.products({"ux"}, "exit 0");
    home.agentScript("echo the first step; until [ -e '" + home.files().path("gate") +
                     "' ]; do sleep 0.02; done");
    const ManagedHost host(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, {},
                           ManagedHost::Guards::On);
    const Terminal terminal(zavctlPath() + " --socket " + host.socket() + " top");
    const auto shows = [&terminal](const std::string& text) {
        return eventually([&] { return terminal.shown().find(text) != std::string::npos; },
                          std::chrono::seconds(60));
    };
    EXPECT_TRUE(shows("Nothing is at work.")) << terminal.shown();
    const auto task = host.startZavctl({"start", "ux", "--transid", "T1"});
    EXPECT_TRUE(shows("T1: START ux, running")) << terminal.shown();
    home.files().write("gate", "");
    EXPECT_EQ(task->wait(std::chrono::seconds(60)).status, 0);
    EXPECT_TRUE(shows("done")) << terminal.shown();
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
