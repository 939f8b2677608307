// A command's process: starting it, its environment, and waiting for it.

#include <fcntl.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <set>
#include <sstream>

#include "support/clock.h"
#include "support/host/program.h"
#include "support/process/child_role.h"
#include "support/process/left_running.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavprocs.h"
#include "util/zavutil.h"

using namespace ZAV;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

std::string readAll(ProcessInputStream* stream) {
    std::string text;
    char buffer[4096];
    for (int got; (got = stream->read(buffer, sizeof buffer)) > 0;) {
        text.append(buffer, static_cast<std::size_t>(got));
    }
    return text;
}

/// Starts the command, reads its standard output to the end and waits for it.
std::string outputOf(Process& process) {
    EXPECT_TRUE(process.start());
    process.getStdIn()->close();
    const std::string text = readAll(process.getStdOut());
    EXPECT_TRUE(process.wait(nullptr));
    return text;
}

std::string outputOf(const std::string& command) {
    Process process(String(command.c_str()));
    return outputOf(process);
}

std::string outputOf(const std::string& command, std::vector<const char*> env) {
    env.push_back(nullptr);
    Process process(String(command.c_str()), env.data());
    return outputOf(process);
}

std::string roleOutput(const std::string& role) {
    const std::string entry = child_role::environmentEntry(role);
    return outputOf(child_role::program(), {entry.c_str()});
}

std::vector<int> numbersIn(const std::string& text) {
    std::istringstream in(text);
    return {std::istream_iterator<int>(in), std::istream_iterator<int>()};
}

/// Waits until a child has ended; it stays to be waited for.
void awaitEndOfSomeChild() {
    siginfo_t ended{};
    EXPECT_EQ(::waitid(P_ALL, 0, &ended, WEXITED | WNOWAIT), 0);
}

class TimeoutSetting {
public:
    explicit TimeoutSetting(const char* value) { ::setenv("TIMEOUT", value, 1); }
    ~TimeoutSetting() { ::unsetenv("TIMEOUT"); }
};

bool noChildIsLeft() {
    return ::waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD;
}

std::string timeoutTraced(const char* value) {
    if (value != nullptr) ::setenv("TIMEOUT", value, 1);
    TraceCapture traces;
    const Process process(String("/bin/true"));
    ::unsetenv("TIMEOUT");
    return traces.details("zavprnix").at(0);
}

}  // namespace

TEST(ProcessTimeout, ComesFromTheEnvironment) {
    EXPECT_EQ(timeoutTraced(nullptr), "Set timeout to 300 seconds");
    EXPECT_EQ(timeoutTraced("5"), "Set timeout to 5 seconds");
    EXPECT_EQ(timeoutTraced("abc"), "Set timeout to 0 seconds");
    EXPECT_EQ(timeoutTraced(""), "Set timeout to 0 seconds");
    EXPECT_EQ(timeoutTraced("99999999999"), "Set timeout to 0 seconds");
    EXPECT_EQ(timeoutTraced("-7"), "Set timeout to -7 seconds");
}

TEST(Process, ConnectsTheStandardStreams) {
    Process process(String("/bin/sh -c 'read line; echo out $line; echo err $line >&2; exit 7'"));
    ASSERT_TRUE(process.start());
    EXPECT_TRUE(process.getStdIn()->write("text\n", 5));
    EXPECT_TRUE(process.getStdIn()->close());
    EXPECT_EQ(readAll(process.getStdOut()), "out text\n");
    EXPECT_EQ(readAll(process.getStdErr()), "err text\n");
    int exitCode = -1;
    EXPECT_TRUE(process.wait(&exitCode));
    EXPECT_EQ(exitCode, 7);
    EXPECT_FALSE(process.running());
    EXPECT_TRUE(noChildIsLeft());
}

TEST(Process, TracesItsWayInOrder) {
    TraceCapture traces;
    Process process(String("/bin/true"));
    ASSERT_TRUE(process.start());
    int exitCode = -1;
    EXPECT_TRUE(process.wait(&exitCode));
    const auto details = traces.details("zavprnix");
    ASSERT_EQ(details.size(), 4u);
    EXPECT_EQ(details[0], "Set timeout to 300 seconds");
    const std::string start = "Entering child process to launch command. PID: ";
    ASSERT_EQ(details[1].substr(0, start.size()), start);
    EXPECT_EQ(details[2], "Calling execvp");
    EXPECT_EQ(details[3], "Waiting for process id: " + details[1].substr(start.size()));
    EXPECT_NE(details[1].substr(start.size()), std::to_string(::getpid()));
    EXPECT_THAT(traces.errors(), IsEmpty());
}

