/// Child processes: one external command with pipes on its standard streams, and what goes with it.
///
/// Failures are reported by results and trace lines. A Process and its streams belong to one thread
/// at a time; any number of threads may have one each. No signal handler, signal mask or variable
/// of the environment of the calling process is changed, and no child but the Process's own is
/// waited for.
#pragma once

#include <pthread.h>
#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "base/file_descriptor.h"
#include "base/zavstr.h"
#include "util/deadline.h"

namespace ZAV {

struct ChildPipes;
class Trace;

/// Bytes that come in.
class InputStream {
public:
    InputStream() = default;
    virtual ~InputStream() = default;
    InputStream(const InputStream&) = delete;
    InputStream& operator=(const InputStream&) = delete;

    /// One byte, 0 to 255; -1 when there is none.
    virtual int read() = 0;
    /// Up to `len` bytes: their number, 0 at the end, -1 on failure with errno set.
    virtual int read(void* buf, int len) = 0;
    virtual bool close() = 0;
};

/// Bytes that go out.
class OutputStream {
public:
    OutputStream() = default;
    virtual ~OutputStream() = default;
    OutputStream(const OutputStream&) = delete;
    OutputStream& operator=(const OutputStream&) = delete;

    /// Writes all of `len` bytes; false when that failed on the way.
    virtual bool write(const char* buf, int len) = 0;
    virtual bool close() = 0;
};

/// The read end of a pipe. Calls that a signal interrupts are repeated.
class ProcessInputStream : public InputStream {
public:
    /// Takes the descriptor over; one that was open before is closed.
    void attach(FileDescriptor fd) { fd_ = std::move(fd); }
    /// The descriptor to poll, or -1.
    int descriptor() const { return fd_.get(); }

    int read() override;
    /// In non-blocking mode -1 with EAGAIN when nothing is there.
    int read(void* buf, int len) override;
    /// Switches O_NONBLOCK; 0, or -1 with errno set.
    int setNonBlocking(bool on);
    bool isNonBlocking() const { return nonBlocking_; }
    /// False when the descriptor was not open.
    bool close() override;

private:
    FileDescriptor fd_;
    bool nonBlocking_ = false;
};

/// The write end of a pipe. Calls that a signal interrupts are repeated; a reader that is gone
/// makes a write fail with EPIPE and never raises SIGPIPE in the calling process.
class ProcessOutputStream : public OutputStream {
public:
    /// Takes the descriptor over; one that was open before is closed.
    void attach(FileDescriptor fd) { fd_ = std::move(fd); }
    int descriptor() const { return fd_.get(); }

    bool write(const char* buf, int len) override;
    /// One write: the number of bytes taken, or -1 with errno set (EAGAIN in non-blocking mode).
    ssize_t writeSome(const char* buf, std::size_t len);
    int setNonBlocking(bool on);
    bool close() override;

private:
    FileDescriptor fd_;
};

/// One started child.
struct ProcessData {
    int pid = 0;
    int exitStatus = 0;
    /// Guards exitStatus and exited where a thread waits for the child.
    pthread_mutex_t mutex = PTHREAD_MUTEX_INITIALIZER;
    /// Signalled by that thread once `exited` is set. Initialised twice: what pthread_cond_init has
    /// failed on must still be fit to be destroyed.
    pthread_cond_t waitCond = PTHREAD_COND_INITIALIZER;
    bool exited = false;
};

/// A user and a group. Allocated with malloc.
struct user_s_t {
    std::uint32_t uid;
    std::uint32_t gid;
};

/// One external command. Started at most once:
///
///     Process process("/bin/ls -l");
///     if (process.start()) {
///         ... process.getStdOut()->read(buffer, sizeof buffer) ...
///         bool inTime = process.wait(&exitCode);
///     }
///
/// The destructor closes what is open of the pipes and neither ends the child nor waits for it; a
/// child that nobody waited for is reaped when it has ended and the next one is started.
class Process {
public:
    /// The command line is split as MakeArgv does. `env` is a list of "NAME=value" texts that ends
    /// in a null pointer, or null; it is copied. User and group are looked up and kept only: the
    /// child runs as the caller does. The time-out is TIMEOUT's value in seconds (0 when it is not
    /// a number), or 300 when that variable is not set.
    explicit Process(const String& command);
    Process(const String& command, const char** env);
    Process(const String& command, const char** env, String user, String group);
    virtual ~Process();
    Process(const Process&) = delete;
    Process& operator=(const Process&) = delete;

