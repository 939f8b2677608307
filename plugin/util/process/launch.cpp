#include "util/process/launch.h"

#include <pthread.h>
#include <signal.h>
#include <unistd.h>

#include <cstdlib>
#include <ctime>

#include "base/zavtrace.h"
#include "platform/bss1.h"
#include "util/process/child_environment.h"
#include "util/process/exec_plan.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavprnix"};

constexpr int kLogsKept = 10;
constexpr const char* kLogPrefix = "zavproc_ras1";

/// Everything that the child needs, so that it neither allocates nor looks anything up. The child
/// runs in its parent's memory while the parent's thread is suspended.
struct ChildPlan {
    const Trace& trace;
    ExecPlan& exec;
    const ChildPipes& pipes;
};

void traceInChild(const ChildPlan& plan, unsigned level, const char* text,
                  int line = __builtin_LINE()) {
    const bool wanted = level == RAS1_ERROR ? plan.trace.erroneous() : plan.trace.detailed();
    if (wanted) RAS1_Printf(&plan.trace.block(), level, line, "%s", text);
}

void traceEntryOfChild(const ChildPlan& plan) {
    char text[80] = "Entering child process to launch command. PID: ";
    char digits[16];
    int count = 0;
    for (pid_t rest = ::getpid(); rest > 0; rest /= 10) {
        digits[count++] = static_cast<char>('0' + rest % 10);
    }
    char* at = text;
    while (*at != '\0')
        ++at;
    while (count > 0)
        *at++ = digits[--count];
    traceInChild(plan, RAS1_DETAIL, text);
}

/// The child shares its parent's memory, so the parent's signal handlers must not run in it. And
/// the command must not inherit signals that the parent ignores or blocks.
void resetSignals() {
    struct sigaction byDefault {};
    byDefault.sa_handler = SIG_DFL;
    for (int signal = 1; signal < NSIG; ++signal)
        ::sigaction(signal, &byDefault, nullptr);
    sigset_t none;
    ::sigemptyset(&none);
    ::pthread_sigmask(SIG_SETMASK, &none, nullptr);
}

void connect(const ChildPlan& plan, const FileDescriptor& end, int standard, const char* failure) {
    if (::dup2(end.get(), standard) != -1) return;
    traceInChild(plan, RAS1_ERROR, failure);
    ::_exit(EXIT_FAILURE);
}

[[noreturn]] void runChild(const ChildPlan& plan) {
    traceEntryOfChild(plan);
    ::close(plan.pipes.out.readEnd.get());
    ::close(plan.pipes.err.readEnd.get());
    ::close(plan.pipes.in.writeEnd.get());
    connect(plan, plan.pipes.out.writeEnd, STDOUT_FILENO, "error on dup2 for stdout");
    connect(plan, plan.pipes.err.writeEnd, STDERR_FILENO, "error on dup2 for stderr");
    connect(plan, plan.pipes.in.readEnd, STDIN_FILENO, "error on dup2 for stdin");
    traceInChild(plan, RAS1_DETAIL, "Calling execvp");
    resetSignals();
    plan.exec.execute();
    traceInChild(plan, RAS1_ERROR, "Unable to launch the executable, rc=-1");
    ::_exit(EXIT_SUCCESS);
}

/// While it exists, the calling thread takes no signal and cannot be cancelled: between fork and
/// exec either would happen in the child, on the memory that it shares.
class Undisturbed {
public:
    Undisturbed() {
        sigset_t all;
        ::sigfillset(&all);
        ::pthread_sigmask(SIG_SETMASK, &all, &signalsBefore_);
        ::pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &cancelBefore_);
    }
    ~Undisturbed() {
        ::pthread_setcancelstate(cancelBefore_, nullptr);
        ::pthread_sigmask(SIG_SETMASK, &signalsBefore_, nullptr);
    }
    Undisturbed(const Undisturbed&) = delete;
    Undisturbed& operator=(const Undisturbed&) = delete;

private:
    sigset_t signalsBefore_;
    int cancelBefore_ = 0;
};

/// A function of its own, and nothing in its frame changes after vfork, because the child runs on
/// the same stack before the parent continues.
[[gnu::noinline]] pid_t forkOnSharedMemory(const ChildPlan& plan) {
    const pid_t pid = ::vfork();
    if (pid == 0) runChild(plan);
    return pid;
}

/// The setting that tells the child where to trace; empty when KBB_RAS1 is not set.
std::string traceSetting(const Trace& trace) {
    const char* const selection = BSS1_GetEnv("KBB_RAS1", nullptr);
    if (selection == nullptr || *selection == '\0') return {};
    String home;
    if (!Util::getTovrinHomeDir(home)) {
        trace().error("Disabling RAS1 for child process");
        return "KBB_RAS1_LOG=";
    }
    const std::string directory = std::string(static_cast<const char*>(home.c_str())) + "logs";
    pruneLogs(directory.c_str(), kLogPrefix, kLogsKept);
    const std::string path =
        directory + "/" + kLogPrefix + "_" + std::to_string(std::time(nullptr)) + ".log";
    trace().detail("Sending child process RAS1 tracing to %s", path);
    return "KBB_RAS1_LOG=" + path;
}

}  // namespace

bool forkAndExecute(char* const* argv, const std::vector<std::string>& env, ProcessData& data,
                    ChildPipes& pipes) {
    Trace trace(traceUnit);
    const std::string setting = traceSetting(trace);
    ChildEnvironment environment(environ);
    environment.put(setting.c_str());
    for (const std::string& entry : env)
        environment.put(entry.c_str());
    ExecPlan exec(argv, environment.find("PATH"), environment.list());
    {
        const Undisturbed undisturbed;
        data.pid = forkOnSharedMemory({trace, exec, pipes});
    }
    if (data.pid < 0) {
        trace().error("failed to fork child process");
        return trace.exit(false);
    }
    closePipeEnd(pipes.out.writeEnd);
    closePipeEnd(pipes.err.writeEnd);
    closePipeEnd(pipes.in.readEnd);
    return trace.exit(true);
}

}  // namespace ZAV