TEST(Process, AFirstWordThatCannotBeExecutedIsRefused) {
    TraceCapture traces;
    const ScratchDir scratch;
    const auto before = child_role::openDescriptors();
    const std::string plain = scratch.write("plain", "text");
    for (const std::string& command : {std::string("/no/such/program a b"), plain, std::string()}) {
        Process process(String(command.c_str()));
        EXPECT_FALSE(process.start());
    }
    EXPECT_THAT(traces.errors(),
                ElementsAre("Unable to execute command: /no/such/program",
                            "Unable to execute command: " + plain, "Unable to execute command: "));
    EXPECT_EQ(child_role::openDescriptors(), before);
    EXPECT_TRUE(noChildIsLeft());
}

TEST(Process, ANameIsNotLookedForInThePathBeforeItIsTested) {
    Process process(String("true"));
    EXPECT_FALSE(process.start());
}

TEST(Process, AChildThatCannotExecuteEndsWithStatusZero) {
    TraceCapture traces;
    const ScratchDir scratch;
    const std::string badInterpreter = scratch.write("script", "#!/no/such/interpreter\n", 0755);
    for (const std::string& command : {scratch.path(), badInterpreter}) {
        traces.clear();
        Process process(String(command.c_str()));
        ASSERT_TRUE(process.start());
        int exitCode = -1;
        EXPECT_TRUE(process.wait(&exitCode));
        EXPECT_EQ(exitCode, 0);
        EXPECT_THAT(traces.errors(), ElementsAre("Unable to launch the executable, rc=-1"));
    }
}

TEST(Process, AScriptWithoutAnInterpreterLineRuns) {
    const ScratchDir scratch;
    const std::string script = scratch.write("script", "echo \"$0\" \"$1\" \"$2\"\n", 0755);
    EXPECT_EQ(outputOf(script + " a 'b c'"), script + " a b c\n");
}

TEST(Process, ANameWithoutSlashIsExecutedFromTheChildsOwnPath) {
    const ScratchDir scratch;
    scratch.script("bin/here", "echo from the path\n");
    scratch.script("here", "echo from the directory\n");
    const std::string path = "PATH=/no/such/directory:" + scratch.path("bin");
    char* const before = ::get_current_dir_name();
    ASSERT_EQ(::chdir(scratch.path().c_str()), 0);
    EXPECT_EQ(outputOf("here", {path.c_str()}), "from the path\n");
    EXPECT_EQ(outputOf("here", {"PATH=/no/such/directory:"}), "from the directory\n");
    ASSERT_EQ(::chdir(before), 0);
    std::free(before);
}

TEST(ProcessEnvironment, EntriesReplaceAndAdd) {
    ::setenv("ZAV_TEST_KEPT", "kept", 1);
    ::setenv("ZAV_TEST_REPLACED", "old", 1);
    ::setenv("ZAV_TEST_REMOVED", "there", 1);
    EXPECT_EQ(outputOf("/bin/sh -c 'echo $ZAV_TEST_KEPT $ZAV_TEST_REPLACED "
                       "${ZAV_TEST_REMOVED--} $ZAV_TEST_ADDED'",
                       {"ZAV_TEST_REPLACED=first", "ZAV_TEST_REPLACED=new", "ZAV_TEST_REMOVED",
                        "ZAV_TEST_ADDED=added=x", ""}),
              "kept new - added=x\n");
    EXPECT_STREQ(std::getenv("ZAV_TEST_REPLACED"), "old");
    EXPECT_STREQ(std::getenv("ZAV_TEST_REMOVED"), "there");
    EXPECT_EQ(std::getenv("ZAV_TEST_ADDED"), nullptr);
}

TEST(ProcessEnvironment, TheCallersListMayGoAfterConstruction) {
    std::string entry = "ZAV_TEST_COPIED=value";
    const char* env[] = {entry.c_str(), nullptr};
    Process process(String("/bin/sh -c 'echo $ZAV_TEST_COPIED'"), env);
    entry = "ZAV_TEST_COPIED=other";
    env[0] = nullptr;
    EXPECT_EQ(outputOf(process), "value\n");
}

