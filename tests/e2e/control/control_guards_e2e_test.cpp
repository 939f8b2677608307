// How zavctl keeps its users from harm on a guarded host, and stands back on an unguarded one.
// ctest-label: threaded

#include <gmock/gmock.h>

#include <csignal>
#include <filesystem>
#include <nlohmann/json.hpp>
#include <optional>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/host/starter_home.h"
#include "support/process/left_running.h"
#include "support/scratch_dir.h"

namespace {

using nlohmann::json;
using testing::ContainsRegex;
using testing::HasSubstr;
using testing::Not;
using Guards = ManagedHost::Guards;

class ControlGuards : public testing::Test {
protected:
    ControlGuards() { home.products({"ux"}, "exit 0"); }

    void start(Guards guards) {
        host.emplace(home.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", home.depot()}},
                     std::vector<std::string>{}, guards);
    }
    ProgramResult zavctl(const std::vector<std::string>& arguments) const {
        return host->zavctl(arguments);
    }
    /// zavctl on a terminal. Both outputs come as one.
    std::string onTerminal(const std::string& arguments, const Environment& environment) const {
        const std::string line = zavctlPath() + " --socket " + host->socket() + " " + arguments;
        return runProgram({"/usr/bin/script", "-qec", line, "/dev/null"}, "", environment).out;
    }

