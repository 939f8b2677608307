// START, STOP and RESTART from the command line to the agent script and back.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <unistd.h>

#include <fstream>
#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

using nlohmann::json;

std::string agentPath(const ScriptHome& home) {
    return home.path() + "/bin/TovrinAgent";
}

TEST(StartStop, StartRunsTheAgentScriptAndReportsItsOutcome) {
    ScriptHome home;
    ManagedHost host(home.path());
    const ProgramResult result = host.zavctl({"start", "ux"});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_NE(result.out.find("start ux: accepted\n"), std::string::npos) << result.out;
    EXPECT_NE(result.out.find("start ux: done after"), std::string::npos) << result.out;
    EXPECT_EQ(result.err, "");
    EXPECT_THAT(home.agentCalls(), testing::ElementsAre("-h " + home.path() + " start ux"));
}

TEST(StartStop, JsonHoldsTheReplyAndTheOutcome) {
    ScriptHome home;
    ManagedHost host(home.path(), {}, {"--origin-node", "node7:UX"});
    const ProgramResult result = host.zavctl({"--json", "stop", "ux", "--transid", "T-1"});
    EXPECT_EQ(result.status, 0) << result.err;
    const json document = json::parse(result.out);
    EXPECT_EQ(document["reply"]["COMMAND"], "STOP");
    EXPECT_EQ(document["reply"]["TRANSID"], "T-1");
    EXPECT_EQ(document["reply"]["RETVAL"], 0);
    EXPECT_EQ(document["reply"]["RETMSGID"], "");
    EXPECT_EQ(document["reply"]["ORIGINNODE"], "node7:UX");
    ASSERT_EQ(document["events"].size(), 1U);
    EXPECT_EQ(document["events"][0]["TRANSID"], "T-1");
    EXPECT_EQ(document["events"][0]["RETVAL"], 0);
    EXPECT_EQ(document["events"][0].size(), 7U);
    EXPECT_THAT(home.agentCalls(), testing::ElementsAre("-h " + home.path() + " -c stop ux"));
}

TEST(StartStop, AFailingScriptIsAFailureWithItsCommandLine) {
    ScriptHome home;
    home.agentScript("exit 3");
    ManagedHost host(home.path());
    const ProgramResult result = host.zavctl({"--json", "start", "ux"});
    EXPECT_EQ(result.status, 1);
    const json event = json::parse(result.out)["events"][0];
    EXPECT_EQ(event["RETVAL"], 1024);
    EXPECT_EQ(event["RETMSGID"], "ZAV1024E");
    EXPECT_EQ(event["RETMSGPARM"], agentPath(home) + "  -h " + home.path() + " start ux");
    EXPECT_NE(host.trace().find("ZAV1024E Bad return code from start/stop command [" +
                                agentPath(home) + "  -h " + home.path() + " start ux]"),
              std::string::npos);
}

TEST(StartStop, AMissingScriptIsAFailureOfItsOwn) {
    ScriptHome home;
    ManagedHost host(home.path());
    ASSERT_EQ(::unlink(agentPath(home).c_str()), 0);
    const ProgramResult result = host.zavctl({"start", "ux"});
    EXPECT_EQ(result.status, 1);
    EXPECT_NE(result.out.find("ZAV1025E: the start or stop command could not be run"),
              std::string::npos)
        << result.out;
}

TEST(StartStop, AnInstanceIsPassedOn) {
    ScriptHome home;
    ManagedHost host(home.path());
    EXPECT_EQ(host.zavctl({"start", "ux", "--instance", "inst1"}).status, 0);
    EXPECT_THAT(home.agentCalls(),
                testing::ElementsAre("-h " + home.path() + " -o inst1 start ux"));
}

TEST(StartStop, RestartStopsAndStartsAndSucceedsWhenOnlyTheStopFails) {
    ScriptHome home;
    home.agentScript("test \"$verb\" = start");
    ManagedHost host(home.path());
    const ProgramResult result = host.zavctl({"restart", "ux"});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_NE(result.out.find("restart ux: done"), std::string::npos);
    EXPECT_NE(result.out.find("ZAV1024E"), std::string::npos) << "the failed stop's message stays";
    EXPECT_THAT(home.agentCalls(), testing::ElementsAre("-h " + home.path() + " -c stop ux",
                                                        "-h " + home.path() + " start ux"));
}

