/// A program that is run on behalf of somebody who may go away.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <cstddef>
#include <string>
#include <vector>

#include "system/file_descriptor.h"

namespace fleet {

/// What is run, and what it gets to read.
struct ChildCommand {
    std::string program;             ///< the path of its file
    std::vector<std::string> words;  ///< from its name on; no shell looks at them
    std::string input;               ///< its standard input
    std::string list = {};           ///< what it finds at kGivenPath, if it is not empty
    /// Or a file that it finds there, borrowed while it is started.
    const sys::FileDescriptor* file = nullptr;
};

/// Where a child finds what it is given besides its input.
inline constexpr const char* kGivenPath = "/proc/self/fd/3";

struct ChildEnd {
    enum class Kind {
        Ended,
        TooLate,  ///< it was killed at the end of its time
        TooMuch,  ///< it was killed because it wrote too much
        Stopped,  ///< it was killed by stop()
    };
    Kind kind = Kind::Ended;
    int status = 0;   ///< with Kind::Ended: its exit status, or 128 and the signal that ended it
    std::string out;  ///< what it has written to standard output
    std::string err;  ///< what it has written to standard error
};

/// A process in a group of its own, with no descriptor but its standard streams and what it is
/// given, with the usual signals. None of it is left when the object has gone.
class ChildProgram {
public:
    /// Throws std::system_error if it cannot be started.
    explicit ChildProgram(const ChildCommand& command);
    ~ChildProgram();
    ChildProgram(const ChildProgram&) = delete;
    ChildProgram& operator=(const ChildProgram&) = delete;

    /// Reads what it writes until it ends, or kills it. Once, on one thread.
    ChildEnd wait(std::chrono::milliseconds limit, std::size_t mostBytes);
    /// Has wait() kill it soon. Any thread.
    void stop();
    pid_t pid() const { return pid_; }

private:
    using Time = std::chrono::steady_clock::time_point;

    ChildEnd::Kind follow(ChildEnd& end, Time deadline, std::size_t mostBytes);
    int reap();

    const sys::FileDescriptor stop_;
    sys::FileDescriptor out_;
    sys::FileDescriptor err_;
    pid_t pid_ = -1;  ///< -1 once it has been reaped
    sys::FileDescriptor process_;
};

}  // namespace fleet
