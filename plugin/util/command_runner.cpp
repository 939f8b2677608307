// Running a command to its end and collecting what it writes.

#include <poll.h>

#include <cerrno>
#include <cstring>

#include "base/zavtrace.h"
#include "util/child_end.h"
#include "util/unit_buffer.h"
#include "util/zavprocs.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavutil"};

constexpr int kChunkSize = 16384;
constexpr int kLongestPoll = 60 * 1000;  // milliseconds; the deadline may be further off

/// Commands with this in them start agents, whose own background processes inherit the pipes and
/// keep them open: there is no end of file to read up to.
constexpr const char* kAgentScript = "TovrinAgent";

/// Waits until one of the descriptors is ready; false when the deadline has passed before. When
/// the system cannot even tell, it is asked again a little later: to go on as if something were
/// ready could mean to wait without end.
bool pollUntil(pollfd* descriptors, nfds_t count, const Deadline& deadline) {
    for (;;) {
        const int ready = ::poll(descriptors, count, deadline.millisecondsLeft(kLongestPoll));
        if (ready > 0) return true;
        if (deadline.passed()) return false;
        if (ready == -1 && errno != EINTR) shortPause();
    }
}

/// What one of the child's output streams has brought so far.
class Output {
public:
    /// `chunkFormat` is the format of the trace line for each chunk.
    Output(ProcessInputStream& stream, const char* chunkFormat)
        : stream_(stream), chunkFormat_(chunkFormat) {}

    bool ended() const { return ended_; }
    int descriptor() const { return stream_.descriptor(); }

    /// Reads once and collects it, each chunk converted on its own; waits when nothing is there.
    void readChunk(const Trace& trace) {
        char chunk[kChunkSize + 1];
        const int got = stream_.read(chunk, kChunkSize);
        if (got <= 0) {
            ended_ = true;
            return;
        }
        chunk[got] = '\0';
        trace().detail(chunkFormat_, static_cast<const char*>(chunk));
        units_.append(String(chunk));
    }

    /// Reads up to the end. False when the deadline passes before.
    bool drain(const Trace& trace, const Deadline& deadline) {
        while (!ended_) {
            pollfd readable{descriptor(), POLLIN, 0};
            if (!pollUntil(&readable, 1, deadline)) return false;
            readChunk(trace);
            // A child that never stops writing is ready all the time.
            if (!ended_ && deadline.passed()) return false;
        }
        return true;
    }

    /// The one read that follows the end of the child. A stream that somebody else keeps open
    /// without writing to it holds nothing up beyond the deadline.
    void readRest(const Trace& trace, bool nonBlocking, const Deadline& deadline) {
        const bool returnsAtOnce = nonBlocking && stream_.setNonBlocking(true) != -1;
        pollfd readable{descriptor(), POLLIN, 0};
        if (returnsAtOnce || pollUntil(&readable, 1, deadline)) readChunk(trace);
        stream_.close();
    }

    void appendTo(String& text) const { units_.appendTo(text); }

private:
    ProcessInputStream& stream_;
    const char* chunkFormat_;
    UnitBuffer units_;
    bool ended_ = false;
};

/// One started command. An exception that ends the run ends the child too.
class Run {
public:
    Run(const Trace& trace, Process& process, bool startsAgent)
        : trace_(trace),
          process_(process),
          startsAgent_(startsAgent),
          out_(*process.getStdOut(), "outbuf: %s"),
          err_(*process.getStdErr(), "errbuf: %s") {}
    ~Run() { process_.killUnlessEnded(); }
    Run(const Run&) = delete;
    Run& operator=(const Run&) = delete;

    /// Gives the child its input, collects its output and waits for its end. The time-out bounds
    /// all of it: false when it passes, and then the child is killed, also when it has ended itself
    /// and left its output open to others.
    bool finish(const String& input, int& rc, bool nonBlocking) {
        if (!feed(input) || !drain()) {
            process_.giveUp(&rc);
            return false;
        }
        if (!process_.waitUntil(deadline(), &rc)) return false;
        out_.readRest(trace_, nonBlocking, deadline());
        err_.readRest(trace_, nonBlocking, deadline());
        return true;
    }

