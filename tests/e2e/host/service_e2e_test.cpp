// The host under a service manager: what its commands get, and what lives on when it ends.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>

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

}  // namespace
