// ctest-label: threaded
// The program as a service: what its manager hears, and sockets that the manager passes.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>

#include <memory>

#include "host/raw_client.h"
#include "support/host/notify_socket.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

class ServiceProgram : public testing::Test {
protected:
    std::vector<std::string> command() const {
        return {ZAV_BUILD_DIR "/bin/zavhost",
                "--home",
                scratch.path("home"),
                "--socket",
                socket,
                "--unguarded",
                "--plugin",
                ZAV_BUILD_DIR "/lib/made_up_plugin.so",
                "--grace",
                "1"};
    }
    std::unique_ptr<Program> start(Environment environment = {}) const {
        environment.emplace_back("NOTIFY_SOCKET", scratch.path("notify"));
        return std::make_unique<Program>(command(), "", environment);
    }
    void work(const std::string& transid, const std::string& milliseconds) const {
        RawClient client(socket);
        const auto answer = client.post(
            "/v1/query",
            R"({"table":"KAGREQT","where":[{"column":"COMMAND","op":"=","value":"WORK"},)"
            R"({"column":"PRODUCT","op":"=","value":")" +
                milliseconds + R"("},{"column":"TRANSID","op":"=","value":")" + transid + "\"}]}");
        EXPECT_EQ(answer.status, 200) << answer.body;
    }

    ScratchDir scratch;
    const std::string home = scratch.makeDir("home");
    const std::string socket = scratch.path("s");
    const NotifySocket manager{scratch.path("notify")};
};

TEST_F(ServiceProgram, SaysWhenItServesAndWhenItEnds) {
    const auto program = start();
    EXPECT_EQ(manager.next(), "READY=1\n");
    RawClient client(socket);
    EXPECT_EQ(client.get("/v1/health").status, 200);
    EXPECT_EQ(manager.await("STATUS="), "STATUS=idle\n");
    program->signal(SIGTERM);
    EXPECT_EQ(manager.await("STOPPING="), "STOPPING=1\n");
    EXPECT_EQ(program->wait().status, 0);
}

TEST_F(ServiceProgram, SaysNothingWhenItDoesNotStart) {
    scratch.write("s", "in the way");
    EXPECT_EQ(start()->wait().status, 1);
    EXPECT_EQ(manager.next(std::chrono::milliseconds(0)), "");
}

TEST_F(ServiceProgram, SaysWhatRunsAndHowManyWait) {
    const auto program = start();
    ASSERT_EQ(manager.await("STATUS="), "STATUS=idle\n");
    work("a", "600000");
    EXPECT_EQ(manager.await("STATUS=1 running"), "STATUS=1 running: WORK 600000\n");
    work("b", "1");
    work("c", "1");
    EXPECT_EQ(manager.await("STATUS=2 queued"), "STATUS=2 queued, 1 running: WORK 600000\n");
}

TEST_F(ServiceProgram, SaysThatItReloadsAndWhenThatIsOver) {
    const auto program = start();
    ASSERT_EQ(manager.next(), "READY=1\n");
    program->signal(SIGHUP);
    EXPECT_NE(manager.await("RELOADING=1\nMONOTONIC_USEC="), "");
    EXPECT_EQ(manager.await("READY="), "READY=1\n");
}

TEST_F(ServiceProgram, FeedsTheWatchdogAgainAndAgain) {
    const auto program = start({{"WATCHDOG_USEC", "20000"}});
    for (int i = 0; i < 5; ++i)
        EXPECT_EQ(manager.await("WATCHDOG="), "WATCHDOG=1\n");
}

TEST_F(ServiceProgram, DoesNotFeedTheWatchdogOfAnotherProcess) {
    const auto program = start({{"WATCHDOG_USEC", "2000"}, {"WATCHDOG_PID", "1"}});
    ASSERT_EQ(manager.next(), "READY=1\n");
    ASSERT_EQ(manager.next(), "STATUS=idle\n");
    program->signal(SIGTERM);
    EXPECT_EQ(manager.next(), "STOPPING=1\n") << "nothing came in between";
}

