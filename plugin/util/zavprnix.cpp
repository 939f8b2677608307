// Starts a command's process and waits for it.

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

#include "base/zavtrace.h"
#include "platform/bss1.h"
#include "util/error_text.h"
#include "util/process/child_end.h"
#include "util/process/launch.h"
#include "util/zavprocs.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavprnix"};

constexpr int kDefaultTimeout = 300;  // seconds
constexpr int kLongestPause = 1000;   // milliseconds between two checks of a child
constexpr int kReapingTime = 5;       // seconds that a killed child may take to end

int exitStatusOf(int status) {
    return (status >> 8) & 0xff;
}

/// Owns the argument list that MakeArgv returns.
class ArgumentList {
public:
    explicit ArgumentList(const String& command) : count_(MakeArgv(&command, &arguments_)) {}
    ~ArgumentList() {
        if (arguments_ == nullptr) return;
        for (char** at = arguments_; *at != nullptr; ++at)
            std::free(*at);
        std::free(arguments_);
    }
    ArgumentList(const ArgumentList&) = delete;
    ArgumentList& operator=(const ArgumentList&) = delete;

    int count() const { return count_; }
    char* const* get() const { return arguments_; }

private:
    char** arguments_ = nullptr;
    int count_;
};

char* narrowOrNull(const String& text, const CharStar& narrow) {
    return text.length() != 0 ? static_cast<char*>(narrow) : nullptr;
}

}  // namespace

Process::Process(const String& command) : Process(command, nullptr) {}

Process::Process(const String& command, const char** env)
    : Process(command, env, String(), String()) {}

Process::Process(const String& command, const char** env, String user, String group) {
    Trace trace(traceUnit);
    createStreams();
    init(command, env, user, group);
}

Process::~Process() {
    Trace trace(traceUnit);
    if (hasChild()) reapLater(processData_->pid);
}

void Process::DestroyedData::operator()(ProcessData* data) const {
    ::pthread_cond_destroy(&data->waitCond);
    ::pthread_mutex_destroy(&data->mutex);
    delete data;
}

void Process::createStreams() {
    Trace trace(traceUnit);
    stdOut_ = std::make_unique<ProcessInputStream>();
    stdErr_ = std::make_unique<ProcessInputStream>();
    stdIn_ = std::make_unique<ProcessOutputStream>();
}

void Process::init(const String& command, const char** env, const String& user,
                   const String& group) {
    Trace trace(traceUnit);
    command_ = command;
    for (; env != nullptr && *env != nullptr; ++env)
        env_.emplace_back(*env);
    const CharStar userName = user.c_str();
    const CharStar groupName = group.c_str();
    userToken_.reset(
        create_user_token(narrowOrNull(user, userName), narrowOrNull(group, groupName), nullptr));
    const char* const setting = BSS1_GetEnv("TIMEOUT", nullptr);
    if (setting == nullptr) {
        timeout_ = kDefaultTimeout;
    } else if (!String::convertToInt(String(setting), &timeout_)) {
        timeout_ = 0;
    }
    trace().detail("Set timeout to %d seconds", timeout_);
}

bool Process::start() {
    Trace trace(traceUnit);
    reapForgotten();
    processData_.reset(new ProcessData);
    const int mutexError = ::pthread_mutex_init(&processData_->mutex, nullptr);
    if (mutexError != 0) trace().error("Error initializing mutex: %d", mutexError);
    const int conditionError = ::pthread_cond_init(&processData_->waitCond, nullptr);
    if (conditionError != 0) trace().error("Error initializing condition: %d", conditionError);

    ChildPipes pipes;
    if (!createPipes(pipes.out, pipes.err, pipes.in)) return trace.exit(false);
    if (!launch(pipes)) return trace.exit(false);
    stdOut_->attach(std::move(pipes.out.readEnd));
    stdErr_->attach(std::move(pipes.err.readEnd));
    stdIn_->attach(std::move(pipes.in.writeEnd));
    return trace.exit(true);
}

