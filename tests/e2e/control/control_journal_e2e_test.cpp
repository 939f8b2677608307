// ctest-label: threaded
//
// zavctl on the host's journal: what it waits for outlives the connection and the host, and what it
// asks for runs once.

#include <gmock/gmock.h>
#include <signal.h>
#include <unistd.h>

#include <nlohmann/json.hpp>
#include <optional>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/process/left_running.h"

namespace {

using nlohmann::json;
using testing::ContainsRegex;
using testing::ElementsAre;
using testing::HasSubstr;
using Guards = ManagedHost::Guards;
using Words = std::vector<std::string>;

class ControlJournal : public testing::Test {
protected:
    ControlJournal() {
        home.products({"ux", "px"}, "exit 0");
        home.agentScript(untilReleased(gate()));
    }

    std::string gate() const { return home.files().path("gate"); }
    void openGate() const { home.files().write("gate", ""); }
    void start(const std::vector<std::string>& arguments = {}, Guards guards = Guards::On) {
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, arguments,
                     guards);
    }
    ProgramResult zavctl(const std::vector<std::string>& arguments) const {
        return host->zavctl(arguments);
    }
    json document(const std::vector<std::string>& arguments) const {
        std::vector<std::string> line = {"--json"};
        line.insert(line.end(), arguments.begin(), arguments.end());
        return json::parse(zavctl(line).out, nullptr, false);
    }
    std::string stateOf(const std::string& name) const {
        return document({"task", "show", name}).value("state", "");
    }
    /// An installer that notes each of its runs, waits for the gate and ends so.
    std::string installer(int code) const {
        return home.files().script("depot/install.sh", "echo run >>'" + home.files().path("runs") +
                                                           "'\n" + untilReleased(gate()) + "exit " +
                                                           std::to_string(code) + "\n");
    }
    /// An install that is waited for.
    std::unique_ptr<Program> install(int code) const {
        return host->startZavctl({"install", "ux", "060100", "--transid", "T", "--no-verify", "--",
                                  "/bin/sh", installer(code)});
    }
    /// The words of an install whose command writes before the gate opens and behind it.
    Words talkingInstall(const std::string& transid) const {
        const std::string script =
            home.files().script("depot/talk.sh", "echo one; echo password=hidden; echo two >&2\n" +
                                                     untilReleased(gate()) + "echo three\n");
        return {"install", "ux", "060100",  "--no-verify", "--transid",
                transid,   "--", "/bin/sh", script};
    }
    bool awaitRun() const {
        return eventually([&] { return home.files().read("runs") == "run\n"; });
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

// ---- A host that goes away ----------------------------------------------------------------------

TEST_F(ControlJournal, AnInstallEndsWithItsOutcomeAlthoughItsHostWasToldToEnd) {
    for (const int code : {0, 3}) {
        start();
        const auto waiting = install(code);
        ASSERT_TRUE(awaitRun());
        host->program().signal(SIGTERM);
        openGate();
        EXPECT_EQ(host->program().wait().status, 0);
        host->start();
        const ProgramResult result = waiting->wait();
        EXPECT_EQ(result.status, code == 0 ? 0 : 1) << result.err;
        const json told = json::parse(result.out);
        EXPECT_EQ(told["events"].at(0)["RETVAL"], code == 0 ? 0 : 1031);
        EXPECT_EQ(told["task"]["state"], code == 0 ? "done" : "failed");
        EXPECT_EQ(told["reply"]["RETVAL"], 0);
        EXPECT_EQ(home.files().read("runs"), "run\n");
        home.files().write("runs", "");
        host.reset();
        ASSERT_EQ(::unlink(gate().c_str()), 0);
    }
}

TEST_F(ControlJournal, AnInstallThatWaitedInAKilledHostRunsInTheNextOne) {
    start();
    ASSERT_EQ(zavctl({"start", "px", "--no-wait"}).status, 0);
    ASSERT_TRUE(eventually([&] { return !home.agentCalls().empty(); }));
    const auto waiting = install(0);
    ASSERT_TRUE(eventually([&] { return stateOf("T") == "queued"; }));
    host->program().signal(SIGKILL);
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    host->start();
    EXPECT_EQ(home.files().read("runs"), "") << "the command of the dead host still runs";
    openGate();
    const ProgramResult result = waiting->wait();
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.err, "zavctl: note: the host went away; waiting for it to come back\n");
    EXPECT_EQ(json::parse(result.out)["task"]["state"], "done");
    EXPECT_EQ(home.files().read("runs"), "run\n");
}

TEST_F(ControlJournal, AnInstallThatAKilledHostWasRunningIsInterrupted) {
    start();
    const auto waiting = install(0);
    ASSERT_TRUE(awaitRun());
    host->program().signal(SIGKILL);
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    openGate();
    host->start();
    const ProgramResult result = waiting->wait();
    EXPECT_EQ(result.status, 1) << result.err;
    const json told = json::parse(result.out);
    EXPECT_EQ(told["task"]["state"], "interrupted");
    EXPECT_EQ(told["events"], json::array());
    const ProgramResult again = zavctl({"task", "wait", "T"});
    EXPECT_EQ(again.status, 1);
    EXPECT_THAT(again.out, ContainsRegex("^install ux \\(T\\): interrupted after [0-9]+ s; "));
}

TEST_F(ControlJournal, AHostWithoutItsJournalHasForgottenTheTask) {
    start({"--no-journal"});
    const auto waiting = install(0);
    ASSERT_TRUE(awaitRun());
    host->program().signal(SIGKILL);
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    openGate();
    host->start();
    const ProgramResult result = waiting->wait();
    EXPECT_EQ(result.status, 3);
    EXPECT_THAT(result.err, HasSubstr("zavctl: the host went away before the outcome came\n"));
}

// ---- Once ---------------------------------------------------------------------------------------

TEST_F(ControlJournal, ARepetitionWithOnceShowsTheFirstOutcomeAndRunsNothing) {
    openGate();
    for (const Guards guards : {Guards::On, Guards::Off}) {
        start({}, guards);
        const std::string key = guards == Guards::On ? "guarded" : "unguarded";
        const std::size_t before = home.agentCalls().size();
        const json first = document({"start", "ux", "--once", key});
        const json second = document({"start", "ux", "--once", key});
        EXPECT_EQ(second["task"]["id"], first["task"]["id"]);
        EXPECT_EQ(second["events"], first["events"]);
        EXPECT_EQ(home.agentCalls().size(), before + 1);
        const ProgramResult other = zavctl({"stop", "ux", "--once", key});
        EXPECT_EQ(other.status, 1);
        EXPECT_THAT(other.err, HasSubstr("another request has this transid already"));
        host.reset();
    }
}

TEST_F(ControlJournal, WithoutOnceATransactionIdentifierMayBeUsedAgain) {
    openGate();
    start();
    for (int i = 0; i < 2; ++i)
        EXPECT_EQ(zavctl({"start", "ux", "--transid", "T"}).status, 0);
    EXPECT_EQ(home.agentCalls().size(), 2U);
}

TEST_F(ControlJournal, OnceAndTransidAreNotForTheSameLine) {
    start();
    EXPECT_EQ(zavctl({"start", "ux", "--once", "A", "--transid", "B"}).status, 2);
}

// ---- Looking ------------------------------------------------------------------------------------

TEST_F(ControlJournal, WhatRunsAndWhatWaitsIsShown) {
    start();
    ASSERT_EQ(zavctl({"start", "ux", "--no-wait", "--transid", "first"}).status, 0);
    ASSERT_TRUE(eventually([&] { return !home.agentCalls().empty(); }));
    const json queued = document({"start", "px", "--no-wait", "--transid", "second"});
    EXPECT_EQ(queued["reply"], nullptr) << "the plug-in has not seen it";
    EXPECT_EQ(queued["task"]["state"], "queued");
    const std::string work = zavctl({"ps"}).out;
    EXPECT_THAT(work, ContainsRegex("^first: START ux, running since [^\n]*\n  [0-9]+  [^\n]*\n"
                                    "second: START px, queued since [^\n]*\n$"));
    const std::string list = zavctl({"tasks"}).out;
    EXPECT_THAT(list, ContainsRegex("queued +START px [^\n]*second\n[^\n]*running +START ux "
                                    "[^\n]*first\n"));
    EXPECT_EQ(document({"tasks", "--state", "queued"})["tasks"].size(), 1U);
    EXPECT_EQ(document({"tasks", "--product", "ux"})["tasks"].at(0)["transid"], "first");
    EXPECT_EQ(document({"tasks", "--limit", "1"})["tasks"].at(0)["transid"], "second");
    const ProgramResult unknown = zavctl({"tasks", "--state", "dead"});
    EXPECT_EQ(unknown.status, 2);
    EXPECT_THAT(unknown.err, HasSubstr("there is no state \"dead\" but queued, running"));
    openGate();
}

TEST_F(ControlJournal, AWatchedListIsShownAnewWhenSomethingChanges) {
    start();
    const auto begin = [this](const char* transid) {
        return zavctl({"start", "ux", "--no-wait", "--transid", transid}).status;
    };
    ASSERT_EQ(begin("first"), 0);
    Program watching({zavctlPath(), "--socket", host->socket(), "tasks", "--watch"});
    ASSERT_TRUE(watching.awaitOutput("first\n", std::chrono::seconds(20)));
    ASSERT_EQ(begin("second"), 0);
    EXPECT_TRUE(watching.awaitOutput("second\n", std::chrono::seconds(20)));
    watching.signal(SIGTERM);
    openGate();
    EXPECT_EQ(zavctl({"--timeout", "3", "tasks", "--watch"}).status, 0);
    EXPECT_EQ(zavctl({"--json", "tasks", "--watch"}).status, 2);
}

TEST_F(ControlJournal, ATaskCanBeWaitedForByAnybodyAndHasTheVerbsStatus) {
    start();
    const auto waiting = install(3);
    ASSERT_TRUE(awaitRun());
    const ProgramResult late = zavctl({"--timeout", "3", "task", "wait", "T"});
    EXPECT_EQ(late.status, 4);
    EXPECT_THAT(late.err, HasSubstr("no outcome within the time-out"));
    openGate();
    const json told = json::parse(waiting->wait().out);
    const ProgramResult other = zavctl({"--json", "task", "wait", "T"});
    EXPECT_EQ(other.status, 1);
    EXPECT_EQ(json::parse(other.out), told);
    EXPECT_EQ(zavctl({"task", "show", "T"}).status, 0) << "it was found";
    EXPECT_EQ(zavctl({"task", "wait", "unknown"}).status, 2);
}

TEST_F(ControlJournal, WhatWaitsCanBeTakenBack) {
    start();
    ASSERT_EQ(zavctl({"start", "px", "--no-wait"}).status, 0);
    ASSERT_TRUE(eventually([&] { return !home.agentCalls().empty(); }));
    const auto waiting = install(0);
    ASSERT_TRUE(eventually([&] { return stateOf("T") == "queued"; }));
    const ProgramResult cancelled = zavctl({"task", "cancel", "T"});
    EXPECT_EQ(cancelled.status, 0) << cancelled.err;
    EXPECT_EQ(cancelled.out, "install ux (T): cancelled\n");
    const ProgramResult result = waiting->wait();
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(json::parse(result.out)["task"]["state"], "cancelled");
    const ProgramResult again = zavctl({"task", "cancel", "T"});
    EXPECT_EQ(again.status, 1);
    EXPECT_THAT(again.err, HasSubstr("is over already: cancelled"));
    openGate();
    EXPECT_FALSE(home.files().exists("runs"));
}

TEST_F(ControlJournal, AQueueThatIsFullIsWaitedForOrIsAFailure) {
    start({"--max-queued", "1"});
    ASSERT_EQ(zavctl({"start", "ux", "--no-wait"}).status, 0);
    ASSERT_TRUE(eventually([&] { return !home.agentCalls().empty(); }));
    ASSERT_EQ(zavctl({"start", "px", "--no-wait"}).status, 0);
    const ProgramResult refused = zavctl({"start", "ux", "--no-wait"});
    EXPECT_EQ(refused.status, 1);
    EXPECT_THAT(refused.err, HasSubstr("as many tasks wait as may"));
    const auto waiting = host->startZavctl({"start", "ux", "--transid", "T", "--no-verify"});
    ASSERT_TRUE(
        eventually([&] { return waiting->err().find("asking again") != std::string::npos; }));
    openGate();
    EXPECT_EQ(waiting->wait().status, 0);
    EXPECT_EQ(stateOf("T"), "done");
}

// ---- Output and running tasks -------------------------------------------------------------------

TEST_F(ControlJournal, OutputIsShownWhileTheCommandsRunIfItIsWanted) {
    start();
    Words line = {zavctlPath(), "--socket", host->socket(), "-v"};
    const Words install = talkingInstall("T");
    line.insert(line.end(), install.begin(), install.end());
    Program waiting(line);
    ASSERT_TRUE(waiting.awaitOutput("install ux (T): accepted\none\n", std::chrono::seconds(20)))
        << waiting.out() << waiting.err();
    openGate();
    const ProgramResult result = waiting.wait();
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(result.out, ContainsRegex("^install ux \\(T\\): accepted\none\n(.*\n)*three\n"
                                          "install ux \\(T\\): done after"));
    EXPECT_THAT(result.err, HasSubstr("two\n"));
    const ProgramResult quiet = zavctl(talkingInstall("quiet"));
    EXPECT_THAT(quiet.out, testing::Not(HasSubstr("three")));
}

TEST_F(ControlJournal, OutputGoesOnWhenTheHostHasRunTheTaskAgain) {
    start({"--on-interrupt", "rerun"});
    Words line = {zavctlPath(), "--socket", host->socket(), "-v"};
    const Words install = talkingInstall("T");
    line.insert(line.end(), install.begin(), install.end());
    Program waiting(line);
    ASSERT_TRUE(waiting.awaitOutput("install ux (T): accepted\none\n", std::chrono::seconds(20)))
        << waiting.out() << waiting.err();
    host->program().signal(SIGKILL);
    EXPECT_EQ(host->program().wait().status, 128 + SIGKILL);
    openGate();
    host->start();
    const ProgramResult result = waiting.wait();
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(result.out,
                ContainsRegex("^install ux \\(T\\): accepted\none\n(.*\n)*one\npassword=...\n"
                              "three\ninstall ux \\(T\\): done after"));
    EXPECT_THAT(result.err, HasSubstr("note: the host went away; waiting for it to come back\n"));
}

TEST_F(ControlJournal, OutputCanBeAskedForAndFollowed) {
    start();
    const auto waiting = host->startZavctl(talkingInstall("T"));
    ASSERT_TRUE(eventually([&] { return stateOf("T") == "running"; }));
    Program following({zavctlPath(), "--socket", host->socket(), "task", "output", "-f", "T"});
    ASSERT_TRUE(following.awaitOutput("password=***\n", std::chrono::seconds(20)));
    openGate();
    const ProgramResult result = following.wait();
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.out, "one\npassword=***\nthree\n");
    EXPECT_EQ(result.err, "two\n");
    EXPECT_EQ(waiting->wait().status, 0);
    EXPECT_EQ(zavctl({"task", "output", "T"}).out, result.out) << "what was kept";
    const json pieces = document({"task", "output", "T"})["output"];
    EXPECT_EQ(pieces.at(0)["stream"], "stdout");
    EXPECT_EQ(zavctl({"task", "output", "unknown"}).status, 2);
}

TEST_F(ControlJournal, WhatRunsCanBeEnded) {
    start();
    const auto waiting = install(0);
    ASSERT_TRUE(awaitRun());
    const ProgramResult cancelled = zavctl({"task", "cancel", "T"});
    EXPECT_EQ(cancelled.status, 0) << cancelled.err;
    EXPECT_EQ(cancelled.out, "install ux (T): cancelled\n");
    const ProgramResult result = waiting->wait();
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(json::parse(result.out)["task"]["state"], "cancelled");
}

}  // namespace