TEST_F(ServiceProgram, RefusesANotifySocketThatItCannotUse) {
    const ProgramResult result = runProgram(command(), "", {{"NOTIFY_SOCKET", "nowhere"}});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err,
              "zavhost: NOTIFY_SOCKET is set to \"nowhere\", which is neither a path nor an "
              "abstract name\n");
}

class ProgramWithAJournal : public ServiceProgram {
protected:
    /// Starts a program whose standard error, a file, is what the system's journal reads.
    std::unique_ptr<Program> startInto(const std::string& log,
                                       const std::vector<std::string>& more = {}) const {
        std::vector<std::string> argv = {
            "/bin/bash", "-c",
            "log=$1; shift; exec 2>\"$log\"; export JOURNAL_STREAM=$(stat -c %d:%i \"$log\"); exec "
            "\"$@\"",
            "bash", log};
        const std::vector<std::string> host = command();
        argv.insert(argv.end(), host.begin(), host.end());
        argv.insert(argv.end(), more.begin(), more.end());
        return std::make_unique<Program>(argv);
    }
    std::string logged() const { return scratch.read("log"); }
};

TEST_F(ProgramWithAJournal, SaysWithHighPriorityWhyItDoesNotStart) {
    EXPECT_EQ(startInto(scratch.path("log"), {"--grace", "soon"})->wait().status, 1);
    EXPECT_EQ(logged().rfind("<3>", 0), 0U) << logged();
    EXPECT_EQ(logged().find("zavhost: "), std::string::npos) << logged();
}

TEST_F(ProgramWithAJournal, SaysWhenATaskBeginsAndWhenItEndsAndNothingElse) {
    const auto program = startInto(scratch.path("log"));
    ASSERT_TRUE(program->awaitOutput("ready: ", std::chrono::seconds(30)));
    work("a", "600000");
    ASSERT_TRUE(eventually([this] { return logged().find("begins") != std::string::npos; }));
    const std::string line = logged();
    EXPECT_EQ(line.rfind("<6>task ", 0), 0U) << line;
    EXPECT_NE(line.find(" begins: WORK 600000, asked for by "), std::string::npos) << line;
    EXPECT_EQ(line.find('\n'), line.size() - 1) << line;
}

TEST_F(ProgramWithAJournal, TracesIntoAFileOfItsOwn) {
    const auto program = startInto(scratch.path("log"));
    ASSERT_TRUE(program->awaitOutput("ready: ", std::chrono::seconds(30)));
    EXPECT_TRUE(scratch.exists("home/zavhost/trace.log"));
}

TEST_F(ServiceProgram, TracesToStandardErrorWhenSomebodyStartsItByHand) {
    const auto program = start();
    ASSERT_TRUE(program->awaitOutput("ready: ", std::chrono::seconds(30)));
    EXPECT_FALSE(scratch.exists("home/zavhost/trace.log"));
}

TEST_F(ProgramWithAJournal, TellsOfTheLastTaskBeforeItEnds) {
    const auto program = startInto(scratch.path("log"));
    ASSERT_TRUE(program->awaitOutput("ready: ", std::chrono::seconds(30)));
    work("a", "1");
    ASSERT_TRUE(eventually([this] { return scratch.exists("home/ended-a"); }));
    program->signal(SIGTERM);
    EXPECT_EQ(program->wait().status, 0);
    EXPECT_NE(logged().find(" begins: WORK 1, asked for by "), std::string::npos) << logged();
    EXPECT_NE(logged().find(" is done after 0 s: WORK 1\n"), std::string::npos) << logged();
}

