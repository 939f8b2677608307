#include "faults/fault_injection.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <poll.h>
#include <pthread.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <sys/uio.h>
#include <sys/utsname.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>

// The sanitizers own the allocator.
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
#include "support/process/own_new.h"
#endif

using faults::Call;

// Where the program's own text begins and ends.
extern "C" const char __executable_start;
extern "C" const char etext;

namespace {

constexpr const char* kNames[] = {
    "access",  "calloc",     "chmod",  "close",  "dup2",    "execve", "fclose", "fchmod",
    "fcntl",   "fdopen",     "fread",  "fstat",  "fwrite",  "kill",   "link",   "linkat",
    "lseek",   "lstat",      "malloc", "mkdir",  "mkdirat", "new",    "open",   "openat",
    "openat2", "pidfd_open", "pipe2",  "poll",   "read",    "uname",  "unlink", "unlinkat",
    "vfork",   "waitpid",    "write",  "writev",
};
static_assert(sizeof kNames / sizeof *kNames == static_cast<std::size_t>(Call::kCount));

constexpr int kNone = -1;

/// Shared with children, whether they share the rest of the memory or not.
struct State {
    std::atomic<int> call{kNone};
    std::atomic<int> callsLeft{0};  // before the one that fails
    std::atomic<int> error{0};
    std::atomic<bool> onwards{false};
    std::atomic<int> failed{0};
    std::atomic<bool> interrupting{false};
    std::atomic<int> interruptions{0};
    std::atomic<long> dateStep{0};
    std::atomic<int> looks{0};
};

State* makeState() {
    void* const page =
        ::mmap(nullptr, sizeof(State), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    return page == MAP_FAILED ? nullptr : new (page) State;
}

// Calls before this is set up, by other set-ups, pass through.
State* const state = makeState();

thread_local bool interruptedBefore = false;

bool isOurs(const void* caller) {
    const auto* const at = static_cast<const char*>(caller);
    return at >= &__executable_start && at < &etext;
}

/// Whether this call is the one to fail; errno is set then.
bool fails(Call call, const void* caller) {
    if (state == nullptr || state->call != static_cast<int>(call)) return false;
    if (call != Call::kNew && !isOurs(caller)) return false;
    const int left = state->callsLeft--;
    if (left > 0 || (left < 0 && !state->onwards)) return false;
    ++state->failed;
    errno = state->error;
    return true;
}

/// Never twice in a row.
bool interrupted(const void* caller) {
    if (state == nullptr || !state->interrupting || !isOurs(caller)) return false;
    interruptedBefore = !interruptedBefore;
    if (!interruptedBefore) return false;
    ++state->interruptions;
    errno = EINTR;
    return true;
}

bool failsOrInterrupted(Call call, const void* caller) {
    return fails(call, caller) || interrupted(caller);
}

template <typename Function>
Function* next(const char* name) {
    return reinterpret_cast<Function*>(::dlsym(RTLD_NEXT, name));
}

/// With 64-bit file offsets on a 32-bit machine these calls have other names.
template <typename Function>
Function* nextOf(const char* name, const char* name64) {
    return next<Function>(sizeof(long) == 4 ? name64 : name);
}

/// What the date is moved by at this look, in seconds.
long dateOffset() {
    const long step = state != nullptr ? state->dateStep.load() : 0;
    if (step == 0) return 0;
    const int look = ++state->looks;
    return look % 2 == 0 ? step * look : -step * look;
}

}  // namespace

namespace faults {

const char* nameOf(Call call) {
    return kNames[static_cast<std::size_t>(call)];
}

Fault::Fault(Call call, int nth, int error, Lasts lasts) {
    state->callsLeft = nth - 1;
    state->error = error;
    state->onwards = lasts == Lasts::kOnwards;
    state->failed = 0;
    state->call = static_cast<int>(call);
}

Fault::~Fault() {
    state->call = kNone;
}

bool Fault::happened() const {
    return state->failed > 0;
}

Interruptions::Interruptions() {
    state->interruptions = 0;
    state->interrupting = true;
}

Interruptions::~Interruptions() {
    state->interrupting = false;
}

int Interruptions::count() const {
    return state->interruptions;
}

JumpingDate::JumpingDate(long step) {
    state->looks = 0;
    state->dateStep = step;
}

JumpingDate::~JumpingDate() {
    state->dateStep = 0;
}

int JumpingDate::looks() const {
    return state->looks;
}

}  // namespace faults

#define CALLER __builtin_return_address(0)

extern "C" {

int access(const char* path, int mode) noexcept {
    if (fails(Call::kAccess, CALLER)) return -1;
    static auto* const real = next<int(const char*, int)>("access");
    return real(path, mode);
}

int chmod(const char* path, mode_t mode) noexcept {
    if (fails(Call::kChmod, CALLER)) return -1;
    static auto* const real = next<int(const char*, mode_t)>("chmod");
    return real(path, mode);
}

int close(int fd) {
    const bool toFail = fails(Call::kClose, CALLER);
    const int error = errno;
    const int closed = static_cast<int>(::syscall(SYS_close, fd));
    if (!toFail) return closed;
    errno = error;
    return -1;
}

int dup2(int from, int onto) noexcept {
    if (fails(Call::kDup2, CALLER)) return -1;
    return static_cast<int>(::syscall(SYS_dup2, from, onto));
}

int execve(const char* path, char* const* arguments, char* const* environment) noexcept {
    if (fails(Call::kExecve, CALLER)) return -1;
    return static_cast<int>(::syscall(SYS_execve, path, arguments, environment));
}

int fclose(std::FILE* stream) {
    const bool toFail = fails(Call::kFclose, CALLER);
    const int error = errno;
    static auto* const real = next<int(std::FILE*)>("fclose");
    const int closed = real(stream);
    if (!toFail) return closed;
    errno = error;
    return EOF;
}

int fchmod(int fd, mode_t mode) noexcept {
    if (fails(Call::kFchmod, CALLER)) return -1;
    return static_cast<int>(::syscall(SYS_fchmod, fd, mode));
}

int fcntl(int fd, int command, ...) {
    std::va_list list;
    va_start(list, command);
    void* const argument = va_arg(list, void*);
    va_end(list);
    if (fails(Call::kFcntl, CALLER)) return -1;
    static auto* const real = nextOf<int(int, int, ...)>("fcntl", "fcntl64");
    return real(fd, command, argument);
}

std::FILE* fdopen(int fd, const char* mode) noexcept {
    if (fails(Call::kFdopen, CALLER)) return nullptr;
    static auto* const real = next<std::FILE*(int, const char*)>("fdopen");
    return real(fd, mode);
}

std::size_t fread(void* buffer, std::size_t size, std::size_t count, std::FILE* stream) {
    if (fails(Call::kFread, CALLER)) return 0;
    static auto* const real =
        next<std::size_t(void*, std::size_t, std::size_t, std::FILE*)>("fread");
    return real(buffer, size, count, stream);
}

int fstat(int fd, struct stat* found) noexcept {
    if (fails(Call::kFstat, CALLER)) return -1;
    static auto* const real = nextOf<int(int, struct stat*)>("fstat", "fstat64");
    return real(fd, found);
}

std::size_t fwrite(const void* data, std::size_t size, std::size_t count, std::FILE* stream) {
    if (fails(Call::kFwrite, CALLER)) return 0;
    static auto* const real =
        next<std::size_t(const void*, std::size_t, std::size_t, std::FILE*)>("fwrite");
    return real(data, size, count, stream);
}

int kill(pid_t pid, int signal) noexcept {
    if (fails(Call::kKill, CALLER)) return -1;
    return static_cast<int>(::syscall(SYS_kill, pid, signal));
}

int link(const char* from, const char* to) noexcept {
    if (fails(Call::kLink, CALLER)) return -1;
    static auto* const real = next<int(const char*, const char*)>("link");
    return real(from, to);
}

int linkat(int above, const char* from, int directory, const char* to, int flags) noexcept {
    if (fails(Call::kLinkat, CALLER)) return -1;
    return static_cast<int>(::syscall(SYS_linkat, above, from, directory, to, flags));
}

off_t lseek(int fd, off_t offset, int whence) noexcept {
    if (fails(Call::kLseek, CALLER)) return -1;
    static auto* const real = nextOf<off_t(int, off_t, int)>("lseek", "lseek64");
    return real(fd, offset, whence);
}

int lstat(const char* path, struct stat* found) noexcept {
    if (fails(Call::kLstat, CALLER)) return -1;
    static auto* const real = nextOf<int(const char*, struct stat*)>("lstat", "lstat64");
    return real(path, found);
}

int mkdir(const char* path, mode_t mode) noexcept {
    if (fails(Call::kMkdir, CALLER)) return -1;
    static auto* const real = next<int(const char*, mode_t)>("mkdir");
    return real(path, mode);
}

int mkdirat(int directory, const char* name, mode_t mode) noexcept {
    if (fails(Call::kMkdirat, CALLER)) return -1;
    return static_cast<int>(::syscall(SYS_mkdirat, directory, name, mode));
}

int open(const char* path, int flags, ...) {
    std::va_list list;
    va_start(list, flags);
    const mode_t mode = va_arg(list, mode_t);
    va_end(list);
    if (failsOrInterrupted(Call::kOpen, CALLER)) return -1;
    static auto* const real = nextOf<int(const char*, int, ...)>("open", "open64");
    return real(path, flags, mode);
}

int openat(int directory, const char* name, int flags, ...) {
    std::va_list list;
    va_start(list, flags);
    const mode_t mode = va_arg(list, mode_t);
    va_end(list);
    if (failsOrInterrupted(Call::kOpenat, CALLER)) return -1;
    static auto* const real = nextOf<int(int, const char*, int, ...)>("openat", "openat64");
    return real(directory, name, flags, mode);
}

int pipe2(int* ends, int flags) noexcept {
    if (fails(Call::kPipe2, CALLER)) return -1;
    return static_cast<int>(::syscall(SYS_pipe2, ends, flags));
}

int poll(pollfd* descriptors, nfds_t count, int milliseconds) {
    if (failsOrInterrupted(Call::kPoll, CALLER)) return -1;
    static auto* const real = next<int(pollfd*, nfds_t, int)>("poll");
    return real(descriptors, count, milliseconds);
}

ssize_t read(int fd, void* buffer, std::size_t size) {
    if (failsOrInterrupted(Call::kRead, CALLER)) return -1;
    return ::syscall(SYS_read, fd, buffer, size);
}

long syscall(long number, ...) noexcept {
    if (number == SYS_pidfd_open && fails(Call::kPidfdOpen, CALLER)) return -1;
    if (number == SYS_openat2 && failsOrInterrupted(Call::kOpenat2, CALLER)) return -1;
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

int uname(utsname* names) noexcept {
    if (fails(Call::kUname, CALLER)) return -1;
    static auto* const real = next<int(utsname*)>("uname");
    return real(names);
}

int unlink(const char* path) noexcept {
    if (fails(Call::kUnlink, CALLER)) return -1;
    static auto* const real = next<int(const char*)>("unlink");
    return real(path);
}

int unlinkat(int directory, const char* name, int flags) noexcept {
    if (fails(Call::kUnlinkat, CALLER)) return -1;
    return static_cast<int>(::syscall(SYS_unlinkat, directory, name, flags));
}

pid_t waitpid(pid_t pid, int* status, int options) {
    if (failsOrInterrupted(Call::kWaitpid, CALLER)) return -1;
    return static_cast<pid_t>(::syscall(SYS_wait4, pid, status, options, nullptr));
}

ssize_t write(int fd, const void* data, std::size_t size) {
    if (failsOrInterrupted(Call::kWrite, CALLER)) return -1;
    return ::syscall(SYS_write, fd, data, size);
}

ssize_t writev(int fd, const iovec* pieces, int count) {
    if (failsOrInterrupted(Call::kWritev, CALLER)) return -1;
    return ::syscall(SYS_writev, fd, pieces, count);
}

int clock_gettime(clockid_t clock, timespec* now) noexcept {
    static auto* const real = next<int(clockid_t, timespec*)>("clock_gettime");
    const int result = real(clock, now);
    if (clock == CLOCK_REALTIME) now->tv_sec += dateOffset();
    return result;
}

std::time_t time(std::time_t* result) noexcept {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    if (result != nullptr) *result = now.tv_sec;
    return now.tv_sec;
}

int gettimeofday(timeval* __restrict result, void* __restrict) noexcept {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    result->tv_sec = now.tv_sec;
    result->tv_usec = now.tv_nsec / 1000;
    return 0;
}

/// For the definition below.
[[gnu::used]] int zavTestVforkFails() {
    return fails(Call::kVfork, &__executable_start) ? 1 : 0;
}

}  // extern "C"

// vfork returns twice on the same stack, so that no function can call it for its caller.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
// The sanitizers follow a fork and would lose track here.
extern "C" pid_t vfork() noexcept {
    return zavTestVforkFails() != 0 ? -1 : ::fork();
}
#elif defined(__x86_64__)
asm(R"(
    .text
    .globl vfork
    .type vfork, @function
vfork:
    subq $8, %rsp
    call zavTestVforkFails
    addq $8, %rsp
    testl %eax, %eax
    jnz 1f
    popq %rdi
    movl $58, %eax
    syscall
    pushq %rdi
    ret
1:  movl $-1, %eax
    ret
    .size vfork, .-vfork
)");
#else
asm(R"(
    .text
    .globl vfork
    .type vfork, @function
vfork:
    subl $12, %esp
    call zavTestVforkFails
    addl $12, %esp
    testl %eax, %eax
    jnz 1f
    popl %ecx
    movl $190, %eax
    int $0x80
    pushl %ecx
    ret
1:  movl $-1, %eax
    ret
    .size vfork, .-vfork
)");
#endif

#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
extern "C" {

void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);

void* malloc(std::size_t size) noexcept {
    return fails(Call::kMalloc, CALLER) ? nullptr : __libc_malloc(size);
}

void* calloc(std::size_t count, std::size_t size) noexcept {
    return fails(Call::kCalloc, CALLER) ? nullptr : __libc_calloc(count, size);
}

/// Asks for memory as the library's own call would.
char* strdup(const char* text) noexcept {
    const std::size_t size = std::strlen(text) + 1;
    void* const copy = fails(Call::kMalloc, CALLER) ? nullptr : __libc_malloc(size);
    return copy != nullptr ? static_cast<char*>(std::memcpy(copy, text, size)) : nullptr;
}

}  // extern "C"

void* memoryForNew(std::size_t size) noexcept {
    return fails(Call::kNew, nullptr) ? nullptr : __libc_malloc(size);
}
#endif