    ScriptHome home;
    std::optional<ManagedHost> host;
};

// ---- Queries that act ---------------------------------------------------------------------------

const std::vector<std::string> kActingQuery = {"query", "KAGREQT", "COMMAND=STOP", "PRODUCT=ux",
                                               "TRANSID=T"};

TEST_F(ControlGuards, AQueryThatActsNeedsAYesAndNamesItsVerb) {
    start(Guards::On);
    const ProgramResult refused = zavctl(kActingQuery);
    EXPECT_EQ(refused.status, 2);
    EXPECT_EQ(refused.out, "");
    EXPECT_EQ(refused.err,
              "zavctl: a query of KAGREQT carries out a command; the verb for it is: zavctl stop "
              "ux\n  Add --yes to send the query as it stands.\n");
    EXPECT_TRUE(home.agentCalls().empty());
    std::vector<std::string> agreed = kActingQuery;
    agreed.emplace_back("--yes");
    EXPECT_EQ(zavctl(agreed).status, 0);
    EXPECT_TRUE(eventually([&] { return home.agentCalls().size() == 1; }));
}

TEST_F(ControlGuards, AnUnguardedHostGetsAQueryThatActs) {
    start(Guards::Off);
    EXPECT_EQ(zavctl(kActingQuery).status, 0);
    EXPECT_TRUE(eventually([&] { return home.agentCalls().size() == 1; }));
    EXPECT_EQ(zavctl({"query", "KAGREQT", "COMMAND=NOPE", "TRANSID=T"}).status, 1)
        << "the reply's RETVAL";
}

TEST_F(ControlGuards, AQueryThatActsIsForcedPastTheInventoryOnlyWhenAsked) {
    start(Guards::On);
    const std::vector<std::string> query = {"query",      "KAGREQT",   "COMMAND=STOP",
                                            "PRODUCT=no", "TRANSID=T", "--yes"};
    EXPECT_EQ(zavctl(query).status, 1);
    EXPECT_TRUE(home.agentCalls().empty());
    std::vector<std::string> forced = query;
    forced.emplace_back("--force");
    EXPECT_EQ(zavctl(forced).status, 0);
    EXPECT_TRUE(eventually([&] { return home.agentCalls().size() == 1; }));
}

TEST_F(ControlGuards, AnImportWithoutAMetafileIsWrongUsage) {
    start(Guards::On);
    for (const std::vector<std::string>& line :
         {std::vector<std::string>{"ua-config"}, {"ua-config", "--scripts", "a.sh"}}) {
        const ProgramResult result = zavctl(line);
        EXPECT_EQ(result.status, 2);
        EXPECT_EQ(result.err,
                  "zavctl: ua-config imports nothing without a metafile\n"
                  "  Name one of the depot with --metafile.\n");
    }
}

TEST_F(ControlGuards, AnUnguardedHostTakesAnImportWithoutAMetafileForDone) {
    start(Guards::Off);
    EXPECT_THAT(zavctl({"ua-config"}).out, HasSubstr("ua-config: done"));
}

TEST_F(ControlGuards, AFilesNameIsNoConfiguration) {
    start(Guards::On);
    const ScratchDir files;
    const std::string file = files.write("ux.config", "INSTANCE=\nA=1\n");
    const ProgramResult result = zavctl({"config", "set", "ux", file});
    EXPECT_EQ(result.status, 2);
    EXPECT_EQ(result.err, "zavctl: " + file +
                              " is the name of a file, and no configuration\n"
                              "  To send what is in it: zavctl config set ux --file " +
                              file + "\n");
    EXPECT_THAT(zavctl({"tasks"}).out, Not(HasSubstr("SETCONFIG")));
    zavctl({"config", "set", "ux", "A=" + file});
    EXPECT_THAT(zavctl({"tasks"}).out, HasSubstr("SETCONFIG")) << "this is one";
}

TEST_F(ControlGuards, AnUnguardedHostGetsAFilesNameForAConfiguration) {
    start(Guards::Off);
    const ScratchDir files;
    zavctl({"config", "set", "ux", files.write("ux.config", "A=1\n")});
    EXPECT_THAT(zavctl({"tasks"}).out, HasSubstr("SETCONFIG"));
}

const std::vector<std::string> kInstallWithOption = {"install", "ux", "6.3", "/bin/echo", "-q"};

/// Sent behind "--", the option is the command's.
void expectInstallWithDashes(const ManagedHost& host) {
    std::vector<std::string> line = kInstallWithOption;
    line.insert(line.begin() + 3, {"--no-verify", "--"});
    EXPECT_EQ(host.zavctl(line).status, 0);
    EXPECT_THAT(host.zavctl({"--json", "tasks"}).out, HasSubstr("/bin/echo -q"));
}

TEST_F(ControlGuards, AnInstallCommandWithOptionsStandsBehindDashes) {
    start(Guards::On);
    const ProgramResult result = zavctl(kInstallWithOption);
    EXPECT_EQ(result.status, 2);
    EXPECT_THAT(result.err, HasSubstr("put the install command behind --\n"));
    EXPECT_THAT(result.err, HasSubstr(" install ux 6.3 -- /bin/echo -q\n"));
    EXPECT_THAT(zavctl({"tasks"}).out, Not(HasSubstr("INSTALL")));
    expectInstallWithDashes(*host);
}

TEST_F(ControlGuards, AnUnguardedHostMakesNoDifferenceToTheWordsOfALine) {
    start(Guards::Off);
    EXPECT_EQ(zavctl(kInstallWithOption).status, 2);
    EXPECT_THAT(zavctl({"tasks"}).out, Not(HasSubstr("INSTALL")));
    expectInstallWithDashes(*host);
}

// ---- Successes that are none --------------------------------------------------------------------

TEST_F(ControlGuards, ACommandThatWasKilledIsNoSuccess) {
    home.agentScript("echo half way; kill -9 $$");
    start(Guards::On);
    const ProgramResult result = zavctl({"start", "ux", "--transid", "night run"});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out,
                HasSubstr("start ux (night run): accepted\n"
                          "start ux (night run): reported as done, but the command was killed by "
                          "signal 9\n"));
    EXPECT_THAT(result.out, HasSubstr("  command: " + home.path() + "/bin/TovrinAgent "));
    EXPECT_THAT(result.out, HasSubstr("  end:     killed by signal 9\n"));
    EXPECT_THAT(result.out, HasSubstr("    half way\n"));
    const json document = json::parse(zavctl({"--json", "start", "ux"}).out);
    EXPECT_EQ(document["task"]["state"], "failed");
    EXPECT_EQ(document["details"]["commands"].at(0)["signal"], 9);
}

TEST_F(ControlGuards, AnUnguardedHostsKilledCommandIsASuccess) {
    home.agentScript("kill -9 $$");
    start(Guards::Off);
    const ProgramResult result = zavctl({"start", "ux"});
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(result.out, HasSubstr("start ux: done after"));
}