TEST(StartStop, StartHasAnEmptyTraceLogInItsEnvironmentAndStopDoesNot) {
    ScriptHome home;
    home.agentScript("printf '[%s]' \"${KBB_RAS1_LOG-unset}\" >>'" + home.files().path("env") +
                     "'");
    ManagedHost host(home.path());
    host.zavctl({"start", "ux"});
    EXPECT_EQ(home.files().read("env"), "[]");
    host.zavctl({"stop", "ux"});
    EXPECT_THAT(home.files().read("env"), testing::MatchesRegex("\\[\\]\\[/.*/trace\\.log\\]"));
}

TEST(StartStop, TasksRunOneAtATimeInTheOrderOfTheirArrival) {
    ScriptHome home;
    home.agentScript("echo begin $product >>'" + home.files().path("order") +
                     "'; sleep 0.2; echo end $product >>'" + home.files().path("order") + "'");
    ManagedHost host(home.path());
    for (const char* product : {"aa", "bb"}) {
        EXPECT_EQ(host.zavctl({"start", product, "--no-wait"}).status, 0);
    }
    EXPECT_EQ(host.zavctl({"start", "cc"}).status, 0);
    EXPECT_EQ(home.files().read("order"), "begin aa\nend aa\nbegin bb\nend bb\nbegin cc\nend cc\n");
}

TEST(StartStop, EventsShowEveryOutcomeAndOnlyThoseOfTheTransactionAskedFor) {
    ScriptHome home;
    ManagedHost host(home.path());
    const auto all = host.startZavctl({"events", "--count", "2"});
    const auto one = host.startZavctl({"events", "--transid", "B", "--count", "1"});
    ASSERT_TRUE(eventually([&] {
        return json::parse(host.zavctl({"--json", "status"}).out)["subscriptions"] == 2;
    }));
    host.zavctl({"start", "ux", "--transid", "A", "--no-wait"});
    host.zavctl({"start", "ux", "--transid", "B", "--no-wait"});
    const ProgramResult allResult = all->wait();
    const ProgramResult oneResult = one->wait();
    EXPECT_EQ(allResult.status, 0);
    EXPECT_EQ(oneResult.status, 0);
    const json events = json::parse(allResult.out)["events"];
    ASSERT_EQ(events.size(), 2U);
    EXPECT_EQ(events[0]["TRANSID"], "A");
    EXPECT_EQ(events[1]["TRANSID"], "B");
    const json filtered = json::parse(oneResult.out)["events"];
    ASSERT_EQ(filtered.size(), 1U);
    EXPECT_EQ(filtered[0]["TRANSID"], "B");
}

TEST(StartStop, NoOutcomeWithinTheTimeoutIsAStatusOfItsOwn) {
    ScriptHome home;
    home.agentScript("sleep 3");
    ManagedHost host(home.path());
    EXPECT_EQ(host.zavctl({"--timeout", "0.5", "start", "ux"}).status, 4);
}

TEST(StartStop, ACommandThatHangsIsKilledAtTheTimeoutOfTheHost) {
    ScriptHome home;
    home.agentScript("echo $$ >'" + home.files().path("pid") + "'; exec sleep 60");
    ManagedHost host(home.path(), {{"TIMEOUT", "10"}});
    const ProgramResult result = host.zavctl({"--json", "start", "ux"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(json::parse(result.out)["events"][0]["RETMSGID"], "ZAV1025E");
    EXPECT_FALSE(
        std::ifstream("/proc/" + std::to_string(std::stoi(home.files().read("pid"))) + "/stat")
            .good());
    EXPECT_EQ(host.children(), 0);
}

TEST(StartStop, TheHostEndsWithTheTaskInHand) {
    ScriptHome home;
    home.agentScript("sleep 1; echo done >'" + home.files().path("done") + "'");
    ManagedHost host(home.path());
    ASSERT_EQ(host.zavctl({"start", "ux", "--no-wait"}).status, 0);
    ASSERT_TRUE(eventually([&] { return !home.agentCalls().empty(); }));
    EXPECT_EQ(host.stop().status, 0);
    EXPECT_EQ(home.files().read("done"), "done\n");
}

}  // namespace
