#include "fleet/operator/console/runs/child_program.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/eventfd.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <system_error>
#include <utility>

#include "ctl/client/whole_file.h"

namespace fleet {
namespace {

constexpr int kGivenDescriptor = 3;
constexpr std::size_t kPieceBytes = std::size_t{64} * 1024;
constexpr int kSignalBase = 128;

[[noreturn]] void failWith(int error, const char* what) {
    throw std::system_error(error, std::generic_category(), what);
}

/// The descriptor, which must be one.
sys::FileDescriptor insisted(int descriptor, const char* what) {
    if (descriptor < 0) failWith(errno, what);
    return sys::FileDescriptor(descriptor);
}

/// A file in memory that holds the text and is read from its beginning.
sys::FileDescriptor fileWith(const std::string& text) {
    sys::FileDescriptor file =
        insisted(::memfd_create("input", MFD_CLOEXEC), "cannot keep what a program is to read");
    if (!ctl::writeDescriptor(file.get(), text) || ::lseek(file.get(), 0, SEEK_SET) != 0) {
        failWith(errno, "cannot keep what a program is to read");
    }
    return file;
}

struct Pipe {
    sys::FileDescriptor readEnd;  ///< does not block
    sys::FileDescriptor writeEnd;
};

Pipe makePipe() {
    int ends[2] = {-1, -1};
    if (::pipe2(ends, O_CLOEXEC) != 0) failWith(errno, "cannot make a pipe");
    Pipe pipe{sys::FileDescriptor(ends[0]), sys::FileDescriptor(ends[1])};
    if (::fcntl(ends[0], F_SETFL, O_NONBLOCK) != 0) failWith(errno, "cannot make a pipe");
    return pipe;
}

/// What the process has open, and nothing else.
class OpenedFiles {
public:
    OpenedFiles() { ::posix_spawn_file_actions_init(&actions_); }
    ~OpenedFiles() { ::posix_spawn_file_actions_destroy(&actions_); }
    OpenedFiles(const OpenedFiles&) = delete;
    OpenedFiles& operator=(const OpenedFiles&) = delete;

    /// In the order of the numbers: each may be that of a descriptor given before.
    void add(const sys::FileDescriptor& file) {
        check(::posix_spawn_file_actions_adddup2(&actions_, file.get(), count_++));
    }
    const posix_spawn_file_actions_t* closingOthers() {
        check(::posix_spawn_file_actions_addclosefrom_np(&actions_, count_));
        return &actions_;
    }

private:
    static void check(int error) {
        if (error != 0) failWith(error, "cannot start a program");
    }

    posix_spawn_file_actions_t actions_{};
    int count_ = 0;
};

/// A group of its own, and signals as a program expects them.
class FreshProcess {
public:
    FreshProcess() {
        ::posix_spawnattr_init(&attributes_);
        sigset_t none;
        sigset_t all;
        sigemptyset(&none);
        sigfillset(&all);
        ::posix_spawnattr_setsigmask(&attributes_, &none);
        ::posix_spawnattr_setsigdefault(&attributes_, &all);
        ::posix_spawnattr_setpgroup(&attributes_, 0);
        ::posix_spawnattr_setflags(
            &attributes_, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETPGROUP);
    }
    ~FreshProcess() { ::posix_spawnattr_destroy(&attributes_); }
    FreshProcess(const FreshProcess&) = delete;
    FreshProcess& operator=(const FreshProcess&) = delete;

