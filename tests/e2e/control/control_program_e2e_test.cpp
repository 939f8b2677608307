// ctest-label: threaded
//
// zavctl as people and scripts use it: what each command line asks of the host, where it looks for
// the host, and what it says when the host goes away.

#include <gmock/gmock.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <nlohmann/json.hpp>

#include "ctl/client/canned_host.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/process/left_running.h"

namespace {

using nlohmann::json;
using testing::ContainsRegex;
using testing::HasSubstr;
using Arguments = std::vector<std::string>;

/// The task that a command line asks for, seen by a host that accepts whatever it is.
json requested(const Arguments& arguments) {
    std::string request;
    ctl_test::CannedHost host([&request](const ctl_test::CannedHost& self) {
        while (request.rfind("POST ", 0) != 0) {
            const ctl_test::Peer peer = self.accept();
            request = peer.request();
            if (request.rfind("GET /v1/health ", 0) == 0) {
                peer.answer(200, R"({"guarded": false})");
            } else {
                peer.answer(202, R"({"id": "1", "state": "running", "reply": {"RETVAL": 0}})");
            }
        }
    });
    Arguments line = {zavctlPath(), "--socket", host.path()};
    line.insert(line.end(), arguments.begin(), arguments.end());
    const auto end = std::find(line.begin(), line.end(), "--");
    line.insert(end, {"--json", "--no-wait", "--transid", "T"});
    const ProgramResult result = runProgram(line);
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(json::parse(result.out, nullptr, false),
              (json{{"reply", {{"RETVAL", 0}}},
                    {"events", json::array()},
                    {"task", {{"id", "1"}, {"state", "running"}}}}));
    host.join();
    EXPECT_EQ(request.rfind("POST /v1/tasks ", 0), 0U) << request;
    json body = json::parse(request.substr(request.find("\r\n\r\n")));
    EXPECT_EQ(body["transid"], "T");
    body.erase("transid");
    return body;
}

struct CommandLine {
    Arguments arguments;
    json request;
};

TEST(ControlProgram, EveryCommandLineIsItsRequest) {
    const std::vector<CommandLine> lines = {
        {{"start", "ux"}, {{"command", "START"}, {"product", "ux"}}},
        {{"start", "ux", "--target", "a:h:UX"},
         {{"command", "START"}, {"product", "ux"}, {"targetmsn", "a:h:UX"}}},
        {{"start", "ux", "--instance", "a"},
         {{"command", "START"}, {"product", "ux"}, {"optional", "INSTANCE"}, {"targetmsn", "a"}}},
        {{"stop", "ux", "--target", "a:h:UX"},
         {{"command", "STOP"}, {"product", "ux"}, {"targetmsn", "a:h:UX"}}},
        {{"restart", "ux", "--target", "a:h:UX"},
         {{"command", "RESTART"}, {"product", "ux"}, {"targetmsn", "a:h:UX"}}},
        {{"install", "ux", "7", "--optional", "SETCMS", "--", "/bin/true", "-q"},
         {{"command", "INSTALL"},
          {"product", "ux"},
          {"version", "7"},
          {"optional", "SETCMS"},
          {"context", "/bin/true -q"}}},
        {{"install", "ux", "7", "--restart", "--", "/bin/true"},
         {{"command", "INSTALL"},
          {"product", "ux"},
          {"version", "7"},
          {"optional", "REQUIRES_RESTART"},
          {"context", "/bin/true"}}},
        {{"uninstall", "ux"}, {{"command", "UNINSTALL"}, {"product", "ux"}}},
        {{"remove-instance", "ux", "a:h:UX", "--context", "text"},
         {{"command", "REMOVEINSTANCE"},
          {"product", "ux"},
          {"targetmsn", "a:h:UX"},
          {"context", "text"}}},
        {{"config", "set", "ux", "A=1", "--target", "a:h:UX"},
         {{"command", "SETCONFIG"},
          {"product", "ux"},
          {"targetmsn", "a:h:UX"},
          {"context", "A=1"}}},
        {{"ua-config", "--metafile", "x.mdl", "--scripts", "a,b", "--port", "7700", "--restart",
          "--target", "a:h:UA"},
         {{"command", "SETCONFIG"},
          {"product", "um"},
          {"uaconfig", "x.mdl"},
          {"uascript", "a,b"},
          {"context", "PORT=7700,RESTART=Y"},
          {"targetmsn", "a:h:UA"}}},
        {{"ua-config", "--metafile", "x.mdl", "--restart"},
         {{"command", "SETCONFIG"},
          {"product", "um"},
          {"uaconfig", "x.mdl"},
          {"context", "RESTART=Y"}}},
        {{"ua-config", "--scripts", "a"},
         {{"command", "SETCONFIG"}, {"product", "um"}, {"uascript", "a"}}},
    };
    for (const CommandLine& line : lines)
        EXPECT_EQ(requested(line.arguments), line.request);
}

TEST(ControlProgram, AWordOfAnInstallCommandStaysAWord) {
    ScriptHome home;
    ManagedHost host(home.path());
    const std::string seen = home.files().path("seen");
    const std::string installer =
        home.files().script("installer", "printf '[%s]' \"$@\" >>'" + seen + "'");
    EXPECT_EQ(host.zavctl({"install", "ux", "7", "--", installer, "a b", "c", "'d e'"}).status, 0);
    EXPECT_EQ(home.files().read("seen"), "[a b][c][d e]");
    // A command line that comes as one word is taken as it is.
    EXPECT_EQ(host.zavctl({"install", "ux", "7", "--", installer + " f 'g h'"}).status, 0);
    EXPECT_EQ(home.files().read("seen"), "[a b][c][d e][f][g h]");
    EXPECT_EQ(host.zavctl({"install", "ux", "7", "--", "/bin/sh", "-c", "exit 3"}).status, 1);
}

TEST(ControlProgram, EveryCommandHasATransactionOfItsOwn) {
    ScriptHome home;
    ManagedHost host(home.path());
    const auto transid = [&host] {
        const ProgramResult result = host.zavctl({"--json", "start", "ux", "--no-wait"});
        return json::parse(result.out)["task"]["transid"].get<std::string>();
    };
    const std::string first = transid();
    EXPECT_NE(first, "");
    EXPECT_NE(transid(), first);
}

TEST(ControlProgram, AnUnknownWordIsWrongUsageAndIsNamed) {
    for (const Arguments& arguments :
         {Arguments{"frobnicate"}, Arguments{"--frobnicate"}, Arguments{"config", "frobnicate"},
          Arguments{"start", "--frobnicate"}, Arguments{"stop", "ux", "frobnicate"}}) {
        Arguments line = {zavctlPath()};
        line.insert(line.end(), arguments.begin(), arguments.end());
        const ProgramResult result = runProgram(line);
        EXPECT_EQ(result.status, 2);
        EXPECT_EQ(result.out, "");
        EXPECT_THAT(result.err,
                    ContainsRegex("(command|option|with) \"(config )?(--)?frobnicate\"\n"));
    }
}

TEST(ControlProgram, EveryCommandHasHelpThatNeedsNoHost) {
    const Arguments commands[] = {{},
                                  {"query"},
                                  {"agents"},
                                  {"start"},
                                  {"stop"},
                                  {"restart"},
                                  {"install"},
                                  {"uninstall"},
                                  {"complete-install"},
                                  {"config"},
                                  {"config", "get"},
                                  {"config", "set"},
                                  {"config", "edit"},
                                  {"push"},
                                  {"ua-config"},
                                  {"events"},
                                  {"status"},
                                  {"remove-instance"},
                                  {"tasks"},
                                  {"task"},
                                  {"task", "wait"},
                                  {"task", "output"},
                                  {"task", "cancel"},
                                  {"help"}};
    for (const Arguments& command : commands) {
        Arguments line = {zavctlPath()};
        line.insert(line.end(), command.begin(), command.end());
        line.emplace_back("--help");
        const ProgramResult result = runProgram(line);
        EXPECT_EQ(result.status, 0);
        EXPECT_EQ(result.err, "");
        std::string usage = "Usage: zavctl ";
        for (const std::string& word : command)
            usage += word + " ";
        EXPECT_THAT(result.out, HasSubstr(usage));
    }
}

TEST(ControlProgram, TheVerbHelpSaysWhatTheOptionSays) {
    const ProgramResult verb = runProgram({zavctlPath(), "help", "config", "set"});
    EXPECT_EQ(verb.status, 0);
    EXPECT_EQ(verb.err, "");
    EXPECT_EQ(verb.out, runProgram({zavctlPath(), "config", "set", "--help"}).out);
    EXPECT_EQ(runProgram({zavctlPath(), "help"}).out, runProgram({zavctlPath(), "--help"}).out);
    const ProgramResult unknown = runProgram({zavctlPath(), "help", "frobnicate"});
    EXPECT_EQ(unknown.status, 2);
    EXPECT_EQ(unknown.out, "");
    EXPECT_EQ(unknown.err, "zavctl: there is no command \"frobnicate\"\n");
}

TEST(ControlProgram, TellsItsVersion) {
    const ProgramResult result = runProgram({zavctlPath(), "--version"});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_THAT(result.out, ContainsRegex("^zavctl [0-9]+[.][0-9]+[.][0-9]+\n$"));
}

// ---- Where the host is --------------------------------------------------------------------------

TEST(ControlProgram, FindsTheHostByTheEnvironmentAsTheHostDoes) {
    ScriptHome home;
    home.files().makeDir("runtime");
    const Environment byRuntime = {{"ZAV_SOCKET", ""},
                                   {"XDG_RUNTIME_DIR", home.files().path("runtime")},
                                   {"KBB_RAS1_LOG", "/dev/null"}};
    const Environment byName = {{"ZAV_SOCKET", home.files().path("named")},
                                {"XDG_RUNTIME_DIR", home.files().path("runtime")},
                                {"KBB_RAS1_LOG", "/dev/null"}};
    const std::string file = home.files().write("file", "content");
    const std::pair<Environment, std::string> cases[] = {
        {byRuntime, home.files().path("runtime/zavhost.sock")},
        {byName, home.files().path("named")}};
    for (const auto& [environment, socket] : cases) {
        Program host({zavhostPath(), "--unguarded", "--home", home.path()}, "", environment);
        ASSERT_TRUE(host.awaitOutput("ready: " + socket + "\n", std::chrono::minutes(3)))
            << host.err();
        EXPECT_EQ(runProgram({zavctlPath(), "status"}, "", environment).status, 0);
        EXPECT_EQ(runProgram({zavctlPath(), "push", file}, "", environment).status, 0);
        EXPECT_EQ(runProgram({zavctlPath(), "--socket", socket, "push", file}).status, 0);
        host.signal(SIGTERM);
        EXPECT_EQ(host.wait().status, 0);
        const ProgramResult gone = runProgram({zavctlPath(), "status"}, "", environment);
        EXPECT_EQ(gone.status, 3);
        EXPECT_THAT(gone.err, HasSubstr("no host reached at " + socket + ": "));
    }
}

// ---- A host that goes away ----------------------------------------------------------------------

TEST(ControlProgram, AHostThatDoesNotAnswerIsStatusFour) {
    ScriptHome home;
    ManagedHost host(home.path());
    ::kill(host.pid(), SIGSTOP);
    for (const Arguments& command :
         {Arguments{"status"}, Arguments{"agents"}, Arguments{"query", "KINAGT"},
          Arguments{"start", "ux"}, Arguments{"config", "get", "ux"}, Arguments{"complete-install"},
          Arguments{"events", "--count", "1"}}) {
        for (const char* timeout : {"0.2", "0"}) {
            Arguments line = {"--timeout", timeout};
            line.insert(line.end(), command.begin(), command.end());
            const ProgramResult result = host.zavctl(line);
            EXPECT_EQ(result.status, 4) << command[0];
            EXPECT_EQ(result.out, "");
            EXPECT_EQ(result.err, "zavctl: no answer within the time-out\n");
        }
    }
    ::kill(host.pid(), SIGCONT);
}

TEST(ControlProgram, AHostThatGoesAwayAndStaysAwayLeavesNoOutcome) {
    ScriptHome home;
    home.agentScript(untilReleased(home.files().path("go")));
    ManagedHost host(home.path());
    const auto waiting = host.startZavctl({"--timeout", "15", "start", "ux", "--transid", "T"});
    ASSERT_TRUE(eventually([&] { return !home.agentCalls().empty(); }));
    // Time for the answer, which nothing else shows: without it nobody knows of the task.
    ASSERT_EQ(host.zavctl({"task", "show", "T"}).status, 0);
    host.program().signal(SIGKILL);
    const ProgramResult result = waiting->wait();
    EXPECT_EQ(result.status, 4);
    EXPECT_EQ(result.err,
              "zavctl: note: the host went away; waiting for it to come back\n"
              "zavctl: no outcome within the time-out\n"
              "  zavctl task show T tells how it ended\n");
    const json document = json::parse(result.out);
    EXPECT_EQ(document["task"]["transid"], "T");
    EXPECT_EQ(document["events"], json::array());
    home.files().write("go", "");
}

TEST(ControlProgram, EventsThatEndWithTheHostAreStatusThreeAndAWholeDocument) {
    ScriptHome home;
    ManagedHost host(home.path());
    const auto events = host.startZavctl({"--timeout", "15", "events"});
    ASSERT_TRUE(events->awaitOutput("{\"events\": [", std::chrono::seconds(20)));
    ASSERT_EQ(host.zavctl({"start", "ux", "--transid", "T"}).status, 0);
    ASSERT_TRUE(events->awaitOutput("\"T\"", std::chrono::seconds(20)));
    host.program().signal(SIGKILL);
    const ProgramResult result = events->wait();
    EXPECT_EQ(result.status, 3);
    EXPECT_EQ(result.err,
              "zavctl: the connection to the host is lost; trying again\n"
              "zavctl: the host closed the stream\n");
    EXPECT_EQ(json::parse(result.out)["events"].size(), 1U);
}

TEST(ControlProgram, InterruptedEventsEndAsSignalledAndAreAWholeDocument) {
    ScriptHome home;
    ManagedHost host(home.path());
    for (const int number : {SIGINT, SIGTERM}) {
        const auto events = host.startZavctl({"events"});
        ASSERT_TRUE(events->awaitOutput("{\"events\": [", std::chrono::seconds(20)));
        ASSERT_EQ(host.zavctl({"start", "ux", "--transid", "T"}).status, 0);
        ASSERT_TRUE(events->awaitOutput("\"T\"", std::chrono::seconds(20)));
        events->signal(number);
        const ProgramResult result = events->wait();
        EXPECT_EQ(result.status, 128 + number);
        EXPECT_EQ(json::parse(result.out)["events"].size(), 1U);
    }
}

TEST(ControlProgram, EventsThatNobodyReadsAnyMoreEnd) {
    ScriptHome home;
    ManagedHost host(home.path());
    const std::string events = zavctlPath() + " --socket " + host.socket() + " events";
    Program pipeline({"/bin/sh", "-c", events + " | head -n 1"});
    ASSERT_TRUE(eventually([&] {
        return json::parse(host.zavctl({"--json", "status"}).out)["subscriptions"] == 1;
    }));
    for (const char* transid : {"A", "B"})
        ASSERT_EQ(host.zavctl({"start", "ux", "--transid", transid}).status, 0);
    const ProgramResult result = pipeline.wait(std::chrono::seconds(20));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out, "A  START  done\n");
}

