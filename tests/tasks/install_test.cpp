#include "tasks/install.h"

#include <gmock/gmock.h>
#include <sys/stat.h>

#include "support/clock.h"
#include "support/fake_sleep.h"
#include "support/process/left_running.h"
#include "support/trace_capture.h"
#include "tasks/task_home.h"

using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;
using ZAV::String;

namespace {

constexpr const char* kTranslator = TaskHome::kTranslator;
constexpr const char* kInstaller = "install.sh";

class InstallTest : public testing::Test {
protected:
    InstallTest() { fake_sleep::reset(); }

    TaskQueueElem taskFor(const std::string& context, const char* optional = "",
                          const char* product = "ux") const {
        TaskQueueElem task;
        task.setTransid("T1");
        task.setCommand("INSTALL");
        task.setProduct(product);
        task.setVersion("060100000");
        task.setContext(context.c_str());
        task.setOptional(optional);
        return task;
    }
    Outcome run(const std::string& context, const char* optional = "", const char* product = "ux") {
        TaskQueueElem task = taskFor(context, optional, product);
        return outcomeOf(task, install(task));
    }
    /// Creates an installer that records its arguments. Returns its command.
    std::string installer(const std::string& body) const {
        return home_.program(kInstaller, body) + " -q";
    }
    std::string setCms() const { return home_.home() + "/" + kTranslator + " -setCMS ux"; }
    std::string inDepot(const std::string& name) const { return home_.dir().read("depot/" + name); }

    TaskHome home_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL) (UNIT:zavtqelm ALL) (UNIT:zavutil ALL)"};
};

// ---- The scripts --------------------------------------------------------------------------------

using SetupForRestart = InstallTest;

constexpr const char* kInstallOnlyScript =
    "#!/bin/sh\n"
    "trap \"true\" 13 15\n"
    "rm -f DEPOT/rc.txt >/dev/null 2>&1\n"
    "rm -f DEPOT/stderr.txt >/dev/null 2>&1\n"
    "rm -f DEPOT/stdout.txt >/dev/null 2>&1\n"
    "$* 2>DEPOT/stderr.txt 1>DEPOT/stdout.txt\n"
    "RETCODE=$?\n"
    "export RETCODE\n"
    "rm -rf DEPOT/ui >/dev/null 2>&1\n"
    "rm -rf DEPOT/ci >/dev/null 2>&1\n"
    "rm -rf DEPOT/jr >/dev/null 2>&1\n"
    "rm -rf DEPOT/gs >/dev/null 2>&1\n"
    "rm -rf DEPOT/dd >/dev/null 2>&1\n"
    "rm -rf DEPOT/ax >/dev/null 2>&1\n"
    "rm -rf DEPOT/la >/dev/null 2>&1\n"
    "rm -rf DEPOT/uf >/dev/null 2>&1\n"
    "rm -rf DEPOT/ux >/dev/null 2>&1\n"
    "rm -rf DEPOT/PRODUCT >/dev/null 2>&1\n"
    "echo $RETCODE > DEPOT/rc.txt\n"
    "exit $RETCODE\n";

constexpr const char* kInstallAndTwoWayScript =
    "#!/bin/sh\n"
    "trap \"true\" 13 15\n"
    "rm -f DEPOT/rc.txt >/dev/null 2>&1\n"
    "rm -f DEPOT/stderr.txt >/dev/null 2>&1\n"
    "rm -f DEPOT/stdout.txt >/dev/null 2>&1\n"
    "$* 2>DEPOT/stderr.txt 1>DEPOT/stdout.txt\n"
    "RETCODE=$?\n"
    "if [ \"$RETCODE\" -eq \"0\" ]; then\n"
    "TRANSLATOR 2>>DEPOT/stderr.txt 1>>DEPOT/stdout.txt\n"
    "RETCODE=$?\n"
    "fi\n"
    "rm -rf DEPOT/ui >/dev/null 2>&1\n"
    "rm -rf DEPOT/ci >/dev/null 2>&1\n"
    "rm -rf DEPOT/jr >/dev/null 2>&1\n"
    "rm -rf DEPOT/gs >/dev/null 2>&1\n"
    "rm -rf DEPOT/dd >/dev/null 2>&1\n"
    "rm -rf DEPOT/ax >/dev/null 2>&1\n"
    "rm -rf DEPOT/la >/dev/null 2>&1\n"
    "rm -rf DEPOT/uf >/dev/null 2>&1\n"
    "rm -rf DEPOT/ux >/dev/null 2>&1\n"
    "rm -rf DEPOT/PRODUCT >/dev/null 2>&1\n"
    "export RETCODE\n"
    "echo $RETCODE > DEPOT/rc.txt\n"
    "exit $RETCODE\n";

