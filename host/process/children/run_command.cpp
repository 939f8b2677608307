#include "host/process/children/run_command.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <system_error>

#include "host/process/children/pidfd.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

using Clock = std::chrono::steady_clock;
using End = CommandResult::End;

/// How often the child is looked at where the kernel has no descriptors of processes.
constexpr int kPollStep = 20;
/// The longest wait at a time; the deadline may be further off.
constexpr long kLongestPoll = 60'000;

struct Pipe {
    sys::FileDescriptor readEnd;
    sys::FileDescriptor writeEnd;
};

/// No other child of the host inherits it. The reading end never blocks.
Pipe makePipe() {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) throw std::system_error(errno, std::generic_category());
    Pipe made{sys::FileDescriptor(ends[0]), sys::FileDescriptor(ends[1])};
    ::fcntl(ends[0], F_SETFL, O_NONBLOCK);
    return made;
}

class FileActions {
public:
    FileActions() { ::posix_spawn_file_actions_init(&actions_); }
    ~FileActions() { ::posix_spawn_file_actions_destroy(&actions_); }
    FileActions(const FileActions&) = delete;
    FileActions& operator=(const FileActions&) = delete;

    void connect(const Pipe& out, const Pipe& err) {
        ::posix_spawn_file_actions_addopen(&actions_, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        ::posix_spawn_file_actions_adddup2(&actions_, out.writeEnd.get(), STDOUT_FILENO);
        ::posix_spawn_file_actions_adddup2(&actions_, err.writeEnd.get(), STDERR_FILENO);
    }
    const posix_spawn_file_actions_t* get() const { return &actions_; }

private:
    posix_spawn_file_actions_t actions_;
};

/// A process group of its own, and no signal blocked: worker threads block some.
class Attributes {
public:
    Attributes() {
        ::posix_spawnattr_init(&attributes_);
        sigset_t none;
        sigemptyset(&none);
        ::posix_spawnattr_setsigmask(&attributes_, &none);
        ::posix_spawnattr_setpgroup(&attributes_, 0);
        ::posix_spawnattr_setflags(&attributes_, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETPGROUP);
    }
    ~Attributes() { ::posix_spawnattr_destroy(&attributes_); }
    Attributes(const Attributes&) = delete;
    Attributes& operator=(const Attributes&) = delete;

    const posix_spawnattr_t* get() const { return &attributes_; }

private:
    posix_spawnattr_t attributes_;
};

/// Starts the program; returns 0 or an errno value.
int spawn(const std::vector<std::string>& argv, const Pipe& out, const Pipe& err, pid_t& pid) {
    std::vector<char*> arguments;
    for (const std::string& argument : argv)
        arguments.push_back(const_cast<char*>(argument.c_str()));  // NOLINT: nobody writes to it
    arguments.push_back(nullptr);
    FileActions actions;
    actions.connect(out, err);
    const Attributes attributes;
    return ::posix_spawn(&pid, arguments[0], actions.get(), attributes.get(), arguments.data(),
                         environ);
}

/// A program that has been started. It is killed, unless it has ended, and reaped.
class Child {
public:
    explicit Child(pid_t pid) : pid_(pid), handle_(openPidfd(pid)) {}
    ~Child() {
        if (!reaped_) kill();
    }
    Child(const Child&) = delete;
    Child& operator=(const Child&) = delete;

    /// Readable once the child has ended; -1 where the kernel has no such descriptor.
    int handle() const { return handle_.get(); }

    /// Whether it has ended. Leaves it as it is, so that its group keeps its id.
    bool ended() const {
        siginfo_t info{};
        return ::waitid(P_PID, static_cast<id_t>(pid_), &info, WEXITED | WNOWAIT | WNOHANG) == 0 &&
               info.si_pid == pid_;
    }

    /// Kills its group. It is not reaped yet, so the group's id is still its own.
    void kill() {
        ::kill(-pid_, SIGKILL);
        reap();
    }