/// A listening socket that a child inherits.
class ListeningSocket {
public:
    explicit ListeningSocket(const std::string& path)
        : descriptor_(::socket(AF_UNIX, SOCK_STREAM, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        path.copy(address.sun_path, sizeof address.sun_path - 1);
        EXPECT_EQ(::bind(descriptor_, reinterpret_cast<const sockaddr*>(&address), sizeof address),
                  0);
        EXPECT_EQ(::listen(descriptor_, 16), 0);
    }
    ~ListeningSocket() { ::close(descriptor_); }
    ListeningSocket(const ListeningSocket&) = delete;
    ListeningSocket& operator=(const ListeningSocket&) = delete;
    std::string number() const { return std::to_string(descriptor_); }

private:
    const int descriptor_;
};

class ActivatedProgram : public ServiceProgram {
protected:
    /// Starts the host as a service manager does: the sockets are descriptors 3 and 4.
    std::unique_ptr<Program> activate(const std::string& names = "") const {
        // High numbers first: 3 or 4 may be the number of one of them here.
        std::vector<std::string> argv = {
            "/bin/bash", "-c",
            "exec 20<&" + http.number() + " 21<&" + rpc.number() +
                "; exec 3<&20 4<&21 20<&- 21<&-; export LISTEN_PID=$$; exec \"$0\" \"$@\""};
        const std::vector<std::string> host = command();
        argv.insert(argv.end(), host.begin(), host.end());
        return std::make_unique<Program>(argv, "",
                                         Environment{{"NOTIFY_SOCKET", scratch.path("notify")},
                                                     {"LISTEN_FDS", "2"},
                                                     {"LISTEN_FDNAMES", names}});
    }

    const ListeningSocket http{socket};
    const ListeningSocket rpc{socket + ".rpc"};
};

TEST_F(ActivatedProgram, ServesAClientThatConnectedBeforeItsStart) {
    RawClient early(socket);
    ASSERT_TRUE(early.connected());
    const auto program = activate();
    EXPECT_EQ(early.get("/v1/health").status, 200);
    EXPECT_EQ(RawClient(socket).get("/v1/health").status, 200);
    EXPECT_TRUE(RawClient(socket + ".rpc").connected());
}

TEST_F(ActivatedProgram, LeavesTheSocketsToTheNextOne) {
    struct stat before {};
    ASSERT_EQ(::lstat(socket.c_str(), &before), 0);
    auto program = activate("http:rpc");
    ASSERT_EQ(manager.next(), "READY=1\n");
    program->signal(SIGTERM);
    EXPECT_EQ(program->wait().status, 0);
    RawClient waiting(socket);
    EXPECT_TRUE(waiting.connected()) << "it is not refused in between";
    EXPECT_TRUE(RawClient(socket + ".rpc").connected());
    program = activate("http:rpc");
    EXPECT_EQ(waiting.get("/v1/health").status, 200);
    struct stat after {};
    ASSERT_EQ(::lstat(socket.c_str(), &after), 0);
    EXPECT_EQ(after.st_ino, before.st_ino);
}

TEST_F(ActivatedProgram, RefusesSocketsWithEachOthersNames) {
    const ProgramResult result = activate("rpc:http")->wait();
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "zavhost: the service manager passed the socket " + socket +
                              " as \"rpc\", but here it is \"http\"\n");
}

TEST_F(ActivatedProgram, RefusesASocketThatItHasNoPlaceFor) {
    std::vector<std::string> argv = {
        "/bin/bash", "-c",
        "exec 20<&" + http.number() + "; exec 3<&20 20<&-; LISTEN_PID=$$ exec \"$0\" \"$@\""};
    std::vector<std::string> host = command();
    host[4] = scratch.path("other");
    argv.insert(argv.end(), host.begin(), host.end());
    const ProgramResult result = runProgram(argv, "", {{"LISTEN_FDS", "1"}});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "zavhost: the service manager passed the socket " + socket +
                              ", which is neither --socket nor --rpc-socket\n");
}

TEST_F(ActivatedProgram, RefusesADescriptorThatIsNoListeningSocket) {
    std::vector<std::string> argv = {"/bin/bash", "-c",
                                     "exec 3</dev/null; LISTEN_PID=$$ exec \"$0\" \"$@\""};
    const std::vector<std::string> host = command();
    argv.insert(argv.end(), host.begin(), host.end());
    const ProgramResult result = runProgram(argv, "", {{"LISTEN_FDS", "1"}});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err,
              "zavhost: the service manager passed descriptor 3, which is no listening Unix stream "
              "socket with a path\n");
}

}  // namespace