std::string filledIn(std::string text, const std::string& word, const std::string& value) {
    for (std::size_t at = 0; (at = text.find(word, at)) != std::string::npos; at += value.size()) {
        text.replace(at, word.size(), value);
    }
    return text;
}

TEST_F(SetupForRestart, WritesTheInstallOnlyScript) {
    for (const char* depot : {"depot", "other depot/deeper"}) {
        const std::string directory = home_.dir().makeDir(depot);
        depotDir = (directory + "/").c_str();
        for (const char* product : {"ux", "NE", "4p"}) {
            TaskQueueElem task = taskFor("", "", product);
            String command("./install.sh -q");
            String none;
            setupForRestart(command, none, task);

            const std::string lower = std::string(product) == "NE" ? "ne" : product;
            const std::string script = home_.dir().read(std::string(depot) + "/runcmd.sh");
            EXPECT_EQ(script,
                      filledIn(filledIn(kInstallOnlyScript, "DEPOT", directory), "PRODUCT", lower));
            const std::string expected = "/bin/sh " + directory + "/runcmd.sh ./install.sh -q";
            EXPECT_EQ(narrow(command), expected);
            EXPECT_EQ(trace_.count('D', "Constructing install only script " + expected), 1);
            trace_.clear();
        }
    }
}

TEST_F(SetupForRestart, WritesTheInstallAndTwoWayScript) {
    for (const char* depot : {"depot", "d2"}) {
        const std::string directory = home_.dir().makeDir(depot);
        depotDir = (directory + "/").c_str();
        for (const char* product : {"ux", "NE"}) {
            TaskQueueElem task = taskFor("", "", product);
            String command("./install.sh -q");
            String translator("/opt/bin/zav_xa -setCMS ux");
            setupForRestart(command, translator, task);

            const std::string lower = std::string(product) == "NE" ? "ne" : product;
            std::string text = filledIn(kInstallAndTwoWayScript, "DEPOT", directory);
            text = filledIn(text, "TRANSLATOR", "/opt/bin/zav_xa -setCMS ux");
            EXPECT_EQ(home_.dir().read(std::string(depot) + "/runcmd.sh"),
                      filledIn(text, "PRODUCT", lower));
            const std::string expected = "/bin/sh " + directory + "/runcmd.sh ./install.sh -q";
            EXPECT_EQ(narrow(command), expected);
            EXPECT_THAT(trace_.details("zavtasks"),
                        testing::IsSupersetOf(
                            {"Constructing install and two-way script " + expected,
                             std::string("Two Way Translator is: /opt/bin/zav_xa -setCMS ux")}));
            trace_.clear();
        }
    }
}

