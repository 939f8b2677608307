// ctest-label: threaded
// The program from its command line to its end, with a plug-in of the tests' own.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <signal.h>
#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <memory>
#include <thread>
#include <utility>

#include "host/raw_client.h"
#include "support/free_port.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::minutes;
using std::chrono::seconds;

class HostProgram : public testing::Test {
protected:
    std::vector<std::string> command(std::vector<std::string> more = {}) const {
        std::vector<std::string> argv = {ZAV_BUILD_DIR "/bin/zavhost",
                                         "--home",
                                         scratch.path("home"),
                                         "--socket",
                                         socket,
                                         "--unguarded",
                                         "--plugin",
                                         ZAV_BUILD_DIR "/lib/made_up_plugin.so"};
        argv.insert(argv.end(), more.begin(), more.end());
        return argv;
    }
    std::unique_ptr<Program> start(std::vector<std::string> more = {}) {
        auto program = std::make_unique<Program>(command(std::move(more)));
        EXPECT_TRUE(program->awaitOutput("ready: " + socket + "\n", minutes(3))) << program->err();
        return program;
    }
    /// Starts it for nothing; its one line of complaint.
    static std::string complaint(const std::vector<std::string>& argv,
                                 const Environment& environment = {}) {
        const ProgramResult result = runProgram(argv, "", environment);
        EXPECT_EQ(result.status, 1);
        EXPECT_EQ(result.out, "");
        EXPECT_EQ(std::count(result.err.begin(), result.err.end(), '\n'), 1) << result.err;
        return result.err;
    }
    void request(const std::string& transid, int taskMilliseconds) const {
        RawClient client(socket);
        const auto answer = client.post(
            "/v1/query",
            R"({"table":"KAGREQT","where":[{"column":"COMMAND","op":"=","value":"WORK"},)"
            R"({"column":"PRODUCT","op":"=","value":")" +
                std::to_string(taskMilliseconds) + R"("},{"column":"TRANSID","op":"=","value":")" +
                transid + "\"}]}");
        EXPECT_EQ(answer.status, 200) << answer.body;
    }
    bool began(const std::string& transid) const {
        return eventually([&] { return scratch.exists("home/began-" + transid); });
    }
    void expectNoFilesLeft() const {
        EXPECT_FALSE(scratch.exists("s"));
        EXPECT_FALSE(scratch.exists("s.rpc"));
        EXPECT_FALSE(scratch.exists("s.lock"));
        EXPECT_FALSE(scratch.exists("s.rpc.lock"));
    }

    ScratchDir scratch;
    const std::string home = scratch.makeDir("home");
    const std::string socket = scratch.path("s");
};