bool Process::launch(ChildPipes& pipes) {
    Trace trace(traceUnit);
    const ArgumentList arguments(command_);
    if (arguments.count() < 1) {
        trace().error("creating argument array");
        return trace.exit(false);
    }
    const char* const program = arguments.get()[0];
    if (::access(program, X_OK) != 0) {
        trace().error("Unable to execute command: %s", program);
        return trace.exit(false);
    }
    runDeadline_ = Deadline::in(timeout_);
    return trace.exit(forkAndExecute(arguments.get(), env_, *processData_, pipes));
}

bool Process::wait(int* exitCode) {
    Trace trace(traceUnit);
    return trace.exit(waitUntil(Deadline::in(timeout_), exitCode));
}

bool Process::waitUntil(const Deadline& deadline, int* exitCode) {
    Trace trace(traceUnit);
    const int pid = processData_ != nullptr ? processData_->pid : 0;
    trace().detail("Waiting for process id: %d", pid);
    int status = 0;
    pid_t ended = -1;
    errno = ECHILD;
    if (hasChild()) {
        ChildWatch watch(pid);
        while ((ended = pollChild(pid, status)) == 0 && !deadline.passed()) {
            watch.pause(deadline.millisecondsLeft(kLongestPause));
        }
        reaped_ = ended != 0;
    }
    if (ended == -1) trace().error("Error occurred. ERRNO:%d %s", errno, errorText(errno));
    if (ended == 0) {
        terminate(trace, exitCode);
        return trace.exit(false);
    }
    if (exitCode != nullptr) *exitCode = exitStatusOf(status);
    return trace.exit(true);
}

bool Process::giveUp(int* exitCode) {
    Trace trace(traceUnit);
    trace().detail("Waiting for process id: %d", processData_->pid);
    terminate(trace, exitCode);
    return trace.exit(false);
}

void Process::terminate(const Trace& trace, int* exitCode) {
    const int pid = processData_->pid;
    trace().error("Terminating process group %d", -pid);
    ::kill(-pid, SIGKILL);
    trace().error("Terminating process %d", pid);
    const int killed = ::kill(pid, SIGKILL);
    if (killed != 0) trace().error("Error occurred. ERRNO:%d %s", killed, errorText(killed));
    reapKilled();
    // Reported for a child that had not ended by then.
    if (exitCode != nullptr) *exitCode = 0;
}

void Process::killUnlessEnded() noexcept {
    if (!hasChild()) return;
    ::kill(processData_->pid, SIGKILL);
    reapKilled();
}

void Process::reapKilled() noexcept {
    // Even a killed child can hang in the kernel, for instance on a dead file server.
    const Deadline deadline = Deadline::in(kReapingTime);
    const pid_t pid = processData_->pid;
    ChildWatch watch(pid);
    int status = 0;
    while (pollChild(pid, status) == 0) {
        if (deadline.passed()) {
            reapLater(pid);
            break;
        }
        watch.pause(deadline.millisecondsLeft(kLongestPause));
    }
    reaped_ = true;
}

void* ProcTerminateThreadFunc(void* processData) {
    Trace trace(traceUnit);
    auto& data = *static_cast<ProcessData*>(processData);
    trace().detail("Waiting for process id: %d", data.pid);
    int status = 0;
    pid_t ended;
    do {
        ended = ::waitpid(data.pid, &status, 0);
    } while (ended == -1 && errno == EINTR);
    trace().detail("waitpid returned rc=%d,waitstat=%d", ended, status);
    trace().detail("WEXITSTATUS(waitstat)=%d,WIFEXITED(waitstat)=%d", exitStatusOf(status),
                   WIFEXITED(status) ? 1 : 0);

    const int lockError = ::pthread_mutex_lock(&data.mutex);
    if (lockError != 0) trace().error("pthread_mutex_lock error=%d", lockError);
    data.exitStatus = exitStatusOf(status);
    data.exited = true;
    trace().detail("Signaling pd->wait_cond");
    const int signalError = ::pthread_cond_signal(&data.waitCond);
    if (signalError != 0) trace().error("pthread_cond_signal error=%d", signalError);
    const int unlockError = ::pthread_mutex_unlock(&data.mutex);
    if (unlockError != 0) trace().error("pthread_mutex_unlock error=%d", unlockError);
    trace().detail("Exiting function with pthread_exit(NULL)");
    ::pthread_exit(nullptr);
}

}  // namespace ZAV