    /// The streams on the child's standard output, error and input; owned by the Process.
    ProcessInputStream* getStdOut() const { return stdOut_.get(); }
    ProcessInputStream* getStdErr() const { return stdErr_.get(); }
    ProcessOutputStream* getStdIn() const { return stdIn_.get(); }

    /// Makes the pipes and the child. The first word of the command must be the path of an
    /// executable. True when there is a child, also when it cannot execute the command: it ends
    /// with status 0 then.
    bool start();

    /// Waits until the child has ended, but no longer than the time-out from now: then the child is
    /// killed. True when it ended in time. `*exitCode`, unless null, is its exit status, 0 when it
    /// was killed. A child that has ended is noticed at once.
    bool wait(int* exitCode);
    /// The same with a deadline of the caller's.
    bool waitUntil(const Deadline& deadline, int* exitCode);
    /// Does what wait does with a child whose time is over, its trace lines included, without
    /// looking at the child once more. False.
    bool giveUp(int* exitCode);

    /// When the time-out is over, counted from start().
    const Deadline& runDeadline() const { return runDeadline_; }
    /// Kills and reaps a child that nobody has waited for; nothing is traced.
    void killUnlessEnded() noexcept;

    /// Always false.
    bool running() const { return false; }

private:
    struct Freed {
        void operator()(void* block) const { std::free(block); }
    };
    struct DestroyedData {
        void operator()(ProcessData* data) const;
    };

    void createStreams();
    void init(const String& command, const char** env, const String& user, const String& group);
    bool launch(ChildPipes& pipes);
    bool hasChild() const { return processData_ != nullptr && processData_->pid > 0 && !reaped_; }
    void terminate(const Trace& trace, int* exitCode);
    void reapKilled() noexcept;

    std::unique_ptr<ProcessInputStream> stdOut_;
    std::unique_ptr<ProcessInputStream> stdErr_;
    std::unique_ptr<ProcessOutputStream> stdIn_;
    String command_;
    std::unique_ptr<ProcessData, DestroyedData> processData_;  // null until start()
    std::vector<std::string> env_;
    std::unique_ptr<user_s_t, Freed> userToken_;
    int timeout_ = 0;  // seconds
    Deadline runDeadline_ = Deadline::in(0);
    bool reaped_ = false;
};

/// The ids of a user and a group by their names; null stands for the caller's own. A user that does
/// not exist gets the id of "nobody", or 65533; a group that does not exist gets the primary group
/// of the user's entry (nobody's, if that was taken), or 65533. The caller frees the result with
/// free; null when memory is short.
user_s_t* create_user_token(const char* user, const char* group, const char* unused);

/// "Error occurred: ERRNO:<number> <text>" in a malloc'ed buffer that the caller frees; null when
/// memory is short.
char* getErrorMsg(int errnum);

/// When `dir` holds `keep` files or more whose names begin with `prefix`, deletes the one that was
/// modified first.
void pruneLogs(const char* dir, const char* prefix, int keep);

/// Splits a command line at blanks outside quotes and returns the number of arguments. `*argv`
/// becomes a list of that many texts and a null pointer; list and texts are freed with free. A
/// quote ends the argument it stands in, so the rest of that word is the next one, and quotes
/// without anything between them are no argument; places that are left over for such reasons hold
/// empty texts. There is always at least one argument. A quote behind a backslash is an ordinary
/// character. Without a command or a place for the list the result is 255 and errno EINVAL; 0 when
/// memory is short.
int MakeArgv(const String* command, char*** argv);

/// Thread function that waits for the child of a ProcessData, stores its exit status, signals
/// `waitCond` and ends its thread. Process::wait does not need it.
void* ProcTerminateThreadFunc(void* processData);

}  // namespace ZAV
