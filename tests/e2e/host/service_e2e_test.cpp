// The host under a service manager: what its commands get, and what lives on when it ends.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>

#include <nlohmann/json.hpp>
#include <sstream>

#include "support/host/managed_host.h"
#include "support/host/notify_socket.h"
#include "support/host/script_home.h"

namespace {

TEST(Service, CommandsDoNotGetTheVariablesOfTheServiceManager) {
    ScriptHome home;
    home.agentScript("env > " + home.files().path("environment"));
    const std::string notify = home.files().path("notify");
    const NotifySocket manager(notify);
    ManagedHost host(home.path(), {{"NOTIFY_SOCKET", notify},
                                   {"WATCHDOG_USEC", "3600000000"},
                                   {"LISTEN_PID", "1"},
                                   {"LISTEN_FDS", "1"},
                                   {"LISTEN_FDNAMES", "http"},
                                   {"KEPT", "yes"}});
    EXPECT_EQ(host.zavctl({"start", "ux"}).status, 0);
    std::istringstream lines(home.files().read("environment"));
    bool kept = false;
    for (std::string line; std::getline(lines, line);) {
        kept = kept || line == "KEPT=yes";
        for (const char* const prefix : {"NOTIFY_", "WATCHDOG_", "LISTEN_"})
            EXPECT_NE(line.rfind(prefix, 0), 0U) << line;
    }
    EXPECT_TRUE(kept);
}

TEST(Service, TheStatusNamesTheTaskInHand) {
    ScriptHome home;
    home.agentScript("while [ ! -e " + home.files().path("go") + " ]; do sleep 0.05; done");
    const std::string notify = home.files().path("notify");
    const NotifySocket manager(notify);
    ManagedHost host(home.path(), {{"NOTIFY_SOCKET", notify}});
    EXPECT_EQ(manager.next(), "READY=1\n");
    EXPECT_EQ(host.zavctl({"start", "ux", "--no-wait"}).status, 0);
    EXPECT_EQ(manager.await("STATUS=1 running"), "STATUS=1 running: START ux\n");
    EXPECT_EQ(host.zavctl({"stop", "lz", "--no-wait"}).status, 0);
    EXPECT_EQ(manager.await("STATUS=1 queued"), "STATUS=1 queued, 1 running: START ux\n");
    home.files().write("go", "");
    EXPECT_EQ(manager.await("STATUS=idle"), "STATUS=idle\n");
    EXPECT_EQ(host.stop().status, 0);
    EXPECT_EQ(manager.await("STOPPING="), "STOPPING=1\n");
}

/// A host whose trace has no place of its own, and whose log is for machines.
class JsonLog : public testing::Test {
protected:
    JsonLog() {
        home.products({"ux"}, "exit 0");
        home.agentScript("echo 'first \"line\"'; echo second >&2; exit 3");
    }
    /// Its lines on standard error after one start that went well and one command that failed.
    std::vector<std::string> linesOfAFailure() {
        ManagedHost host(home.path(), {{"KBB_RAS1_LOG", ""}}, {"--log-format", "json"},
                         ManagedHost::Guards::On);
        EXPECT_EQ(host.zavctl({"start", "ux"}).status, 1);
        const ProgramResult ended = host.stop();
        EXPECT_EQ(ended.status, 0) << ended.err;
        std::vector<std::string> lines;
        std::istringstream in(ended.err);
        for (std::string line; std::getline(in, line);)
            lines.push_back(line);
        return lines;
    }
    std::string trace() const { return home.files().read("home/zavhost/trace.log"); }

    ScriptHome home;
};

TEST_F(JsonLog, IsWhatStandardErrorHasAndNothingElse) {
    std::vector<std::string> levels;
    for (const std::string& line : linesOfAFailure()) {
        const auto entry = nlohmann::json::parse(line, nullptr, false);
        ASSERT_TRUE(entry.is_object()) << line;
        if (entry.contains("task")) levels.push_back(entry.value("level", ""));
    }
    EXPECT_EQ(levels, (std::vector<std::string>{"info", "warning"})) << "its begin and its end";
}

TEST_F(JsonLog, LeavesTheTraceInTheStateDirectoryForItsOwnerOnly) {
    linesOfAFailure();
    EXPECT_NE(trace().find(" E zav"), std::string::npos) << trace();
    EXPECT_NE(trace().find("Bad return code from start/stop command"), std::string::npos)
        << trace();
    struct stat found {};
    ASSERT_EQ(::stat(home.files().path("home/zavhost/trace.log").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode, S_IFREG | 0600U);
}

TEST_F(JsonLog, SaysThatThereIsNoTraceWhereItsFileCannotBeOpened) {
    home.files().makeDir("home/zavhost");
    ASSERT_EQ(::chmod(home.files().path("home/zavhost").c_str(), 0700), 0);
    home.files().makeDir("home/zavhost/trace.log");
    bool told = false;
    for (const std::string& line : linesOfAFailure()) {
        EXPECT_TRUE(nlohmann::json::parse(line, nullptr, false).is_object()) << line;
        told =
            told || line.find("trace.log cannot be opened; nothing is traced") != std::string::npos;
    }
    EXPECT_TRUE(told);
}

}  // namespace