TEST_F(SetupForRestart, MakesNothingExecutable) {
    TaskQueueElem task = taskFor("");
    String command("x");
    String none;
    setupForRestart(command, none, task);
    struct stat status {};
    ASSERT_EQ(::stat((home_.depot() + "runcmd.sh").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0111u, 0u);
}

TEST_F(SetupForRestart, AScriptThatCannotBeWrittenIsOnlyTraced) {
    depotDir = (home_.depot() + "none/").c_str();
    TaskQueueElem task = taskFor("");
    String command("x");
    String none;
    setupForRestart(command, none, task);
    EXPECT_EQ(narrow(command), "/bin/sh " + home_.depot() + "none/runcmd.sh x");
    EXPECT_THAT(trace_.errors("zavtasks"),
                ElementsAre("Failed to open file " + home_.depot() +
                            "none/runcmd.sh using mode \"rb\", check permissions"));
}

// ---- INSTALL ------------------------------------------------------------------------------------

using Install = InstallTest;

TEST_F(Install, RunsTheCommandInTheContext) {
    const std::string command = installer("echo installed; echo warned >&2");
    EXPECT_EQ(run(command + " \"two words\""), kSuccess);
    EXPECT_THAT(home_.calls(kInstaller), ElementsAre("[-q][two words]"));
    EXPECT_EQ(home_.input(kInstaller), "");
    EXPECT_THAT(home_.calls("bin/cinfo"), IsEmpty());
    EXPECT_EQ(trace_.count('D', "Install command is [" + command + " \"two words\"]"), 1);
    EXPECT_EQ(trace_.count('D', "Executing install command " + command + " \"two words\""), 1);
    EXPECT_EQ(trace_.count('D', "Install returned 0 return code."), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
    EXPECT_THAT(fake_sleep::slept(), IsEmpty());
    EXPECT_FALSE(home_.dir().exists("depot/runcmd.sh"));
}

TEST_F(Install, ExpandsTheTokensOfTheContextFirst) {
    home_.dir().script("depot/ux/060100000/install.sh", "echo $1 > " + home_.home() + "/out");
    EXPECT_EQ(run("|DEPLOYDIR|/install.sh |TOVRINHOME|"), kSuccess);
    EXPECT_EQ(home_.dir().read("home/out"), home_.home() + "\n");
    EXPECT_EQ(run("|DEPOTDIR|none"), (Outcome{1030, "ZAV1030E", home_.depot() + "none"}));
}

TEST_F(Install, ACommandThatCannotRunIsAFailure) {
    for (const char* optional : {"", "SETCMS"}) {
        trace_.clear();
        const std::string command = home_.home() + "/none -q";
        EXPECT_EQ(run(command, optional), (Outcome{1030, "ZAV1030E", command}));
        EXPECT_EQ(trace_.count('E', "ZAV1030E Failed to start install command [" + command + "]"),
                  1);
        EXPECT_EQ(trace_.count('D', "Return code is 1030"), 1);
    }
}

TEST_F(Install, ACommandThatHangsIsAFailure) {
    const ScopedEnv timeout("TIMEOUT", "1");
    const std::string command = installer("exec sleep 20");
    EXPECT_EQ(run(command), (Outcome{1030, "ZAV1030E", command}));
}

TEST_F(Install, AFailedInstallationIsReportedWithItsExitCode) {
    for (const int code : {1, 65, 255}) {
        trace_.clear();
        const std::string command = installer("exit " + std::to_string(code));
        EXPECT_EQ(run(command, "SETCMS"),
                  (Outcome{1031, "ZAV1031E", command + "," + std::to_string(code)}));
        EXPECT_EQ(trace_.count('E', "ZAV1031E Bad return code [" + std::to_string(code) +
                                        "] from install command [" + command + "]"),
                  1);
        EXPECT_EQ(trace_.count('D', "Return code is 1031"), 1);
    }
    EXPECT_THAT(home_.calls("bin/cinfo"), IsEmpty());
}

TEST_F(Install, AnOptionalTextAsksForTheTranslator) {
    home_.translator("true");
    EXPECT_EQ(run(installer("true"), "requires_restart"), kSuccess);
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-setCMS][ux]"));
    EXPECT_EQ(home_.input(kTranslator), "");
    EXPECT_EQ(trace_.count('D', "SetCMS for product [ux] was successfull."), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 1);
}

TEST_F(Install, AMissingTranslatorHasNoMessage) {
    EXPECT_EQ(run(installer("true"), "SETCMS"), (Outcome{1031, "", ""}));
    EXPECT_EQ(trace_.count('E', "No default two way translator found"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1031"), 1);
}

TEST_F(Install, ATranslatorsExitCodeBecomesOneCharacter) {
    const std::string command = installer("true");
    for (const int code : {1, 65, 255}) {
        trace_.clear();
        home_.translator("exit " + std::to_string(code));
        const String parameter = String("INSTALL,ux,")
                                     .append(static_cast<unsigned short>(code))
                                     .append(("," + setCms()).c_str());
        EXPECT_EQ(run(command, "SETCMS"), (Outcome{1008, "ZAV1008E", narrow(parameter)}));
        EXPECT_EQ(trace_.count('E', "ZAV1008E Bad return code [" + std::to_string(code) +
                                        "] from setCMS command [" + setCms() + "]"),
                  1);
    }
    home_.translator("exit 65");
    EXPECT_EQ(run(command, "SETCMS"), (Outcome{1008, "ZAV1008E", "INSTALL,ux,A," + setCms()}));
}

TEST_F(Install, ATranslatorThatCannotRunIsAFailure) {
    home_.translator("true");
    home_.notExecutable(kTranslator);
    EXPECT_EQ(run(installer("true"), "SETCMS"),
              (Outcome{1009, "ZAV1009E", "INSTALL,ux," + setCms()}));
    EXPECT_EQ(trace_.count('E', "ZAV1009E Failed to start two way translator [" + setCms() + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1009"), 1);
}

TEST_F(Install, ATranslatorThatHangsIsAFailure) {
    const ScopedEnv timeout("TIMEOUT", "1");
    home_.translator("exec sleep 20");
    EXPECT_EQ(run(installer("true"), "SETCMS"),
              (Outcome{1009, "ZAV1009E", "INSTALL,ux," + setCms()}));
}

TEST_F(Install, OnlyPatchesOfTwoProductsAreReadWithoutBlocking) {
    const std::string line = "Patch being applied to oy or or, setting nonblocking io flag to true";
    const std::string patch = installer("true") + " qvspatch";
    struct Case {
        const char* product;
        std::string command;
        int expected;
    };
    for (const Case& c :
         {Case{"OR", patch, 1}, Case{"or", patch, 1}, Case{"oY", patch, 1}, Case{"ux", patch, 0},
          Case{"orx", patch, 0}, Case{"or", installer("true"), 0},
          Case{"or", installer("true") + " QVSPATCH", 0}}) {
        trace_.clear();
        EXPECT_EQ(run(c.command, "", c.product), kSuccess);
        EXPECT_EQ(trace_.count('D', line), c.expected) << c.product << " " << c.command;
    }
}

/// An installer that leaves a process behind, which keeps the pipes open and writes nothing. With
/// the agent script's name in its arguments, its output is read only after it has ended.
class InstallThatLeavesAProcess : public InstallTest {
protected:
    void install(const char* product) {
        const std::string command = installer(left_.command());
        EXPECT_EQ(run(command + " qvspatch TovrinAgent", "", product), kSuccess);
    }

    LeftRunning left_;
};

TEST_F(InstallThatLeavesAProcess, IsNotWaitedForWhenItPatchesOneOfTheTwoProducts) {
    const ScopedEnv timeout("TIMEOUT", "200");  // beyond the life of what is left
    install("OR");
    EXPECT_TRUE(left_.isRunning());
}

TEST_F(InstallThatLeavesAProcess, IsWaitedForToTheTimeoutOtherwise) {
    const ScopedEnv timeout("TIMEOUT", "3");
    const Stopwatch watch;
    install("ux");
    EXPECT_GE(watch.seconds(), 2.9);
    EXPECT_TRUE(left_.isRunning());
}

TEST_F(Install, AnInstallerMayPrintEightMegabytes) {
    const TraceCapture quiet("ERROR");
    EXPECT_EQ(run(installer("head -c 8388608 /dev/zero | tr '\\0' x")), kSuccess);
}

// ---- INSTALL that restarts the agent ------------------------------------------------------------

class InstallWithRestart : public InstallTest {
protected:
    std::string scripted(const std::string& command) const {
        return "/bin/sh " + home_.depot() + "runcmd.sh " + command;
    }
};

TEST_F(InstallWithRestart, ReportsSuccessBeforeItRuns) {
    home_.translator("echo translated; echo complained >&2");
    const std::string command = installer("cp \"" + home_.depot() +
                                          "runcmd.sh\" $0.script; echo installed; echo warned >&2");
    home_.dir().write("depot/ux/file", "");
    home_.dir().write("depot/rc.txt", "7\n");
    EXPECT_EQ(run(command, "REQUIRES_RESTART"), kSuccess);

    // Five seconds before the outcome is published, and one that paces the rows.
    EXPECT_THAT(fake_sleep::slept(), ElementsAre(5u, 1u));
    const std::vector<std::string> details = trace_.details();
    const auto at = [&](const std::string& text) {
        return std::find(details.begin(), details.end(), text) - details.begin();
    };
    EXPECT_EQ(trace_.count('D', "Returning aysnc status return code [0], message id [] parms []"),
              1);
    EXPECT_LT(at("Generating post install script"), at("Sleeping for 5 seconds..."));
    EXPECT_LT(at("Sleeping for 5 seconds..."),
              at("Returning aysnc status return code [0], message id [] parms []"));
    EXPECT_LT(at("Returning aysnc status return code [0], message id [] parms []"),
              at("Command to run is \"" + scripted(command) + "\""));
    EXPECT_EQ(trace_.count('D', "Using Two-Way Translator " + setCms()), 1);
    EXPECT_EQ(trace_.count('D', "Install command is [" + scripted(command) + "]"), 1);

    EXPECT_THAT(home_.calls(kInstaller), ElementsAre("[-q]"));
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-setCMS][ux]"));
    EXPECT_EQ(inDepot("rc.txt"), "0\n");
    EXPECT_EQ(inDepot("stdout.txt"), "installed\ntranslated\n");
    EXPECT_EQ(inDepot("stderr.txt"), "warned\ncomplained\n");
    EXPECT_FALSE(home_.dir().exists("depot/ux"));
    EXPECT_TRUE(home_.dir().exists("depot/runcmd.sh"));
}

TEST_F(InstallWithRestart, TheProductIsInLowerCaseForTheDepotOnly) {
    home_.translator("true");
    home_.dir().write("depot/ne/file", "");
    home_.dir().write("depot/NE/file", "");
    EXPECT_EQ(run(installer("true"), "REQUIRES_RESTART", "NE"), kSuccess);
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-setCMS][NE]"));
    EXPECT_FALSE(home_.dir().exists("depot/ne"));
    EXPECT_TRUE(home_.dir().exists("depot/NE"));
}

TEST_F(InstallWithRestart, LeavesTheInstallersExitCodeInTheDepot) {
    home_.translator("true");
    const std::string command = installer("exit 9");
    EXPECT_EQ(run(command, "REQUIRES_RESTART"),
              (Outcome{1031, "ZAV1031E", scripted(command) + ",9"}));
    EXPECT_EQ(inDepot("rc.txt"), "9\n");
    EXPECT_THAT(home_.calls(kTranslator), IsEmpty());
}

TEST_F(InstallWithRestart, LeavesTheTranslatorsExitCodeInTheDepot) {
    home_.translator("exit 4");
    const std::string command = installer("true");
    EXPECT_EQ(run(command, "REQUIRES_RESTART"),
              (Outcome{1031, "ZAV1031E", scripted(command) + ",4"}));
    EXPECT_EQ(inDepot("rc.txt"), "4\n");
}

TEST_F(InstallWithRestart, NeedsATranslatorAndSaysSoWithAnotherMessage) {
    const std::string command = installer("true");
    EXPECT_EQ(run(command, "REQUIRES_RESTART"), (Outcome{1031, "ZAV1030E", command}));
    EXPECT_EQ(trace_.count('E', "No default two way translator found"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1031"), 1);
    EXPECT_EQ(trace_.count('D', "Install command is [" + command + "]"), 0);
    EXPECT_THAT(home_.calls(kInstaller), IsEmpty());
    EXPECT_THAT(fake_sleep::slept(), IsEmpty());
    EXPECT_FALSE(home_.dir().exists("depot/runcmd.sh"));
}

TEST_F(InstallWithRestart, AScriptThatCouldNotBeWrittenFailsInTheShell) {
    home_.translator("true");
    depotDir = (home_.depot() + "none/").c_str();
    const Outcome outcome = run(installer("true"), "REQUIRES_RESTART");
    EXPECT_EQ(outcome.rc, 1031);
    EXPECT_EQ(outcome.messageId, "ZAV1031E");
    EXPECT_THAT(outcome.parameter, StartsWith("/bin/sh " + home_.depot() + "none/runcmd.sh " +
                                              home_.home() + "/install.sh -q,"));
    EXPECT_THAT(home_.calls(kInstaller), IsEmpty());
}

TEST_F(InstallWithRestart, LeavesNoDescriptorOpen) {
    home_.translator("true");
    run(installer("true"), "REQUIRES_RESTART");
    const auto before = openDescriptors();
    run(installer("exit 1"), "REQUIRES_RESTART");
    run(home_.home() + "/none", "");
    run(installer("true"), "SETCMS");
    EXPECT_EQ(openDescriptors(), before);
}

// ---- COMPLETE_INSTALL ---------------------------------------------------------------------------

class CompleteInstall : public InstallTest {
protected:
    Outcome complete() {
        TaskQueueElem task;
        task.setCommand("COMPLETE_INSTALL");
        fake_sleep::reset();
        const TASK_RC rc = completeInstallAfterRestart(task);
        EXPECT_THAT(fake_sleep::slept(), ElementsAre(10u));
        return outcomeOf(task, rc);
    }
    Outcome completeWith(const std::string& content) {
        home_.dir().write("depot/rc.txt", content);
        const Outcome outcome = complete();
        EXPECT_EQ(inDepot("rc.txt"), content);
        return outcome;
    }
};

TEST_F(CompleteInstall, ReportsSuccess) {
    EXPECT_EQ(completeWith("0\n"), kSuccess);
    EXPECT_EQ(completeWith("  0\r\n"), kSuccess);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(CompleteInstall, ReportsAnyOtherExitCode) {
    EXPECT_EQ(completeWith("3"), (Outcome{1031, "ZAV1031E", home_.depot() + "rc.txt,3"}));
    EXPECT_EQ(completeWith("\n255\n\n"), (Outcome{1031, "ZAV1031E", home_.depot() + "rc.txt,255"}));
    EXPECT_EQ(completeWith("-1\n"), (Outcome{1031, "ZAV1031E", home_.depot() + "rc.txt,-1"}));
}

TEST_F(CompleteInstall, TakesWhatIsNoNumberForSuccess) {
    for (const char* content : {"", "\n", "\n\n", "text", "3 4", "3x", "2147483647"}) {
        EXPECT_EQ(completeWith(content), kSuccess) << content;
    }
}

TEST_F(CompleteInstall, NeedsTheScriptsResult) {
    EXPECT_EQ(complete(), (Outcome{1031, "ZAV1031E", home_.depot() + "rc.txt,NOTFOUND"}));
    EXPECT_EQ(trace_.count('E', "Unable to read rc.txt for install's return code"), 1);
}

TEST_F(CompleteInstall, APipeInPlaceOfTheReturnCodeIsNone) {
    ASSERT_EQ(::mkfifo(home_.dir().path("depot/rc.txt").c_str(), 0600), 0);
    EXPECT_EQ(complete(), (Outcome{1031, "ZAV1031E", home_.depot() + "rc.txt,NOTFOUND"}));
}

TEST_F(CompleteInstall, LooksForTheResultOnlyAfterItsSleep) {
    fake_sleep::reset();
    fake_sleep::whileAsleep([this] { home_.dir().write("depot/rc.txt", "3\n"); });
    TaskQueueElem task;
    const TASK_RC rc = completeInstallAfterRestart(task);
    EXPECT_EQ(outcomeOf(task, rc), (Outcome{1031, "ZAV1031E", home_.depot() + "rc.txt,3"}));
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(CompleteInstall, ReportsWhatTheScriptLeft) {
    home_.translator("true");
    run(installer("exit 5"), "REQUIRES_RESTART");
    EXPECT_EQ(complete(), (Outcome{1031, "ZAV1031E", home_.depot() + "rc.txt,5"}));
    run(installer("true"), "REQUIRES_RESTART");
    EXPECT_EQ(complete(), kSuccess);
}

}  // namespace