TEST(ControlProgram, EventsThatDoNotComeInTimeAreStatusFour) {
    ScriptHome home;
    ManagedHost host(home.path());
    const ProgramResult none = host.zavctl({"--json", "--timeout", "5", "events", "--count", "1"});
    EXPECT_EQ(none.status, 4);
    EXPECT_EQ(json::parse(none.out)["events"], json::array());
    EXPECT_EQ(host.zavctl({"--timeout", "5", "events"}).status, 0) << "as long as was asked for";
}

// ---- What is said -------------------------------------------------------------------------------

TEST(ControlProgram, AnInstallThatRestartsTheHostTellsHowToGoOn) {
    ScriptHome home;
    home.products({"ux"}, "exit 0");
    ManagedHost host(home.path(), {{"QVSDEPLOY_AGENTDEPOT", home.files().path("depot")}});
    const ProgramResult result =
        host.zavctl({"install", "ux", "7", "--restart", "--", "/bin/true"});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(result.out, ContainsRegex("^install ux: accepted\n"
                                          "install ux: done after [0-9]+ s\n"
                                          "The install has begun; fetch its outcome with: "
                                          "zavctl complete-install\n$"));
}

TEST(ControlProgram, AReplyThatIsNotTheRequestsIsAFailureThatIsSaid) {
    ScriptHome home;
    ManagedHost host(home.path(), {{"LC_ALL", "C.UTF-8"}});
    const ProgramResult result = host.zavctl({"config", "get", "\xC3\xA9\xC3\xA9\xC3\xA9\xC3\xA9"},
                                             "", {{"LC_ALL", "C.UTF-8"}});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err,
              "zavctl: the host's reply holds another value than the request, so it is not known "
              "what became of it: the host cuts text with many characters beyond ASCII\n");
}