TEST_F(HostProgram, PrintsItsConfigurationAndStartsNothing) {
    const std::string file = scratch.write("zavhost.conf", "\ngrace = 7\n");
    const ProgramResult result = runProgram(command({"--config", file, "--print-config"}));
    EXPECT_EQ(result.status, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_NE(result.out.find("\nsocket = \"" + socket + "\"  # command line\n"), std::string::npos)
        << result.out;
    EXPECT_NE(result.out.find("\ngrace = 7  # " + file + ":2\n"), std::string::npos) << result.out;
    expectNoFilesLeft();
}

TEST_F(HostProgram, DoesNotStartWithAConfigurationFileThatItDoesNotUnderstand) {
    const std::string file = scratch.write("zavhost.conf", "\ngarce = 7\n");
    EXPECT_EQ(complaint(command({"--config", file})),
              "zavhost: " + file + ":2: there is no option \"garce\"; did you mean grace?\n");
    expectNoFilesLeft();
}

TEST_F(HostProgram, SaysThatItIsReadyAndNothingElse) {
    const auto program = start();
    EXPECT_EQ(program->out(), "ready: " + socket + "\n");
    EXPECT_EQ(program->err(), "");
    for (const char* name : {"s", "s.rpc"}) {
        struct stat found {};
        ASSERT_EQ(::stat(scratch.path(name).c_str(), &found), 0) << name;
        EXPECT_EQ(found.st_mode, S_IFSOCK | 0600U);
        EXPECT_TRUE(RawClient(scratch.path(name)).connected());
    }
    EXPECT_NE(RawClient(socket).get("/v1/health").body.find("\"home\":\"" + home + "\""),
              std::string::npos);
}

TEST_F(HostProgram, EndsWithStatus0OnBothSignals) {
    for (const int signal : {SIGTERM, SIGINT}) {
        const auto program = start();
        program->signal(signal);
        EXPECT_EQ(program->wait().status, 0);
        expectNoFilesLeft();
    }
}

TEST_F(HostProgram, OpensItsTraceLogAnewOnHangUpAndGoesOn) {
    const std::string log = scratch.path("trace.log");
    Program program(command(), "", {{"KBB_RAS1_LOG", log}});
    ASSERT_TRUE(program.awaitOutput("ready: ", minutes(3))) << program.err();
    for (int round = 0; round < 3; ++round) {
        ASSERT_TRUE(scratch.exists("trace.log"));
        std::filesystem::rename(log, scratch.path("trace.old"));
        program.signal(SIGHUP);
        EXPECT_TRUE(eventually([&] { return scratch.exists("trace.log"); })) << "round " << round;
    }
    EXPECT_EQ(RawClient(socket).get("/v1/health").status, 200);
    program.signal(SIGTERM);
    EXPECT_EQ(program.wait().status, 0);
}

TEST_F(HostProgram, TellsWhyItDoesNotStart) {
    const std::string program = command()[0];
    const auto withPlugin = [&](const std::string& plugin) {
        std::vector<std::string> argv = command();
        argv.back() = plugin;
        return argv;
    };
    EXPECT_EQ(complaint({program}, {{"TOVRINHOME", ""}}),
              "zavhost: no home: give --home DIR or set TOVRINHOME\n");
    EXPECT_EQ(complaint({program, "--home", "/nonexistent"}),
              "zavhost: home /nonexistent: No such file or directory\n");
    EXPECT_EQ(complaint(withPlugin("/nonexistent.so")),
              "zavhost: plug-in cannot be loaded: /nonexistent.so: cannot open shared object "
              "file: No such file or directory\n");
    const std::string platform = ZAV_BUILD_DIR "/lib/libzavplatform.so";
    EXPECT_EQ(complaint(withPlugin(platform)),
              "zavhost: plug-in " + platform + " has no function Initialize_Mgmt_Functions\n");
    EXPECT_EQ(complaint(command(), {{"MADE_UP_PLUGIN", "empty"}}),
              "zavhost: plug-in " + command().back() + " offers no tables\n");
    std::vector<std::string> here = withPlugin("libm.so.6");
    EXPECT_EQ(complaint(here),
              "zavhost: plug-in cannot be loaded: ./libm.so.6: cannot open shared object file: No "
              "such file or directory\n")
        << "a file of that name, not a library of the system";
    std::vector<std::string> odd = command({"--odd"});
    EXPECT_EQ(complaint(odd), "zavhost: there is no option --odd (--help shows the options)\n");
    expectNoFilesLeft();
}

TEST_F(HostProgram, LeavesALiveHostAlone) {
    const auto program = start();
    EXPECT_EQ(complaint(command()), "zavhost: socket " + socket + " is in use by a live host\n");
    // The same file transfer socket under another name of the first one.
    std::vector<std::string> other = command();
    other[4] = scratch.path("other");
    other.insert(other.end(), {"--rpc-socket", socket + ".rpc"});
    EXPECT_EQ(complaint(other), "zavhost: socket " + socket + ".rpc is in use by a live host\n");
    EXPECT_FALSE(scratch.exists("other"));
    EXPECT_EQ(RawClient(socket).get("/v1/health").status, 200);
}

TEST_F(HostProgram, ReplacesTheSocketsOfOneThatWasKilled) {
    const auto killed = start();
    killed->signal(SIGKILL);
    killed->wait();
    ASSERT_TRUE(scratch.exists("s"));
    ASSERT_TRUE(scratch.exists("s.rpc"));
    const auto program = start();
    EXPECT_EQ(RawClient(socket).get("/v1/health").status, 200);
}

TEST_F(HostProgram, OfManyThatStartAtOnceExactlyOneServes) {
    scratch.write("s.lock", "");
    std::vector<std::unique_ptr<Program>> programs;
    for (int i = 0; i < 8; ++i)
        programs.push_back(std::make_unique<Program>(command()));
    const auto running = [&] {
        return std::count_if(programs.begin(), programs.end(),
                             [](const auto& program) { return program->running(); });
    };
    EXPECT_TRUE(eventually([&] { return running() == 1; }));
    for (const auto& program : programs) {
        if (program->running()) {
            EXPECT_TRUE(program->awaitOutput("ready: ", minutes(3)));
        } else {
            EXPECT_EQ(program->wait().status, 1);
        }
    }
    EXPECT_EQ(RawClient(socket).get("/v1/health").status, 200);
}

TEST_F(HostProgram, ServesFileTransfersOnALoopbackPortWhenToldTo) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(freePort());
    const int taken = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const socklen_t length = sizeof address;
    auto* const generic = reinterpret_cast<sockaddr*>(&address);
    ASSERT_EQ(::bind(taken, generic, length), 0);
    ASSERT_EQ(::listen(taken, 1), 0);
    const std::string port = std::to_string(ntohs(address.sin_port));
    EXPECT_EQ(complaint(command({"--rpc-port", port})),
              "zavhost: cannot listen on the loopback port " + port + ": Address already in use\n");
    ::close(taken);
    const auto program = start({"--rpc-port", port});
    const int client = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    EXPECT_EQ(::connect(client, generic, length), 0);
    ::close(client);
}