    /// Waits for its end; returns the status that waitpid gives.
    int reap() {
        int status = 0;
        while (::waitpid(pid_, &status, 0) == -1 && errno == EINTR) {
        }
        reaped_ = true;
        return status;
    }

private:
    const pid_t pid_;
    const sys::FileDescriptor handle_;
    bool reaped_ = false;
};

/// One of the child's outputs.
class Output {
public:
    Output(sys::FileDescriptor end, std::string& text, std::size_t limit)
        : end_(std::move(end)), text_(text), limit_(limit) {}

    /// -1 once it has ended: poll ignores that.
    int descriptor() const { return end_.get(); }

    /// Reads what is there. False when it is more than it may be.
    bool read() {
        char piece[16 * 1024];
        while (end_) {
            const ssize_t got = ::read(end_.get(), piece, sizeof piece);
            if (got < 0 && errno == EINTR) continue;
            if (got < 0 && errno == EAGAIN) return true;
            if (got <= 0) {
                end_.reset();
                return true;
            }
            const auto count = static_cast<std::size_t>(got);
            text_.append(piece, std::min(count, limit_ - text_.size()));
            if (text_.size() == limit_) return false;
        }
        return true;
    }

private:
    sys::FileDescriptor end_;
    std::string& text_;
    const std::size_t limit_;
};

int millisecondsTo(Clock::time_point deadline) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
    return static_cast<int>(std::clamp<long long>(left, 0, kLongestPoll));
}

/// Reads until the child has ended, its time is over or it wrote too much.
End listen(const Child& child, Output& out, Output& err, Clock::time_point deadline) {
    while (true) {
        const bool ended = child.ended();
        // Whatever it wrote is there by now; others that hold the outputs are not waited for.
        if (!out.read() || !err.read()) return End::TooLong;
        if (ended) return End::Exited;
        const int left = millisecondsTo(deadline);
        if (left == 0) return End::TimedOut;
        pollfd ready[] = {{out.descriptor(), POLLIN, 0},
                          {err.descriptor(), POLLIN, 0},
                          {child.handle(), POLLIN, 0}};
        ::poll(ready, std::size(ready), child.handle() < 0 ? std::min(left, kPollStep) : left);
    }
}

}  // namespace

CommandResult runCommand(const std::vector<std::string>& argv, const CommandLimits& limits) {
    const Clock::time_point deadline = Clock::now() + limits.time;
    CommandResult result;
    pid_t pid = -1;
    Pipe outPipe;
    Pipe errPipe;
    try {
        outPipe = makePipe();
        errPipe = makePipe();
        result.number = spawn(argv, outPipe, errPipe, pid);
    } catch (const std::system_error& error) {
        result.number = error.code().value();
    }
    if (result.number != 0) return result;
    Child child(pid);
    outPipe.writeEnd.reset();
    errPipe.writeEnd.reset();
    Output out(std::move(outPipe.readEnd), result.out, limits.output);
    Output err(std::move(errPipe.readEnd), result.err, limits.output);
    result.end = listen(child, out, err, deadline);
    if (result.end != End::Exited) {
        child.kill();
        return result;
    }
    const int status = child.reap();
    if (WIFSIGNALED(status)) result.end = End::Signalled;
    result.number = WIFSIGNALED(status) ? WTERMSIG(status) : WEXITSTATUS(status);
    return result;
}

std::string endInWords(const CommandResult& result) {
    switch (result.end) {
        case End::Exited:
            return "ended with exit code " + std::to_string(result.number);
        case End::Signalled:
            return "was killed by signal " + std::to_string(result.number);
        case End::TimedOut:
            return "did not end in time";
        case End::TooLong:
            return "wrote too much";
        case End::NotStarted:
            break;
    }
    return std::string("could not be started: ") + std::strerror(result.number);
}

}  // namespace host