    /// One and the same text for both gets the output, then the errors.
    void copyOutput(String& stdOut, String& stdErr) const {
        stdOut.clear();
        stdErr.clear();
        out_.appendTo(stdOut);
        err_.appendTo(stdErr);
    }

private:
    const Deadline& deadline() const { return process_.runDeadline(); }

    bool drain() {
        if (startsAgent_) return true;
        // Once, as the process never reports that it is still running.
        do {
            if (!out_.drain(trace_, deadline()) || !err_.drain(trace_, deadline())) return false;
        } while (process_.running());
        return true;
    }

    /// Writes the input and closes the child's standard input. A child that does not want it all is
    /// no failure. False when the deadline passes.
    bool feed(const String& input) {
        ProcessOutputStream& stream = *process_.getStdIn();
        const CharStar narrow = input.c_str();
        const char* at = narrow;
        std::size_t left = std::strlen(at);
        if (left != 0) stream.setNonBlocking(true);
        while (left != 0) {
            const ssize_t written = stream.writeSome(at, left);
            if (written > 0) {
                at += written;
                left -= static_cast<std::size_t>(written);
            } else if (written == 0 || errno != EAGAIN) {
                break;
            } else if (!awaitRoom(stream)) {
                return false;
            }
        }
        stream.close();
        return true;
    }

    /// Waits until the child takes more input. Its standard output is drained meanwhile: a child
    /// that writes while it reads would otherwise wait for us, and we for it.
    bool awaitRoom(ProcessOutputStream& stream) {
        pollfd ready[2] = {{stream.descriptor(), POLLOUT, 0}, {out_.descriptor(), POLLIN, 0}};
        const bool alsoDrains = !startsAgent_ && !out_.ended();
        if (!pollUntil(ready, alsoDrains ? 2 : 1, deadline())) return false;
        if (ready[0].revents == 0 && ready[1].revents != 0) out_.readChunk(trace_);
        return !deadline().passed();
    }

    const Trace& trace_;
    Process& process_;
    bool startsAgent_;
    Output out_;
    Output err_;
};

void report(const Trace& trace, const String& command, int rc, const String& stdOut,
            const String& stdErr) {
    constexpr const char* kOut = "STDOUT [%d characters] is: %s";
    constexpr const char* kErr = "STDERR [%d characters] is: %s";
    if (rc == 0) {
        trace().detail("Return code (%d) from command \"%s\"", rc, command);
        trace().detail(kOut, stdOut.length(), stdOut);
        trace().detail(kErr, stdErr.length(), stdErr);
    } else {
        trace().error("Bad return code (%d) from command \"%s\"", rc, command);
        trace().error(kOut, stdOut.length(), stdOut);
        trace().error(kErr, stdErr.length(), stdErr);
    }
}

}  // namespace

bool Util::runCommandEnv(const String& command, char** env, int& rc, String& stdOut, String& stdErr,
                         const String& input, bool nonBlocking) {
    Trace trace(traceUnit);
    trace().detail("Command to run is \"%s\"", command);
    const bool startsAgent = command.find(String(kAgentScript), 0) != String::NPOS;
    Process process(command, const_cast<const char**>(env));
    if (!process.start()) {
        trace().error("Failed to start process for cmd %s", command);
        return trace.exit(false);
    }
    Run run(trace, process, startsAgent);
    const bool inTime = run.finish(input, rc, nonBlocking);
    run.copyOutput(stdOut, stdErr);
    if (!inTime) {
        trace().error("Failed to wait on process");
        return trace.exit(false);
    }
    report(trace, command, rc, stdOut, stdErr);
    return trace.exit(true);
}

bool Util::runCommand(const String& command, int& rc, String& stdOut, String& stdErr,
                      const String& input, bool nonBlocking) {
    Trace trace(traceUnit);
    return trace.exit(runCommandEnv(command, nullptr, rc, stdOut, stdErr, input, nonBlocking));
}

}  // namespace ZAV