TEST_F(ControlGuards, AFailureComesWithTheCommandsLastWords) {
    home.agentScript("seq 1 12; echo no licence >&2; exit 3");
    start(Guards::On);
    const ProgramResult result = zavctl({"start", "ux"});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, ContainsRegex("start ux: failed after [0-9]+ s; ZAV1024E: "));
    EXPECT_THAT(result.out, HasSubstr("  end:     exit code 3\n"));
    EXPECT_THAT(result.out, HasSubstr("  standard output:\n    3\n    4\n"));
    EXPECT_THAT(result.out, HasSubstr("    12\n  standard error:\n    no licence\n"));
}

TEST_F(ControlGuards, AnUnguardedHostsFailureHasTheSameRowsAndTheSameWords) {
    home.agentScript("echo no licence >&2; exit 3");
    json outcomes[2];
    for (const Guards guards : {Guards::On, Guards::Off}) {
        start(guards);
        EXPECT_THAT(zavctl({"start", "ux"}).out, HasSubstr("    no licence\n"));
        const ProgramResult result = zavctl({"--json", "start", "ux", "--transid", "T"});
        EXPECT_EQ(result.status, 1);
        json& outcome = outcomes[guards == Guards::On ? 0 : 1];
        outcome = json::parse(result.out)["events"];
        ASSERT_EQ(outcome.size(), 1U) << result.out;
        EXPECT_EQ(outcome[0]["RETVAL"], 1024);
        host.reset();
    }
    EXPECT_EQ(outcomes[0], outcomes[1]);
}

TEST_F(ControlGuards, PasswordsInCommandsAndTheirOutputAreNotShownToPeople) {
    start(Guards::On);
    const ProgramResult result =
        zavctl({"install", "ux", "6.1", "--transid", "T", "--", "/bin/sh", "-c",
                "echo token: hunter2; exit 3", "--password=hunter2"});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, HasSubstr("--password=***"));
    EXPECT_THAT(result.out, HasSubstr("    token: ***\n"));
    EXPECT_THAT(result.out + result.err, Not(HasSubstr("hunter2")));
    EXPECT_THAT(zavctl({"task", "show", "T"}).out, Not(HasSubstr("hunter2")));
}

TEST_F(ControlGuards, AConfigurationThatCannotBeReadComesWithTheCommandsLastWords) {
    home.products({"ux"}, "echo no licence >&2; exit 3");
    start(Guards::On);
    const ProgramResult result = zavctl({"config", "get", "ux"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_THAT(result.err, ContainsRegex("^zavctl: config get ux: failed; ZAV1008E: "));
    EXPECT_THAT(result.err, HasSubstr("/zav_xa "));
    EXPECT_THAT(result.err, HasSubstr("  end:     exit code 3\n"));
    EXPECT_THAT(result.err, HasSubstr("  standard error:\n    no licence\n"));
    const json document = json::parse(zavctl({"--json", "config", "get", "ux"}).out);
    EXPECT_EQ(document["details"]["commands"].back()["exit"], 3);
}

TEST_F(ControlGuards, AFetchedOutcomeNamesTheTransactionThatWasAskedWith) {
    start(Guards::On);
    const ProgramResult result = zavctl({"complete-install", "--transid", "night run"});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, HasSubstr("complete-install (night run): failed after "));
}

TEST_F(ControlGuards, AnInstallThatTheInventoryDoesNotShowIsNoSuccess) {
    start(Guards::On);
    const ProgramResult result = zavctl({"install", "lost", "6.3", "--", "/bin/true"});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, HasSubstr("install lost: done after"));
    EXPECT_EQ(result.err,
              "zavctl: install lost: the host reported success, but lost 6.3 is not in the "
              "inventory\n");
    EXPECT_EQ(zavctl({"install", "lost", "6.3", "--no-verify", "--", "/bin/true"}).status, 0);
}

