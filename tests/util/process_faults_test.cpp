// Commands when the system calls that run them fail. The definitions below replace those of the C
// library and the platform; they fail on request and otherwise call the original.
//
// A function cannot wrap vfork, so children are created with fork here.

#include <dlfcn.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <poll.h>
#include <pthread.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>
#include <set>

#include "platform/fsi1.h"
#include "support/process/child_role.h"
#include "support/process/own_new.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavprocs.h"
#include "util/zavutil.h"

namespace {

/// What fails next. The child inherits a copy.
struct Faults {
    int pipeCall = 0;  // the number of the next call to fail, counting from 1
    bool vfork = false;
    int dup2Onto = -1;
    bool kill = false;
    int mutexError = 0;
    int conditionError = 0;
    const pthread_mutex_t* brokenMutex = nullptr;     // locking and unlocking it fail
    const pthread_cond_t* brokenCondition = nullptr;  // signalling it fails
    bool strdup = false;
    bool pidfd = false;
    int fetchError = 0;
    int deleteError = 0;
    bool interruptions = false;  // every other interruptible call fails with EINTR
    int allocation = 0;          // the number of the next allocation to fail, counting from 1
};
Faults faults;

std::atomic<long long> longestPause{0};  ///< in nanoseconds

thread_local bool interruptedBefore = false;

/// Whether to interrupt this call; never twice in a row.
bool interrupted() {
    if (!faults.interruptions) return false;
    interruptedBefore = !interruptedBefore;
    if (interruptedBefore) errno = EINTR;
    return interruptedBefore;
}

template <typename Function>
Function* next(const char* name) {
    return reinterpret_cast<Function*>(::dlsym(RTLD_NEXT, name));
}

}  // namespace

extern "C" {

int pipe2(int* ends, int flags) noexcept {
    if (faults.pipeCall > 0 && --faults.pipeCall == 0) {
        errno = EMFILE;
        return -1;
    }
    return static_cast<int>(::syscall(SYS_pipe2, ends, flags));
}

long syscall(long number, ...) noexcept {
    if (faults.pidfd && number == SYS_pidfd_open) {
        errno = ENOSYS;
        return -1;
    }
    std::va_list list;
    va_start(list, number);
    long arguments[6];
    for (long& argument : arguments)
        argument = va_arg(list, long);
    va_end(list);
    static auto* const real = next<long(long, ...)>("syscall");
    return real(number, arguments[0], arguments[1], arguments[2], arguments[3], arguments[4],
                arguments[5]);
}

int nanosleep(const timespec* length, timespec* left) {
    const long long pause = length->tv_sec * 1000LL * 1000 * 1000 + length->tv_nsec;
    if (pause > longestPause) longestPause = pause;
    static auto* const real = next<int(const timespec*, timespec*)>("nanosleep");
    return real(length, left);
}

pid_t vfork() noexcept {
    if (faults.vfork) {
        errno = EAGAIN;
        return -1;
    }
    return ::fork();
}

int dup2(int from, int onto) noexcept {
    if (onto == faults.dup2Onto) {
        errno = EBUSY;
        return -1;
    }
    return static_cast<int>(::syscall(SYS_dup2, from, onto));
}

int kill(pid_t pid, int signal) noexcept {
    const int result = static_cast<int>(::syscall(SYS_kill, pid, signal));
    return faults.kill ? -1 : result;
}

int pthread_mutex_init(pthread_mutex_t* mutex, const pthread_mutexattr_t* attributes) noexcept {
    if (faults.mutexError != 0) return faults.mutexError;
    static auto* const real =
        next<int(pthread_mutex_t*, const pthread_mutexattr_t*)>("pthread_mutex_init");
    return real(mutex, attributes);
}

int pthread_cond_init(pthread_cond_t* condition, const pthread_condattr_t* attributes) noexcept {
    if (faults.conditionError != 0) return faults.conditionError;
    static auto* const real =
        next<int(pthread_cond_t*, const pthread_condattr_t*)>("pthread_cond_init");
    return real(condition, attributes);
}

int pthread_mutex_lock(pthread_mutex_t* mutex) noexcept {
    if (mutex == faults.brokenMutex) return EDEADLK;
    static auto* const real = next<int(pthread_mutex_t*)>("pthread_mutex_lock");
    return real(mutex);
}

int pthread_mutex_unlock(pthread_mutex_t* mutex) noexcept {
    if (mutex == faults.brokenMutex) return EPERM;
    static auto* const real = next<int(pthread_mutex_t*)>("pthread_mutex_unlock");
    return real(mutex);
}

int pthread_cond_signal(pthread_cond_t* condition) noexcept {
    if (condition == faults.brokenCondition) return EINVAL;
    static auto* const real = next<int(pthread_cond_t*)>("pthread_cond_signal");
    return real(condition);
}

char* strdup(const char* text) noexcept {
    if (faults.strdup) return nullptr;
    const std::size_t size = std::strlen(text) + 1;
    void* const copy = std::malloc(size);
    return copy != nullptr ? static_cast<char*>(std::memcpy(copy, text, size)) : nullptr;
}

ssize_t read(int fd, void* buffer, std::size_t size) {
    return interrupted() ? -1 : ::syscall(SYS_read, fd, buffer, size);
}

ssize_t write(int fd, const void* buffer, std::size_t size) {
    return interrupted() ? -1 : ::syscall(SYS_write, fd, buffer, size);
}

/// Only closing a pipe may be repeated after an interruption.
int close(int fd) {
    struct stat info {};
    const bool isPipe = faults.interruptions && ::fstat(fd, &info) == 0 && S_ISFIFO(info.st_mode);
    return isPipe && interrupted() ? -1 : static_cast<int>(::syscall(SYS_close, fd));
}

pid_t waitpid(pid_t pid, int* status, int options) {
    return interrupted() ? -1 : static_cast<pid_t>(::syscall(SYS_wait4, pid, status, options, 0));
}

int FSI1_FetchList(FSI1_LIST* list, FSI1_ENTRY* entry) {
    static auto* const real = next<int(FSI1_LIST*, FSI1_ENTRY*)>("FSI1_FetchList");
    const int code = real(list, entry);
    return code == FSI1_END_OF_LIST && faults.fetchError != 0 ? faults.fetchError : code;
}

int FSI1_DeleteList(FSI1_LIST* list) {
    static auto* const real = next<int(FSI1_LIST*)>("FSI1_DeleteList");
    const int code = real(list);
    return faults.deleteError != 0 ? faults.deleteError : code;
}

}  // extern "C"