TEST(ControlProgram, WhatCannotBeReadIsWrongUsage) {
    ScriptHome home;
    home.files().makeDir("folder");
    const std::string folder = home.files().path("folder");
    ASSERT_EQ(::symlink("loop", (folder + "/loop").c_str()), 0);
    ManagedHost host(home.path());
    const std::pair<Arguments, std::string> cases[] = {
        {{"push", folder}, "cannot read " + folder + "/loop: "},
        {{"config", "set", "ux", "--file", folder}, "cannot read " + folder + "\n"},
        {{"config", "set", "ux", "--file", folder + "/none"}, "cannot read " + folder + "/none\n"},
        {{"config", "set", "ux", "-"}, "the configuration is empty\n"},
        {{"config", "set", "ux"}, "config set takes --file FILE, a text, or - for"},
        {{"config", "set", "ux", "A=1", "--file", folder}, "config set takes --file FILE, a text"}};
    for (const auto& [arguments, words] : cases) {
        const ProgramResult result = host.zavctl(arguments);
        EXPECT_EQ(result.status, 2);
        EXPECT_EQ(result.out, "");
        EXPECT_THAT(result.err, testing::StartsWith("zavctl: " + words));
    }
}

TEST(ControlProgram, OutputThatCannotBeWrittenIsNoSuccess) {
    ScriptHome home;
    ManagedHost host(home.path());
    const std::string zavctl = zavctlPath() + " --socket " + host.socket();
    const ProgramResult full = runProgram({"/bin/sh", "-c", zavctl + " query KAGDYST >/dev/full"});
    EXPECT_EQ(full.status, 2);
    EXPECT_EQ(full.err, "zavctl: the output could not be written\n");
    const ProgramResult unread = runProgram(
        {"/bin/sh", "-c", "{ sleep 1; " + zavctl + " query KAGDYST; echo $? >&2; } | true"});
    EXPECT_EQ(unread.err, "0\n");
}

