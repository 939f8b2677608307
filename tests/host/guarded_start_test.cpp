// ctest-label: threaded
// What a guarded host looks at before it starts, on a home of the starter home's and with the real
// plug-in; and that an unguarded one does not.
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <memory>
#include <vector>

#include "host/checks/check_list.h"
#include "host/raw_client.h"
#include "support/free_port.h"
#include "support/host/program.h"
#include "support/host/starter_home.h"

namespace {

using std::chrono::minutes;

class GuardedStart : public testing::Test {
protected:
    std::vector<std::string> command(const std::string& socket,
                                     const std::vector<std::string>& more = {}) const {
        std::vector<std::string> argv = {ZAV_BUILD_DIR "/bin/zavhost", "--home", home.path(),
                                         "--socket", scratch.path(socket)};
        argv.insert(argv.end(), more.begin(), more.end());
        return argv;
    }
    std::unique_ptr<Program> start(const std::string& socket,
                                   const std::vector<std::string>& more = {},
                                   const Environment& environment = {}) const {
        return std::make_unique<Program>(command(socket, more), "", environment);
    }
    bool isReady(Program& program, const std::string& socket) const {
        return program.awaitOutput("ready: " + scratch.path(socket), minutes(3));
    }
    ProgramResult refused(const std::vector<std::string>& more = {},
                          const Environment& environment = {}) const {
        return runProgram(command("refused", more), "", environment);
    }

    /// The umask of an INSTALL's command when the host is started without any.
    std::string umaskOfCommands(const std::vector<std::string>& more) const {
        std::vector<std::string> argv = {"/bin/sh", "-c", "umask 0; exec \"$@\"", "sh"};
        const std::vector<std::string> host = command("s", more);
        argv.insert(argv.end(), host.begin(), host.end());
        Program program(argv, "", home.environment());
        EXPECT_TRUE(isReady(program, "s")) << program.err();
        const std::string installer =
            scratch.script("installer", "umask >'" + scratch.path("umask") + "'");
        const ProgramResult installed =
            runProgram({ZAV_BUILD_DIR "/bin/zavctl", "--socket", scratch.path("s"), "install", "ux",
                        "060100000", "--no-verify", "--", installer});
        EXPECT_EQ(installed.status, 0) << installed.out << installed.err;
        return scratch.read("umask");
    }

    StarterHome home{"ux"};
    ScratchDir scratch;
};

TEST_F(GuardedStart, ASecondHostOnTheHomeIsRefusedWithTheFirstOnesProcess) {
    const auto first = start("first");
    ASSERT_TRUE(isReady(*first, "first")) << first->err();
    const ProgramResult second = refused();
    EXPECT_EQ(second.status, 1);
    EXPECT_EQ(second.err, "zavhost: home " + home.path() +
                              " is in use by the host with process id " +
                              std::to_string(first->pid()) + "\n");
    first->signal(SIGKILL);
    first->wait();
    const auto third = start("first");
    EXPECT_TRUE(isReady(*third, "first")) << third->err();
}

TEST_F(GuardedStart, UnguardedHostsMayShareAHome) {
    const auto first = start("first");
    ASSERT_TRUE(isReady(*first, "first")) << first->err();
    const std::string warning =
        "zavhost: warning: home " + home.path() + " is in use by the host with process id " +
        std::to_string(first->pid()) + "; both will run commands there at the same time\n";
    for (const char* const other : {"second", "third"}) {
        const auto beside = start(other, {"--unguarded"});
        EXPECT_TRUE(isReady(*beside, other)) << beside->err();
        EXPECT_NE(beside->err().find(warning), std::string::npos) << beside->err();
    }
}

TEST_F(GuardedStart, AnUnguardedHostThatIsAloneOnItsHomeGivesNoWarning) {
    const auto guarded = start("first");
    ASSERT_TRUE(isReady(*guarded, "first")) << guarded->err();
    guarded->signal(SIGTERM);
    ASSERT_EQ(guarded->wait().status, 0);
    const auto alone = start("second", {"--unguarded"});
    ASSERT_TRUE(isReady(*alone, "second")) << alone->err();
    EXPECT_EQ(alone->err().find("in use"), std::string::npos) << alone->err();
}

TEST_F(GuardedStart, OfManyAtOnceExactlyOneServesTheHome) {
    std::vector<std::unique_ptr<Program>> programs;
    for (int i = 0; i < 6; ++i)
        programs.push_back(start("s" + std::to_string(i)));
    const auto running = [&] {
        return std::count_if(programs.begin(), programs.end(),
                             [](const auto& program) { return program->running(); });
    };
    EXPECT_TRUE(eventually([&] { return running() == 1; }));
    const auto owner = std::find_if(programs.begin(), programs.end(),
                                    [](const auto& program) { return program->running(); });
    ASSERT_NE(owner, programs.end());
    EXPECT_TRUE((*owner)->awaitOutput("ready: ", minutes(3))) << (*owner)->err();
    for (const auto& program : programs) {
        if (program == *owner) continue;
        EXPECT_EQ(program->wait().status, 1);
        EXPECT_NE(program->err().find("is in use by the host with process id " +
                                      std::to_string((*owner)->pid())),
                  std::string::npos)
            << program->err();
    }
}

TEST_F(GuardedStart, AMissingProgramIsRefusedWithTheRemedy) {
    const std::string program = home.path("bin/uninstall.sh");
    std::filesystem::remove(program);
    const ProgramResult result = refused();
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "zavhost: not started (see --check); uninstaller: " + program +
                              " is missing; no product can be removed; restore it from the starter "
                              "home or a backup\n");
}