void* memoryForNew(std::size_t size) noexcept {
    return faults.allocation > 0 && --faults.allocation == 0 ? nullptr : std::malloc(size);
}

using namespace ZAV;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

class Fault : public testing::Test {
protected:
    void SetUp() override { Util::pathExists("/"); }  // opens the locale
    void TearDown() override {
        faults = Faults();
        ::unsetenv("TIMEOUT");
        EXPECT_EQ(child_role::openDescriptors(), descriptors_);
        EXPECT_TRUE(::waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD);
    }

    bool run(const char* command, const String& input = String()) {
        return Util::runCommand(command, rc, out, err, input, false);
    }

    int rc = -99;
    String out = "untouched";
    String err = "untouched";

private:
    std::set<int> descriptors_ = child_role::openDescriptors();
};

}  // namespace

TEST_F(Fault, APipeThatCannotBeMadeFailsTheStart) {
    const char* const texts[] = {"failed to create stdout pipe", "failed to create stderr pipe",
                                 "failed to create stdin pipe"};
    for (int call = 1; call <= 3; ++call) {
        TraceCapture traces;
        faults.pipeCall = call;
        EXPECT_FALSE(run("/bin/true"));
        EXPECT_THAT(traces.errors(),
                    ElementsAre(texts[call - 1], "Failed to start process for cmd /bin/true"));
        EXPECT_EQ(rc, -99);
        EXPECT_EQ(out, "untouched");
        EXPECT_EQ(err, "untouched");
    }
}

TEST_F(Fault, AForkThatFailsFailsTheStart) {
    TraceCapture traces;
    faults.vfork = true;
    EXPECT_FALSE(run("/bin/true"));
    EXPECT_THAT(traces.errors(), ElementsAre("failed to fork child process",
                                             "Failed to start process for cmd /bin/true"));
    EXPECT_EQ(rc, -99);
}

TEST_F(Fault, AChildWithoutItsStreamsEndsWithAStatusOfItsOwn) {
    const char* const texts[] = {"error on dup2 for stdin", "error on dup2 for stdout",
                                 "error on dup2 for stderr"};
    for (int onto = 0; onto < 3; ++onto) {
        TraceCapture traces("ERROR (UNIT:zavprnix ALL)");
        faults.dup2Onto = onto;
        EXPECT_TRUE(run("/bin/echo x"));
        EXPECT_NE(rc, 0);
        EXPECT_NE(rc, -99);
        EXPECT_EQ(out, "");
        EXPECT_THAT(traces.errors("zavprnix"), ElementsAre(texts[onto]));
        EXPECT_EQ(traces.count('D', "Calling execvp"), 0);
    }
}