TEST(ControlProgram, ANoteSaysThatSettingTheUniversalAgentsTextChangesNothing) {
    ScriptHome home;
    ManagedHost host(home.path());
    for (const char* product : {"um", "UM", "ux"}) {
        const ProgramResult result = host.zavctl({"config", "set", product, "A=1", "--no-wait"});
        EXPECT_EQ(result.status, 0);
        EXPECT_EQ(result.out, std::string("config set ") + product + ": accepted\n");
        EXPECT_EQ(result.err, product == std::string("ux")
                                  ? ""
                                  : "zavctl: note: the host changes nothing of the universal agent "
                                    "by this; ua-config imports metafiles\n");
    }
}

TEST(ControlProgram, ARefusalIsSaidInWords) {
    ScriptHome home;
    ManagedHost host(home.path());
    const ProgramResult refused = host.zavctl({"remove-instance", "um", "a:h:UA"});
    EXPECT_EQ(refused.status, 1);
    EXPECT_EQ(refused.out,
              "remove-instance um a:h:UA: refused; ZAV1006E: the command is not supported "
              "[REMOVEINSTANCE]\n");
    const ProgramResult failed = host.zavctl({"config", "get", "ux"});
    EXPECT_EQ(failed.status, 1);
    EXPECT_EQ(failed.out, "");
    EXPECT_THAT(
        failed.err,
        HasSubstr("zavctl: config get ux: failed; ZAV1007E: no two-way translator was found "
                  "for the product [GETCONFIG,ux]\n  command: " +
                  home.path() + "/bin/cinfo -d "));
}

TEST(ControlProgram, ATerminalSeesAClockThatRuns) {
    ScriptHome home;
    home.agentScript("sleep 2");
    ManagedHost host(home.path());
    const ProgramResult result =
        runProgram({"/usr/bin/script", "-qec",
                    zavctlPath() + " --socket " + host.socket() + " start ux", "/dev/null"},
                   "", {{"NO_COLOR", "1"}});
    EXPECT_EQ(result.status, 0) << result.out;
    EXPECT_THAT(result.out, ContainsRegex("\rstart ux: waiting, [1-9] s "));
    EXPECT_THAT(result.out, ContainsRegex("start ux: done after [0-9]+ s"));
}

}  // namespace