TEST(ProcessTracing, AChildTracesIntoALogOfItsOwn) {
    const ScratchDir home;
    Util::_homeDir.clear();
    for (int i = 0; i < 10; ++i)
        home.write("logs/zavproc_ras1_" + std::to_string(i) + ".log", "");
    ::setenv("TOVRINHOME", home.path().c_str(), 1);
    ::setenv("KBB_RAS1", "ERROR", 1);
    TraceCapture traces;
    const std::string log = outputOf("/bin/sh -c 'echo $KBB_RAS1_LOG'");
    ::unsetenv("KBB_RAS1");
    ::unsetenv("TOVRINHOME");
    const std::string beginning = home.path() + "/logs/zavproc_ras1_";
    EXPECT_EQ(log.substr(0, beginning.size()), beginning);
    const std::string path = log.substr(0, log.size() - 1);
    EXPECT_EQ(traces.count('D', "Sending child process RAS1 tracing to " + path), 1);
    int kept = 0;
    for (int i = 0; i < 10; ++i) {
        kept += home.exists("logs/zavproc_ras1_" + std::to_string(i) + ".log") ? 1 : 0;
    }
    EXPECT_EQ(kept, 9);
    const long stamp = std::atol(path.c_str() + beginning.size());
    EXPECT_NEAR(static_cast<double>(::time(nullptr)), static_cast<double>(stamp), 5.0);
}

TEST(ProcessTracing, WithoutAHomeTheChildsLogIsSwitchedOff) {
    Util::_homeDir.clear();
    ::setenv("KBB_RAS1", "ERROR", 1);
    ::setenv("KBB_RAS1_LOG", "/somewhere", 1);
    TraceCapture traces;
    EXPECT_EQ(outputOf("/bin/sh -c 'echo [${KBB_RAS1_LOG-unset}]'"), "[]\n");
    ::unsetenv("KBB_RAS1");
    EXPECT_EQ(traces.count('E', "Disabling RAS1 for child process"), 1);
    EXPECT_EQ(outputOf("/bin/sh -c 'echo [${KBB_RAS1_LOG-unset}]'"), "[/somewhere]\n");
    ::setenv("KBB_RAS1", "", 1);
    EXPECT_EQ(outputOf("/bin/sh -c 'echo [${KBB_RAS1_LOG-unset}]'"), "[/somewhere]\n");
    ::unsetenv("KBB_RAS1");
    ::unsetenv("KBB_RAS1_LOG");
}

TEST(ProcessDescriptors, AChildHoldsItsStandardStreamsOnly) {
    Process other(String("/bin/sleep 30"));
    ASSERT_TRUE(other.start());
    std::set<int> expected = child_role::openDescriptors(true);
    expected.insert({0, 1, 2});
    const std::vector<int> found = numbersIn(roleOutput("descriptors"));
    EXPECT_EQ(std::set<int>(found.begin(), found.end()), expected);
    other.killUnlessEnded();
}

TEST(ProcessDescriptors, ARunLeavesNoneBehind) {
    const auto before = child_role::openDescriptors();
    for (int i = 0; i < 20; ++i)
        outputOf("/bin/true");
    EXPECT_EQ(child_role::openDescriptors(), before);
    EXPECT_TRUE(noChildIsLeft());
}

TEST(ProcessDescriptors, TheHostsOwnStandardStreamsMayBeClosed) {
    std::string heard;
    std::string complained;
    int exitCode = -1;
    std::vector<int> saved;
    for (int fd = 0; fd < 3; ++fd)
        saved.push_back(::fcntl(fd, F_DUPFD_CLOEXEC, 100));
    for (int fd = 0; fd < 3; ++fd)
        ::close(fd);
    {
        Process process(String("/bin/sh -c 'cat; echo complaint >&2; exit 4'"));
        if (process.start()) {
            process.getStdIn()->write("spoken", 6);
            process.getStdIn()->close();
            heard = readAll(process.getStdOut());
            complained = readAll(process.getStdErr());
            process.wait(&exitCode);
        }
    }
    std::vector<bool> stayedClosed;
    for (int fd = 0; fd < 3; ++fd)
        stayedClosed.push_back(::fcntl(fd, F_GETFD) == -1);
    for (int fd = 0; fd < 3; ++fd) {
        ::dup2(saved[static_cast<std::size_t>(fd)], fd);
        ::close(saved[static_cast<std::size_t>(fd)]);
    }
    EXPECT_EQ(heard, "spoken");
    EXPECT_EQ(complained, "complaint\n");
    EXPECT_EQ(exitCode, 4);
    EXPECT_THAT(stayedClosed, ElementsAre(true, true, true));
}