TEST_F(Fault, MutexAndConditionAreTracedAndDoNotStopTheStart) {
    TraceCapture traces;
    faults.mutexError = 12;
    faults.conditionError = 11;
    EXPECT_TRUE(run("/bin/true"));
    EXPECT_THAT(traces.errors(),
                ElementsAre("Error initializing mutex: 12", "Error initializing condition: 11"));
}

TEST_F(Fault, ArgumentsThatCannotBeCopiedFailTheStart) {
    TraceCapture traces;
    faults.strdup = true;
    EXPECT_FALSE(run("/bin/true"));
    EXPECT_THAT(traces.errors(), ElementsAre("creating argument array",
                                             "Failed to start process for cmd /bin/true"));
}

TEST_F(Fault, AKillThatFailsIsTracedWithItsResult) {
    ::setenv("TIMEOUT", "0", 1);
    TraceCapture traces;
    faults.kill = true;
    EXPECT_FALSE(run("/bin/sleep 60"));
    const auto errors = traces.errors();
    ASSERT_EQ(errors.size(), 4u);
    EXPECT_EQ(errors[2], "Error occurred. ERRNO:-1 Unknown error -1");
    EXPECT_EQ(errors[3], "Failed to wait on process");
}

TEST_F(Fault, WithoutHandlesForProcessesAnEndIsLookedForEveryFewMilliseconds) {
    faults.pidfd = true;
    Process process(String("/bin/sleep 0.2"));
    ASSERT_TRUE(process.start());
    EXPECT_TRUE(process.wait(nullptr));
    EXPECT_GT(longestPause, 0);
    EXPECT_LE(longestPause, 20 * 1000 * 1000);

    ::setenv("TIMEOUT", "1", 1);
    Process hanging(String("/bin/sleep 60"));
    ASSERT_TRUE(hanging.start());
    EXPECT_FALSE(hanging.wait(nullptr));
}

TEST_F(Fault, InterruptionsAreInvisible) {
    faults.interruptions = true;
    const String input(std::string(200 * 1000, 'x').c_str());
    const bool ran = run("/bin/cat", input);
    faults.interruptions = false;
    EXPECT_TRUE(ran);
    EXPECT_EQ(rc, 0);
    EXPECT_EQ(out, input);
}

TEST_F(Fault, ListingsThatFailAreTraced) {
    const ScratchDir scratch;
    scratch.write("a_1", "");
    TraceCapture traces;
    faults.fetchError = 5;
    faults.deleteError = 6;
    pruneLogs(scratch.path().c_str(), "a_", 1);
    EXPECT_THAT(traces.errors(), ElementsAre("FSI1_FetchList error 5", "FSI1_DeleteList error 6"));
    EXPECT_FALSE(scratch.exists("a_1"));
}

TEST_F(Fault, WithoutMemoryNeitherDescriptorsNorChildrenAreLeft) {
    const auto before = child_role::openDescriptors();
    int failures = 0;
    for (bool ranThrough = false; !ranThrough;) {
        rc = -99;
        faults.allocation = failures + 1;
        try {
            // The child writes and then waits for its input to end.
            ranThrough = run("/bin/cat", "some input");
            ranThrough = ranThrough && faults.allocation > 0;
        } catch (const std::bad_alloc&) {
        }
        faults.allocation = 0;
        if (!ranThrough) ++failures;
        ASSERT_EQ(child_role::openDescriptors(), before) << failures;
        ASSERT_TRUE(::waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD) << failures;
    }
    EXPECT_GT(failures, 10);
    EXPECT_EQ(out, "some input");
}

TEST_F(Fault, AWaitingThreadTracesWhatItsLockRefuses) {
    ProcessData data;
    data.pid = ::fork();
    if (data.pid == 0) ::_exit(1);
    TraceCapture traces;
    faults.brokenMutex = &data.mutex;
    faults.brokenCondition = &data.waitCond;
    pthread_t thread;
    ASSERT_EQ(::pthread_create(&thread, nullptr, &ProcTerminateThreadFunc, &data), 0);
    ::pthread_join(thread, nullptr);
    EXPECT_TRUE(data.exited);
    EXPECT_THAT(traces.errors(),
                ElementsAre("pthread_mutex_lock error=" + std::to_string(EDEADLK),
                            "pthread_cond_signal error=" + std::to_string(EINVAL),
                            "pthread_mutex_unlock error=" + std::to_string(EPERM)));
}