    const posix_spawnattr_t* get() const { return &attributes_; }

private:
    posix_spawnattr_t attributes_{};
};

pid_t spawn(const ChildCommand& command, const sys::FileDescriptor& out,
            const sys::FileDescriptor& err) {
    const sys::FileDescriptor input = fileWith(command.input);
    const sys::FileDescriptor list = fileWith(command.list);
    static_assert(kGivenDescriptor == STDERR_FILENO + 1, "what is given comes behind the streams");
    OpenedFiles files;
    files.add(input);
    files.add(out);
    files.add(err);
    if (command.file != nullptr)
        files.add(*command.file);
    else if (!command.list.empty())
        files.add(list);
    std::vector<std::string> words = command.words;
    std::vector<char*> argv;
    for (std::string& word : words)
        argv.push_back(word.data());
    argv.push_back(nullptr);
    const FreshProcess process;
    pid_t pid = -1;
    const int error = ::posix_spawn(&pid, command.program.c_str(), files.closingOthers(),
                                    process.get(), argv.data(), environ);
    if (error != 0) failWith(error, "cannot start a program");
    return pid;
}

/// Takes all that is there. Returns false at the end.
bool takeOutput(const sys::FileDescriptor& pipe, std::string& text, std::size_t most) {
    std::string piece(kPieceBytes, '\0');
    while (text.size() <= most) {
        const ssize_t length = ::read(pipe.get(), piece.data(), piece.size());
        if (length > 0) {
            text.append(piece, 0, static_cast<std::size_t>(length));
        } else if (length == 0 || errno != EINTR) {
            return length != 0 && errno == EAGAIN;
        }
    }
    return true;
}

int millisecondsUntil(std::chrono::steady_clock::time_point deadline) {
    const auto left =
        std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
    return static_cast<int>(std::clamp<std::int64_t>(left.count(), 0, 1'000'000));
}

}  // namespace

ChildProgram::ChildProgram(const ChildCommand& command)
    : stop_(insisted(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK), "cannot start a program")) {
    Pipe out = makePipe();
    Pipe err = makePipe();
    pid_ = spawn(command, out.writeEnd, err.writeEnd);
    out_ = std::move(out.readEnd);
    err_ = std::move(err.readEnd);
    process_ = sys::FileDescriptor(static_cast<int>(::syscall(SYS_pidfd_open, pid_, 0)));
    if (!process_) {
        const int error = errno;
        reap();  // the destructor is not called
        failWith(error, "cannot watch a program");
    }
}

ChildProgram::~ChildProgram() {
    if (pid_ != -1) reap();
}

ChildEnd ChildProgram::wait(std::chrono::milliseconds limit, std::size_t mostBytes) {
    ChildEnd end;
    end.kind = follow(end, std::chrono::steady_clock::now() + limit, mostBytes);
    end.status = reap();
    return end;
}

void ChildProgram::stop() {
    const std::uint64_t one = 1;
    // It fails only when it has been called very often.
    (void)!::write(stop_.get(), &one, sizeof one);
}

ChildEnd::Kind ChildProgram::follow(ChildEnd& end, Time deadline, std::size_t mostBytes) {
    pollfd watched[] = {{stop_.get(), POLLIN, 0},
                        {process_.get(), POLLIN, 0},
                        {out_.get(), POLLIN, 0},
                        {err_.get(), POLLIN, 0}};
    while (true) {
        const int ready = ::poll(watched, std::size(watched), millisecondsUntil(deadline));
        if (ready < 0 && errno != EINTR) failWith(errno, "cannot follow a program");
        if (ready == 0) return ChildEnd::Kind::TooLate;
        if (ready < 0) continue;
        if (watched[0].revents != 0) return ChildEnd::Kind::Stopped;
        // What it wrote before its end is there when the end is seen.
        const bool hasEnded = watched[1].revents != 0;
        if (!takeOutput(out_, end.out, mostBytes)) watched[2].fd = -1;
        if (!takeOutput(err_, end.err, mostBytes)) watched[3].fd = -1;
        if (end.out.size() + end.err.size() > mostBytes) return ChildEnd::Kind::TooMuch;
        if (hasEnded) return ChildEnd::Kind::Ended;
    }
}

/// Ends what is left of the group, while its number cannot be anybody else's yet.
int ChildProgram::reap() {
    ::kill(-pid_, SIGKILL);
    int status = 0;
    while (::waitpid(pid_, &status, 0) < 0 && errno == EINTR) {
    }
    pid_ = -1;
    return WIFSIGNALED(status) ? kSignalBase + WTERMSIG(status) : WEXITSTATUS(status);
}

}  // namespace fleet