TEST_F(GuardedStart, ADepotThatCannotBeUsedIsRefused) {
    const std::string file = scratch.write("file", "");
    const ProgramResult result = refused({}, {{"QVSDEPLOY_AGENTDEPOT", file}});
    EXPECT_EQ(result.status, 1);
    EXPECT_NE(result.err.find("not started (see --check); depot: " + file + " cannot be used"),
              std::string::npos)
        << result.err;
}

TEST_F(GuardedStart, ADepotThatThePlugInCannotMakeIsRefused) {
    // Nothing about /proc says that no directory can be made there.
    const ProgramResult result = refused({}, {{"QVSDEPLOY_AGENTDEPOT", "/proc/depot"}});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_NE(result.err.find("/proc/depot"), std::string::npos) << result.err;
    const auto unguarded = start("s", {"--unguarded"}, {{"QVSDEPLOY_AGENTDEPOT", "/proc/depot"}});
    EXPECT_TRUE(isReady(*unguarded, "s")) << unguarded->err();
}

TEST_F(GuardedStart, AnUnguardedHostStartsWithoutADepotAndItsPlugInRefusesEveryCommand) {
    const std::string file = scratch.write("file", "");
    const auto program = start("s", {"--unguarded"}, {{"QVSDEPLOY_AGENTDEPOT", file + "/depot"}});
    ASSERT_TRUE(isReady(*program, "s")) << program->err();
    RawClient client(scratch.path("s"));
    const auto answer = client.post("/v1/query", R"({"table":"KAGREQT","where":[)"
                                                 R"({"column":"COMMAND","op":"=","value":"START"},)"
                                                 R"({"column":"PRODUCT","op":"=","value":"ux"}]})");
    EXPECT_NE(answer.body.find("\"RETVAL\":1002"), std::string::npos) << answer.body;
}

TEST_F(GuardedStart, APortIntoTheHomeItselfIsRefused) {
    const std::string port = std::to_string(freePort());
    const Environment depotIsHome = {{"QVSDEPLOY_AGENTDEPOT", home.path()}};
    const ProgramResult result = refused({"--rpc-port", port}, depotIsHome);
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "zavhost: --rpc-port: the depot " + home.path() +
                              " holds the home itself, whose programs a transfer could replace; "
                              "name another directory in QVSDEPLOY_AGENTDEPOT\n");
    const auto withoutPort = start("s", {}, depotIsHome);
    EXPECT_TRUE(isReady(*withoutPort, "s")) << withoutPort->err();
}

TEST_F(GuardedStart, AnUnguardedHostServesAPortIntoTheHome) {
    const auto program = start("s", {"--unguarded", "--rpc-port", std::to_string(freePort())},
                               {{"QVSDEPLOY_AGENTDEPOT", home.path()}});
    EXPECT_TRUE(isReady(*program, "s")) << program->err();
}

TEST_F(GuardedStart, WarningsAreSaidAndDoNotMatter) {
    const std::string copy = home.files().write("home/config/um.config.copy", "");
    const auto program = start("s");
    ASSERT_TRUE(isReady(*program, "s")) << program->err();
    EXPECT_NE(program->err().find("zavhost: warning: leftovers: "), std::string::npos)
        << program->err();
    EXPECT_NE(program->err().find(copy), std::string::npos) << program->err();
}

TEST_F(GuardedStart, TheTemporaryDirectoryIsMade) {
    std::filesystem::remove_all(home.path("tmp"));
    const auto program = start("s");
    ASSERT_TRUE(isReady(*program, "s")) << program->err();
    EXPECT_TRUE(std::filesystem::is_directory(home.path("tmp")));
}

