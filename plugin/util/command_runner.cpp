// Runs a command to its end and collects what it writes.

#include <poll.h>

#include <cerrno>
#include <cstring>

#include "base/zavtrace.h"
#include "util/process/child_end.h"
#include "util/process/unit_buffer.h"
#include "util/zavprocs.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavutil"};

constexpr int kChunkSize = 16384;
constexpr int kLongestPoll = 60 * 1000;  // milliseconds; the deadline may be further off

/// Commands that contain this start agents. The agents' background processes inherit the pipes and
/// keep them open, so there is no end of file to wait for.
constexpr const char* kAgentScript = "TovrinAgent";

/// Waits until one of the descriptors is ready; false when the deadline passes first. When poll
/// itself fails, it is tried again a little later: going on as if a descriptor were ready could
/// block for ever.
bool pollUntil(pollfd* descriptors, nfds_t count, const Deadline& deadline) {
    for (;;) {
        const int ready = ::poll(descriptors, count, deadline.millisecondsLeft(kLongestPoll));
        if (ready > 0) return true;
        if (deadline.passed()) return false;
        if (ready == -1 && errno != EINTR) shortPause();
    }
}

/// One of the child's output streams and what has been read from it so far.
class Output {
public:
    /// `chunkFormat` is the format of the trace line for each chunk.
    Output(ProcessInputStream& stream, const char* chunkFormat)
        : stream_(stream), chunkFormat_(chunkFormat) {}

    bool ended() const { return ended_; }
    int descriptor() const { return stream_.descriptor(); }

    /// Reads one chunk, waiting for it if necessary, and collects it. Each chunk is converted from
    /// the local code page by itself.
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

    /// Reads to the end of the stream; false when the deadline passes first.
    bool drain(const Trace& trace, const Deadline& deadline) {
        while (!ended_) {
            pollfd readable{descriptor(), POLLIN, 0};
            if (!pollUntil(&readable, 1, deadline)) return false;
            readChunk(trace);
            // The descriptor of a child that never stops writing is always ready.
            if (!ended_ && deadline.passed()) return false;
        }
        return true;
    }

    /// The one read after the child has ended. Another process may keep the stream open without
    /// writing to it; that delays this no longer than the deadline.
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

/// A command that has been started. When an exception ends the run, the child is killed.
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

    /// Gives the child its input, collects its output and waits for its end, all within the
    /// time-out. Returns false when that passes, and kills the child. This is also the result when
    /// the child itself has ended, but another process keeps its output open.
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

    /// The caller may pass the same text twice; it then gets the output followed by the errors.
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
        // Runs once, because running() is always false.
        do {
            if (!out_.drain(trace_, deadline()) || !err_.drain(trace_, deadline())) return false;
        } while (process_.running());
        return true;
    }

    /// Writes the input and closes the child's standard input. A child that does not read it all is
    /// no failure. Returns false when the deadline passes.
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

    /// Waits until the child takes more input. Reads its standard output meanwhile: a child that
    /// writes while it reads would otherwise wait for us while we wait for it.
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