TEST_F(ControlGuards, AnInstalledBundleIsVerifiedForItsProductInTheVersionThatWasAskedFor) {
    StarterHome starter("um");
    const std::string version = starter.makeBundle("ux", starter.path("depot/ux/bundle"));
    // The same bundle once more, where somebody takes it for a newer version.
    std::filesystem::copy(starter.path("depot/ux/bundle"), starter.path("depot/ux/990000000"),
                          std::filesystem::copy_options::recursive);
    std::filesystem::rename(starter.path("depot/ux/bundle"), starter.path("depot/ux/" + version));
    const ManagedHost agents(starter.path(), starter.environment(), {}, Guards::On);
    const auto install = [&agents](const std::string& product, const std::string& asked) {
        return agents.zavctl({"install", product, asked, "--", "/bin/sh", "|DEPLOYDIR|/install.sh",
                              "-h", "|TOVRINHOME|"});
    };
    const ProgramResult wrong = install("ux", "990000000");
    EXPECT_EQ(wrong.status, 1);
    EXPECT_THAT(wrong.out, HasSubstr("install ux: done after"));
    EXPECT_EQ(wrong.err,
              "zavctl: install ux: the host reported success, but ux 990000000 is not in the "
              "inventory, which lists " +
                  version + "\n");
    const ProgramResult right = install("ux", version);
    EXPECT_EQ(right.status, 0);
    EXPECT_EQ(right.err, "");
    const ProgramResult removed = agents.zavctl({"uninstall", "ux"});
    EXPECT_EQ(removed.status, 0) << removed.out;
    EXPECT_EQ(removed.err, "");
}

TEST_F(ControlGuards, AnUnguardedHostsInstallIsNotVerified) {
    start(Guards::Off);
    const ProgramResult result = zavctl({"install", "lost", "6.3", "--", "/bin/true"});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
}

TEST_F(ControlGuards, AnInventoryThatFailedIsNotAnEmptyOne) {
    start(Guards::On);
    home.files().script("home/bin/cinfo", "echo no registry >&2; exit 7");
    const ProgramResult result = zavctl({"agents"});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_THAT(result.err,
                HasSubstr("  end:     exit code 7\n  standard error:\n    no registry"));
}

TEST_F(ControlGuards, AnUnguardedHostsFailedInventoryIsEmpty) {
    start(Guards::Off);
    home.files().script("home/bin/cinfo", "exit 7");
    const ProgramResult result = zavctl({"agents"});
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.out, "No products are listed.\n");
}

// ---- Long configurations ------------------------------------------------------------------------

/// A configuration that no row holds.
std::string longConfiguration() {
    std::string text = "INSTANCE=\nINTERVAL=5\n";
    for (int i = 0; text.size() < 6201; ++i)
        text += "SETTING_" + std::to_string(i) + "=value\n";
    return text;
}

class LongConfiguration : public testing::Test {
protected:
    void start(Guards guards) {
        host.emplace(home.path(), home.environment(), std::vector<std::string>{}, guards);
        const std::string file = home.files().write("long.config", longConfiguration());
        ASSERT_EQ(host->zavctl({"config", "set", "ux", "--file", file}).status, 0);
    }
    ProgramResult edit(const std::string& script) {
        const std::string editor = home.files().script("editor", script);
        home.files().makeDir("edits");
        return host->zavctl(
            {"config", "edit", "ux"}, "",
            {{"EDITOR", "/bin/sh " + editor}, {"TMPDIR", home.files().path("edits")}});
    }

    StarterHome home{"ux"};
    std::optional<ManagedHost> host;
};

constexpr const char* kChange = "sed -i s/INTERVAL=5/INTERVAL=6/ \"$1\"";

/// An editor whose user takes so long that somebody else sets another configuration meanwhile.
std::string slowChange(const ManagedHost& host) {
    return std::string(kChange) + "; " + zavctlPath() + " --socket " + host.socket() +
           " config set ux 'INSTANCE=\nINTERVAL=7\n'";
}

TEST_F(LongConfiguration, IsReadAndEditedWhole) {
    start(Guards::On);
    const std::string before = host->zavctl({"config", "get", "ux"}).out;
    EXPECT_GT(before.size(), 6000U);
    const ProgramResult result = edit(kChange);
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(result.out, HasSubstr("config edit ux: done after"));
    std::string expected = before;
    expected.replace(expected.find("INTERVAL=5"), 10, "INTERVAL=6");
    EXPECT_EQ(host->zavctl({"config", "get", "ux"}).out, expected);
}

TEST_F(LongConfiguration, IsCutByAnUnguardedHost) {
    start(Guards::Off);
    const ProgramResult result = host->zavctl({"config", "get", "ux"});
    EXPECT_EQ(result.status, 0);
    EXPECT_LE(result.out.size(), 3073U);
}