TEST(ProcessDescriptors, MoreThanAThousandMayBeOpen) {
    rlimit before{};
    ::getrlimit(RLIMIT_NOFILE, &before);
    rlimit wanted = before;
    wanted.rlim_cur = std::min<rlim_t>(4096, before.rlim_max);
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &wanted), 0);
    std::vector<FileDescriptor> open;
    for (int i = 0; i < 1100; ++i)
        open.push_back(openFile("/proc/self/exe", O_RDONLY));
    ASSERT_GT(open.back().get(), 1024);
    EXPECT_EQ(outputOf("/bin/echo there"), "there\n");
    open.clear();
    ::setrlimit(RLIMIT_NOFILE, &before);
}

TEST(ProcessSignals, AChildStartsWithDefaultDispositionsAndAnEmptyMask) {
    const auto handler = [](int) {};
    const auto oldPipe = ::signal(SIGPIPE, SIG_IGN);
    const auto oldInt = ::signal(SIGINT, SIG_IGN);
    const auto oldUsr = ::signal(SIGUSR1, handler);
    sigset_t blocked;
    ::sigemptyset(&blocked);
    ::sigaddset(&blocked, SIGTERM);
    ::sigaddset(&blocked, SIGUSR2);
    sigset_t before;
    ::pthread_sigmask(SIG_BLOCK, &blocked, &before);

    EXPECT_EQ(roleOutput("signals"), "");

    sigset_t after;
    ::pthread_sigmask(SIG_SETMASK, &before, &after);
    EXPECT_EQ(::sigismember(&after, SIGTERM), 1);
    EXPECT_EQ(::sigismember(&after, SIGINT), 0);
    EXPECT_EQ(::signal(SIGPIPE, oldPipe), SIG_IGN);
    EXPECT_EQ(::signal(SIGINT, oldInt), SIG_IGN);
    EXPECT_EQ(::signal(SIGUSR1, oldUsr), +handler);
}

TEST(ProcessWait, KillsAChildThatRunsPastTheTimeout) {
    const TimeoutSetting timeout("1");
    Process process(String("/bin/sleep 60"));
    ASSERT_TRUE(process.start());
    TraceCapture traces;
    const Stopwatch watch;
    int exitCode = -1;
    EXPECT_FALSE(process.wait(&exitCode));
    EXPECT_GT(watch.seconds(), 0.9);
    EXPECT_EQ(exitCode, 0);
    const std::string waiting = "Waiting for process id: ";
    const std::string pid = traces.details("zavprnix").at(0).substr(waiting.size());
    EXPECT_THAT(traces.errors(),
                ElementsAre("Terminating process group -" + pid, "Terminating process " + pid));
    EXPECT_TRUE(noChildIsLeft());
}

TEST(ProcessWait, WithoutTimeTheFirstLookDecides) {
    const TimeoutSetting timeout("0");
    Process running(String("/bin/sleep 60"));
    ASSERT_TRUE(running.start());
    EXPECT_FALSE(running.wait(nullptr));

    Process ended(String("/bin/sh -c 'exit 3'"));
    ASSERT_TRUE(ended.start());
    readAll(ended.getStdOut());
    readAll(ended.getStdErr());
    awaitEndOfSomeChild();
    int exitCode = -1;
    EXPECT_TRUE(ended.wait(&exitCode));
    EXPECT_EQ(exitCode, 3);
}

TEST(ProcessWait, AChildThatLeadsAGroupTakesItAlong) {
    const TimeoutSetting timeout("1");
    const ScratchDir scratch;
    const std::string file = scratch.path("pid");
    // A child that leads no process group becomes the leader of its own by setsid.
    const std::string command =
        "/usr/bin/setsid /bin/sh -c 'sleep 60 & echo $! >" + file + "; wait'";
    Process process(String(command.c_str()));
    ASSERT_TRUE(process.start());
    ASSERT_TRUE(eventually([&] { return scratch.read("pid").find('\n') != std::string::npos; }));
    const pid_t grandchild = std::atoi(scratch.read("pid").c_str());
    ASSERT_GT(grandchild, 0);
    EXPECT_FALSE(process.wait(nullptr));
    const std::string stat = "/proc/" + std::to_string(grandchild) + "/stat";
    EXPECT_TRUE(eventually([&] {
        std::ifstream in(stat);
        std::string text;
        std::getline(in, text);
        return text.empty() || text.find(") Z ") != std::string::npos;
    }));
}