TEST_F(GuardedStart, AnUnguardedHostMakesNoTemporaryDirectory) {
    std::filesystem::remove_all(home.path("tmp"));
    const auto program = start("s", {"--unguarded"});
    ASSERT_TRUE(isReady(*program, "s")) << program->err();
    EXPECT_FALSE(std::filesystem::exists(home.path("tmp")));
}

TEST_F(GuardedStart, CommandsGetAUmaskThatTakesWritePermissionFromOthers) {
    EXPECT_EQ(umaskOfCommands({}), "0022\n");
}

TEST_F(GuardedStart, CommandsOfAnUnguardedHostGetItsUmask) {
    EXPECT_EQ(umaskOfCommands({"--unguarded"}), "0000\n");
}

TEST_F(GuardedStart, AnUnguardedHostChecksNothing) {
    std::filesystem::remove(home.path("bin/uninstall.sh"));
    const auto program = start("s", {"--unguarded"});
    ASSERT_TRUE(isReady(*program, "s")) << program->err();
    EXPECT_EQ(program->err().find("uninstall"), std::string::npos) << program->err();
}

TEST_F(GuardedStart, CheckPrintsEveryCheckAndStartsNothing) {
    const ProgramResult good = refused({"--check"});
    EXPECT_EQ(good.status, 0) << good.out;
    EXPECT_EQ(good.out.find("error"), std::string::npos) << good.out;
    EXPECT_EQ(std::count(good.out.begin(), good.out.end(), '\n'),
              static_cast<std::ptrdiff_t>(host::checks().size()))
        << good.out;
    EXPECT_NE(good.out.find("ok       agent-script  " + home.path("bin/TovrinAgent") + "\n"),
              std::string::npos)
        << good.out;
    EXPECT_FALSE(scratch.exists("refused"));
    EXPECT_FALSE(home.files().exists("home/.zavhost.lock"));
    std::filesystem::remove(home.path("bin/TovrinAgent"));
    const ProgramResult bad = refused({"--check"});
    EXPECT_EQ(bad.status, 1);
    EXPECT_NE(bad.out.find("error    agent-script  "), std::string::npos) << bad.out;
}

TEST_F(GuardedStart, TheDoctorSaysWhatCheckPrints) {
    const auto program = start("s");
    ASSERT_TRUE(isReady(*program, "s")) << program->err();
    const ProgramResult doctor =
        runProgram({ZAV_BUILD_DIR "/bin/zavctl", "--socket", scratch.path("s"), "doctor"});
    EXPECT_EQ(doctor.status, 0) << doctor.out;
    EXPECT_EQ(doctor.err, "");
    const auto until = [](const std::string& text) { return text.substr(0, text.find("space")); };
    EXPECT_EQ(until(doctor.out), until(runProgram(command("s", {"--check"})).out));
    std::filesystem::remove(home.path("bin/TovrinAgent"));
    EXPECT_EQ(
        runProgram({ZAV_BUILD_DIR "/bin/zavctl", "--socket", scratch.path("s"), "doctor"}).status,
        1);
}

TEST_F(GuardedStart, ATimeOutThatIsNoNumberIsRefused) {
    const ProgramResult result = refused({}, {{"TIMEOUT", "five"}});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(
        result.err,
        "zavhost: not started (see --check); time-out: TIMEOUT takes a number of seconds from "
        "1 to 2147483646, not \"five\"; every command would be given up at once; correct "
        "TIMEOUT, unset it, or give --task-timeout\n");
    const auto corrected = start("s", {"--task-timeout", "20"}, {{"TIMEOUT", "five"}});
    EXPECT_TRUE(isReady(*corrected, "s")) << corrected->err();
}

TEST_F(GuardedStart, ATimeOutThatIsNoNumberHidesNothingElseThatIsWrong) {
    std::filesystem::remove(home.path("bin/TovrinAgent"));
    const std::string said = refused({}, {{"TIMEOUT", "five"}}).err;
    EXPECT_NE(said.find("; agent-script: "), std::string::npos) << said;
    EXPECT_NE(said.find("; time-out: "), std::string::npos) << said;
}

TEST_F(GuardedStart, AnUnguardedHostStartsWithSuchATimeOut) {
    const auto program = start("s", {"--unguarded"}, {{"TIMEOUT", "five"}});
    EXPECT_TRUE(isReady(*program, "s")) << program->err();
}

}  // namespace