TEST_F(LongConfiguration, ThatChangedWhileItWasEditedIsNotOverwritten) {
    start(Guards::On);
    const ProgramResult result = edit(slowChange(*host));
    EXPECT_EQ(result.status, 1) << result.out;
    EXPECT_THAT(
        result.err,
        HasSubstr("zavctl: config edit ux: the configuration has changed on the host while "
                  "it was edited\n  zavctl config get ux shows it as it is now; your text is "
                  "kept in " +
                  home.files().path("edits") + "/zavctl."));
    EXPECT_THAT(host->zavctl({"config", "get", "ux"}).out, HasSubstr("INTERVAL=7\n"));
    const std::string path = result.err.substr(result.err.find(home.files().path("edits")));
    EXPECT_THAT(runProgram({"/bin/cat", path.substr(0, path.find('\n'))}).out,
                HasSubstr("INTERVAL=6\n"));
}

TEST_F(LongConfiguration, ThatChangedWhileItWasEditedIsOverwrittenOnAnUnguardedHost) {
    start(Guards::Off);
    // Such a host gives a long one cut.
    ASSERT_EQ(host->zavctl({"config", "set", "ux", "INSTANCE=\nINTERVAL=5\n"}).status, 0);
    EXPECT_EQ(edit(slowChange(*host)).status, 0);
    EXPECT_THAT(host->zavctl({"config", "get", "ux"}).out, HasSubstr("INTERVAL=6\n"));
}

TEST_F(LongConfiguration, ThatWasNotTakenIsKeptForItsAuthor) {
    start(Guards::On);
    const ProgramResult result =
        edit(std::string(kChange) + "; chmod 000 '" + home.translator() + "'; mv '" +
             home.translator() + "' '" + home.translator() + ".gone'");
    EXPECT_EQ(result.status, 1) << result.out;
    const std::string words = "your text is kept in ";
    const std::size_t at = result.err.find(words);
    ASSERT_NE(at, std::string::npos) << result.err;
    const std::size_t begin = at + words.size();
    const std::string path = result.err.substr(begin, result.err.find('\n', begin) - begin);
    EXPECT_THAT(runProgram({"/bin/cat", path}).out, HasSubstr("INTERVAL=6"));
}

// ---- At the terminal ----------------------------------------------------------------------------

TEST_F(ControlGuards, CtrlCNamesTheTaskAndTheWayToItsOutcome) {
    const std::string go = home.files().path("go");
    home.agentScript(untilReleased(go));
    start(Guards::On);
    // Where the tests run in the background, the signal may be ignored.
    Program waiting({"/usr/bin/env", "--default-signal=INT", zavctlPath(), "--socket",
                     host->socket(), "start", "ux", "--transid", "T-1"});
    ASSERT_TRUE(waiting.awaitOutput("start ux (T-1): accepted\n", std::chrono::seconds(20)));
    const std::string id = json::parse(zavctl({"--json", "task", "show", "T-1"}).out)["id"];
    waiting.signal(SIGINT);
    const ProgramResult result = waiting.wait();
    EXPECT_EQ(result.status, 130);
    EXPECT_EQ(result.err, "zavctl: interrupted; the host goes on with task " + id +
                              " (T-1)\n  zavctl task wait " + id + " waits for its outcome\n");
    ASSERT_TRUE(eventually([&] { return home.agentCalls().size() == 1; }));
    const ProgramResult work = zavctl({"ps"});
    EXPECT_THAT(work.out, HasSubstr("T-1: START ux, running since "));
    EXPECT_THAT(work.out, HasSubstr("/bin/TovrinAgent "));
    home.files().write("go", "");
    const ProgramResult outcome = zavctl({"task", "wait", id});
    EXPECT_EQ(outcome.status, 0);
    EXPECT_THAT(outcome.out, ContainsRegex("^start ux \\(T-1\\): done after [0-9]+ s\n$"));
    EXPECT_EQ(zavctl({"ps"}).out, "Nothing is at work.\n");
    EXPECT_THAT(zavctl({"task", "show", "T-1"}).out, HasSubstr("T-1: START ux, done\n"));
}

/// zavctl with SIGINT as a terminal's user has it: where the tests run in the background, it may be
/// ignored.
std::vector<std::string> interruptible(const ManagedHost& host,
                                       const std::vector<std::string>& verb) {
    std::vector<std::string> line = {"/usr/bin/env", "--default-signal=INT", zavctlPath(),
                                     "--socket", host.socket()};
    line.insert(line.end(), verb.begin(), verb.end());
    return line;
}