TEST(ProcessWait, AKilledChildHasNoExitStatus) {
    Process process(String("/bin/sh -c 'kill -9 $$'"));
    ASSERT_TRUE(process.start());
    int exitCode = -1;
    EXPECT_TRUE(process.wait(&exitCode));
    EXPECT_EQ(exitCode, 0);
}

TEST(ProcessWait, AHostThatReapsByItselfDoesNotHang) {
    const auto before = ::signal(SIGCHLD, SIG_IGN);
    TraceCapture traces;
    Process process(String("/bin/sleep 0.1"));
    ASSERT_TRUE(process.start());
    int exitCode = -1;
    EXPECT_TRUE(process.wait(&exitCode));
    EXPECT_EQ(exitCode, 0);
    EXPECT_THAT(traces.errors(), ElementsAre("Error occurred. ERRNO:10 No child processes"));
    ::signal(SIGCHLD, before);
}

TEST(ProcessWait, ASecondWaitFindsNoChild) {
    Process process(String("/bin/true"));
    ASSERT_TRUE(process.start());
    EXPECT_TRUE(process.wait(nullptr));
    TraceCapture traces;
    EXPECT_TRUE(process.wait(nullptr));
    EXPECT_THAT(traces.errors(), ElementsAre("Error occurred. ERRNO:10 No child processes"));
}

TEST(ProcessWait, LeavesOtherChildrenAlone) {
    const pid_t other = ::fork();
    if (other == 0) ::_exit(9);
    outputOf("/bin/true");
    int status = 0;
    EXPECT_EQ(::waitpid(other, &status, 0), other);
    EXPECT_EQ(WEXITSTATUS(status), 9);
}

TEST(ProcessDestruction, NeitherEndsTheChildNorWaitsForIt) {
    const ScratchDir scratch;
    const std::string command =
        scratch.script("slow", untilReleased(scratch.path("release")) + "echo done >" +
                                   scratch.path("result") + "\n");
    {
        Process process(String(command.c_str()));
        ASSERT_TRUE(process.start());
    }
    EXPECT_FALSE(scratch.exists("result"));
    scratch.write("release", "");
    EXPECT_TRUE(eventually([&] { return scratch.read("result") == "done\n"; }));
}

TEST(ProcessDestruction, AChildThatNobodyWaitedForIsReapedLater) {
    {
        Process process(String("/bin/true"));
        ASSERT_TRUE(process.start());
    }
    awaitEndOfSomeChild();
    outputOf("/bin/true");
    EXPECT_TRUE(noChildIsLeft());
}

TEST(ProcTerminateThread, StoresTheStatusAndSignals) {
    ProcessData data;
    ASSERT_EQ(::pthread_mutex_init(&data.mutex, nullptr), 0);
    ASSERT_EQ(::pthread_cond_init(&data.waitCond, nullptr), 0);
    data.pid = ::fork();
    if (data.pid == 0) ::_exit(6);

    TraceCapture traces;
    pthread_t thread;
    ASSERT_EQ(::pthread_create(&thread, nullptr, &ProcTerminateThreadFunc, &data), 0);
    ::pthread_mutex_lock(&data.mutex);
    while (!data.exited)
        ::pthread_cond_wait(&data.waitCond, &data.mutex);
    EXPECT_EQ(data.exitStatus, 6);
    ::pthread_mutex_unlock(&data.mutex);
    ::pthread_join(thread, nullptr);

    const std::string pid = std::to_string(data.pid);
    EXPECT_THAT(traces.details("zavprnix"),
                ElementsAre("Waiting for process id: " + pid,
                            "waitpid returned rc=" + pid + ",waitstat=1536",
                            "WEXITSTATUS(waitstat)=6,WIFEXITED(waitstat)=1",
                            "Signaling pd->wait_cond", "Exiting function with pthread_exit(NULL)"));
    ::pthread_cond_destroy(&data.waitCond);
    ::pthread_mutex_destroy(&data.mutex);
}
