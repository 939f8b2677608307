/// Child processes: one external command with pipes on its standard streams, and helpers around it.
///
/// Failures are reported by return values and trace lines. A Process and its streams are used by
/// one thread at a time; any number of threads may have one each. Nothing here changes the calling
/// process's signal handlers, signal mask or environment, or waits for another child than its own.
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
#include "util/process/deadline.h"

namespace ZAV {

struct ChildPipes;
class Trace;

/// A source of bytes.
class InputStream {
public:
    InputStream() = default;
    virtual ~InputStream() = default;
    InputStream(const InputStream&) = delete;
    InputStream& operator=(const InputStream&) = delete;

    /// Reads one byte, 0 to 255; -1 at the end or on failure.
    virtual int read() = 0;
    /// Reads up to `len` bytes. Returns their number, 0 at the end, or -1 with errno set.
    virtual int read(void* buf, int len) = 0;
    virtual bool close() = 0;
};

/// A sink for bytes.
class OutputStream {
public:
    OutputStream() = default;
    virtual ~OutputStream() = default;
    OutputStream(const OutputStream&) = delete;
    OutputStream& operator=(const OutputStream&) = delete;

    /// Writes all of `len` bytes; false when only some or none could be written.
    virtual bool write(const char* buf, int len) = 0;
    virtual bool close() = 0;
};

/// The read end of a pipe. Restarts calls that a signal interrupts.
class ProcessInputStream : public InputStream {
public:
    /// Takes ownership of the descriptor and closes the one it had before.
    void attach(FileDescriptor fd) { fd_ = std::move(fd); }
    /// The descriptor to poll, or -1.
    int descriptor() const { return fd_.get(); }

    int read() override;
    /// In non-blocking mode returns -1 with EAGAIN when nothing is there yet.
    int read(void* buf, int len) override;
    /// Switches O_NONBLOCK. Returns 0, or -1 with errno set.
    int setNonBlocking(bool on);
    bool isNonBlocking() const { return nonBlocking_; }
    /// Returns false when the descriptor was not open.
    bool close() override;

private:
    FileDescriptor fd_;
    bool nonBlocking_ = false;
};

/// The write end of a pipe. Restarts calls that a signal interrupts. When the reader is gone, a
/// write fails with EPIPE; it never raises SIGPIPE in the calling process.
class ProcessOutputStream : public OutputStream {
public:
    /// Takes ownership of the descriptor and closes the one it had before.
    void attach(FileDescriptor fd) { fd_ = std::move(fd); }
    int descriptor() const { return fd_.get(); }

    bool write(const char* buf, int len) override;
    /// Writes once. Returns the number of bytes written, or -1 with errno set (EAGAIN when the pipe
    /// is full in non-blocking mode).
    ssize_t writeSome(const char* buf, std::size_t len);
    int setNonBlocking(bool on);
    bool close() override;

private:
    FileDescriptor fd_;
};

/// A child that has been started.
struct ProcessData {
    int pid = 0;
    int exitStatus = 0;
    /// Guards exitStatus and exited when ProcTerminateThreadFunc waits for the child.
    pthread_mutex_t mutex = PTHREAD_MUTEX_INITIALIZER;
    /// Signalled by that thread once `exited` is set. Initialised statically as well, so that it
    /// can be destroyed even after pthread_cond_init has failed.
    pthread_cond_t waitCond = PTHREAD_COND_INITIALIZER;
    bool exited = false;
};

/// A user and a group. Allocated with malloc.
struct user_s_t {
    std::uint32_t uid;
    std::uint32_t gid;
};

/// One external command. Can be started once:
///
///     Process process("/bin/ls -l");
///     if (process.start()) {
///         ... process.getStdOut()->read(buffer, sizeof buffer) ...
///         bool inTime = process.wait(&exitCode);
///     }
///
/// The destructor closes the pipes. It neither kills the child nor waits for it. A child that
/// nobody waited for is reaped once it has ended, when the next command is started.
class Process {
public:
    /// MakeArgv splits the command line. `env` is null or a list of "NAME=value" texts that ends in
    /// a null pointer; it is copied. User and group are only looked up: the child runs as the
    /// caller does. The time-out is the value of the variable TIMEOUT in seconds (0 when it is not
    /// a number), or 300 when the variable is not set.
    explicit Process(const String& command);
    Process(const String& command, const char** env);
    Process(const String& command, const char** env, String user, String group);
    virtual ~Process();
    Process(const Process&) = delete;
    Process& operator=(const Process&) = delete;

    /// The other ends of the child's standard output, error and input. The Process owns them.
    ProcessInputStream* getStdOut() const { return stdOut_.get(); }
    ProcessInputStream* getStdErr() const { return stdErr_.get(); }
    ProcessOutputStream* getStdIn() const { return stdIn_.get(); }

    /// Creates the pipes and the child. The first word of the command must be the path of an
    /// executable. Returns true when there is a child, even when that child cannot execute the
    /// command: it then ends with status 0.
    bool start();

    /// Waits for the child to end and kills it when the time-out, counted from now, has passed.
    /// Returns true when the child ended in time. `*exitCode`, unless null, becomes its exit
    /// status, or 0 when it was killed. The end of a child is noticed at once.
    bool wait(int* exitCode);
    /// Does the same with the caller's own deadline.
    bool waitUntil(const Deadline& deadline, int* exitCode);
    /// Does what wait does when the time-out has passed, trace lines included, without checking the
    /// child once more. Returns false.
    bool giveUp(int* exitCode);

    /// The end of the time-out, counted from start().
    const Deadline& runDeadline() const { return runDeadline_; }
    /// Kills and reaps the child if nobody has waited for it. Traces nothing.
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

/// Looks up the ids of a user and a group by name; null means the caller's own. An unknown user
/// gets the id of "nobody", or 65533 when there is no such entry either. An unknown group gets the
/// primary group of the entry that was found for the user ("nobody" included), or 65533. The caller
/// frees the result with free. Returns null when out of memory.
user_s_t* create_user_token(const char* user, const char* group, const char* unused);

/// Returns "Error occurred: ERRNO:<number> <text>" in a malloc'ed buffer that the caller frees, or
/// null when out of memory.
char* getErrorMsg(int errnum);

/// Deletes the oldest file in `dir` whose name begins with `prefix`, by modification time, when
/// there are `keep` of them or more.
void pruneLogs(const char* dir, const char* prefix, int keep);

/// Splits a command line at blanks outside quotes and returns the number of arguments. `*argv`
/// becomes a list of that many texts plus a null pointer; the caller frees each text and the list
/// with free.
///
/// A quote ends the argument that it stands in, so the rest of that word becomes the next argument.
/// Empty quotes yield no argument. The count is taken before that, so the list may end in empty
/// texts. There is always at least one argument. A quote after a backslash is an ordinary
/// character.
///
/// Returns 255 with errno EINVAL when `command` or `argv` is null, and 0 when out of memory.
int MakeArgv(const String* command, char*** argv);

/// Thread function: waits for the child of a ProcessData, stores its exit status, signals
/// `waitCond` and ends the thread. Process::wait does not use it.
void* ProcTerminateThreadFunc(void* processData);

}  // namespace ZAV