/// Whether a process has a connection.
bool isConnected(pid_t pid) {
    const std::string descriptors = "/proc/" + std::to_string(pid) + "/fd";
    std::error_code gone;
    for (const auto& entry : std::filesystem::directory_iterator(descriptors, gone)) {
        const auto target = std::filesystem::read_symlink(entry, gone).string();
        if (target.rfind("socket:", 0) == 0) return true;
    }
    return false;
}

TEST_F(ControlGuards, CtrlCNamesTheRequestOfVerbsThatAreAnsweredAtOnceToo) {
    start(Guards::On);
    ::kill(host->pid(), SIGSTOP);
    for (const std::vector<std::string>& verb :
         {std::vector<std::string>{"complete-install", "--transid", "T-2"},
          {"config", "get", "ux"}}) {
        Program waiting(interruptible(*host, verb));
        ASSERT_TRUE(eventually([&] { return isConnected(waiting.pid()); }));
        waiting.signal(SIGINT);
        const ProgramResult result = waiting.wait();
        EXPECT_EQ(result.status, 130);
        EXPECT_THAT(result.err, ContainsRegex("^zavctl: interrupted; the host goes on with task "
                                              "(T-2|zavctl-[-0-9a-f]+)\n  zavctl task "));
    }
    ::kill(host->pid(), SIGCONT);
}

TEST_F(ControlGuards, OnlyATerminalIsColouredUnlessItIsNotWanted) {
    start(Guards::On);
    EXPECT_THAT(zavctl({"start", "ux"}).out, Not(HasSubstr("\x1b")));
    const Environment colours = {{"NO_COLOR", ""}, {"TERM", "xterm"}};
    EXPECT_THAT(onTerminal("start ux", colours), HasSubstr("start ux: \x1b[32mdone\x1b[0m after"));
    const Environment none = {{"NO_COLOR", "1"}, {"TERM", "xterm"}};
    EXPECT_THAT(onTerminal("start ux", none), HasSubstr("start ux: done after"));
}

TEST_F(ControlGuards, ATerminalGetsLinesOfEightyColumns) {
    home.agentScript("exit 3");
    start(Guards::On);
    const std::string shown = onTerminal("start ux", {{"NO_COLOR", "1"}});
    EXPECT_THAT(shown, HasSubstr("ZAV1024E"));
    for (std::size_t start = 0; start < shown.size();) {
        const std::size_t end = std::min(shown.find_first_of("\r\n", start), shown.size());
        EXPECT_LE(end - start, 80U) << shown.substr(start, end - start);
        start = end + 1;
    }
}

TEST_F(ControlGuards, AClosedOutputIsNoSuccess) {
    start(Guards::On);
    const std::string line = zavctlPath() + " --socket " + host->socket() + " agents >&-";
    const ProgramResult result = runProgram({"/bin/sh", "-c", line});
    EXPECT_EQ(result.status, 2);
    EXPECT_EQ(result.err, "zavctl: the output could not be written\n");
}

TEST_F(ControlGuards, AFailureIsADocumentAsJson) {
    start(Guards::On);
    const ProgramResult unknown = zavctl({"--json", "query", "NOPE"});
    EXPECT_EQ(unknown.status, 2);
    EXPECT_THAT(json::parse(unknown.out)["error"].get<std::string>(), HasSubstr("NOPE"));
    const ProgramResult late = zavctl({"--timeout", "5", "events", "--count", "1"});
    EXPECT_EQ(late.status, 4);
    EXPECT_EQ(late.err, "zavctl: only 0 of 1 outcomes came within the time-out\n");
}

TEST_F(ControlGuards, TheVersionIsThatOfTheHostToo) {
    start(Guards::On);
    std::string told;
    // The host has two seconds to answer.
    eventually([&] {
        told = zavctl({"--version"}).out;
        return told.find(" at " + host->socket() + "\n") != std::string::npos;
    });
    EXPECT_THAT(told,
                ContainsRegex("^zavctl [0-9.]+\nzavhost [0-9.]+ at " + host->socket() + "\n$"));
}

}  // namespace