TEST_F(HostProgram, GoesOnWhenOnlyFileTransfersFailToRegister) {
    Program program(command(), "", {{"MADE_UP_PLUGIN", "status"}});
    EXPECT_TRUE(program.awaitOutput("ready: ", minutes(3)));
    EXPECT_EQ(program.err(), "zavhost: plug-in " + command().back() +
                                 " started with status 7; file transfers may fail\n");
}

TEST_F(HostProgram, EndsAfterTheTaskInHandAndBeginsNoOther) {
    const auto program = start();
    RawClient events(socket);
    events.send("GET /v1/events?table=KAGDYST HTTP/1.1\r\n\r\n");
    ASSERT_NE(events.readUntil("\r\n\r\n").find("200"), std::string::npos);
    request("first", 3'000);  // time enough for the signal to arrive meanwhile
    request("second", 1);
    ASSERT_TRUE(began("first"));
    program->signal(SIGTERM);
    EXPECT_EQ(program->wait().status, 0);
    EXPECT_TRUE(scratch.exists("home/ended-first"));
    EXPECT_FALSE(scratch.exists("home/began-second"));
    EXPECT_NE(events.readUntil("\n\n").find("\"TRANSID\":\"first\""), std::string::npos);
    expectNoFilesLeft();
}

TEST_F(HostProgram, EndsAfterTenSecondsWhateverItsTaskDoes) {
    const auto program = start();
    request("endless", 600'000);
    ASSERT_TRUE(began("endless"));
    const auto begin = std::chrono::steady_clock::now();
    program->signal(SIGTERM);
    EXPECT_EQ(program->wait().status, 0);
    EXPECT_GE(std::chrono::steady_clock::now() - begin, milliseconds(9'900));
    expectNoFilesLeft();
}

/// Runs the program below a shell that has changed its descriptors first.
std::vector<std::string> below(const std::string& redirections,
                               const std::vector<std::string>& argv) {
    std::vector<std::string> shell = {"/bin/sh", "-c", "exec \"$@\" " + redirections, "sh"};
    shell.insert(shell.end(), argv.begin(), argv.end());
    return shell;
}

TEST_F(HostProgram, WorksWithItsStandardDescriptorsClosed) {
    Program program(below("<&- >&- 2>&-", command()));
    EXPECT_TRUE(eventually([&] { return RawClient(socket).get("/v1/health").status == 200; }));
    std::error_code error;
    const std::filesystem::path standard = "/proc/" + std::to_string(program.pid()) + "/fd/1";
    EXPECT_EQ(std::filesystem::read_symlink(standard, error).string(), "/dev/null");
    program.signal(SIGTERM);
    EXPECT_EQ(program.wait().status, 0);
}

TEST_F(HostProgram, SurvivesWhenNobodyReadsItsOutput) {
    const std::string pipe = scratch.path("pipe");
    ASSERT_EQ(::mkfifo(pipe.c_str(), 0600), 0);
    const int reader = ::open(pipe.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    const int writer = ::open(pipe.c_str(), O_WRONLY | O_CLOEXEC);
    ASSERT_GE(writer, 0);
    ::close(reader);
    // The shell finds a pipe whose reader has gone: its descriptor is inherited, not opened.
    ASSERT_EQ(::fcntl(writer, F_SETFD, 0), 0);
    const std::string number = std::to_string(writer);
    Program program(below(">&" + number + " 2>&" + number, command()));
    EXPECT_TRUE(eventually([&] { return RawClient(socket).get("/v1/health").status == 200; }));
    program.signal(SIGTERM);
    EXPECT_EQ(program.wait().status, 0);
    ::close(writer);
}

/// Wake-ups of all threads of a process so far.
[[maybe_unused]] long switches(pid_t pid) {
    long sum = 0;
    const std::string tasks = "/proc/" + std::to_string(pid) + "/task";
    for (const auto& task : std::filesystem::directory_iterator(tasks)) {
        std::ifstream in(task.path() / "status");
        for (std::string line; std::getline(in, line);) {
            const std::string name = "voluntary_ctxt_switches:";
            if (line.rfind(name, 0) == 0) sum += std::atol(line.c_str() + name.size());
        }
    }
    return sum;
}

#ifndef __SANITIZE_THREAD__  // whose own thread is woken all the time
TEST_F(HostProgram, SleepsWhenNobodyWantsAnything) {
    const auto program = start();
    EXPECT_EQ(RawClient(socket).get("/v1/health").status, 200);
    request("t", 1);
    ASSERT_TRUE(eventually([&] { return scratch.exists("home/ended-t"); }));
    long before = -1;
    const auto isStill = [&] {
        const long last = std::exchange(before, switches(program->pid()));
        return before == last;
    };
    // The end of the request may still be on its way through the threads, and into the log a second
    // later. That nobody is woken shows only in time: the pauses are what the counts of wake-ups
    // are compared over, long enough for somebody who looks once a second.
    const auto isStillForLong = [&] {
        std::this_thread::sleep_for(milliseconds(1100));
        return isStill();
    };
    ASSERT_TRUE(eventually(isStillForLong));
    EXPECT_TRUE(isStillForLong());
}
#endif

}  // namespace
