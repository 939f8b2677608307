#include "conformance/run.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <filesystem>
#include <system_error>

namespace conformance {
namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

[[noreturn]] void fail(const char* what) {
    throw std::system_error(errno, std::generic_category(), what);
}

class ScratchDirectory {
public:
    ScratchDirectory() {
        std::string name = (fs::temp_directory_path() / "zavconformance.XXXXXX").string();
        if (::mkdtemp(name.data()) == nullptr) fail("mkdtemp");
        path_ = name;
    }
    ~ScratchDirectory() {
        std::error_code ignored;
        fs::remove_all(path_, ignored);
    }
    ScratchDirectory(const ScratchDirectory&) = delete;
    ScratchDirectory& operator=(const ScratchDirectory&) = delete;
    const std::string& path() const { return path_; }

private:
    std::string path_;
};

class Descriptor {
public:
    explicit Descriptor(int number) : number_(number) {}
    ~Descriptor() { close(); }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    void close() {
        if (number_ != -1) ::close(number_);
        number_ = -1;
    }
    int get() const { return number_; }

private:
    int number_;
};

std::string complaintOf(const Rule& rule, const std::string& scratch) {
    try {
        Bench bench(scratch);
        rule.check(bench);
        return {};
    } catch (const std::exception& failure) {
        return failure.what();
    }
}

/// The child's whole life. The first byte says that the rule came to its end, so that a process
/// which ends on its own account is not mistaken for one that found nothing wrong.
[[noreturn]] void live(const Rule& rule, const std::string& scratch, int report) {
    ::setpgid(0, 0);
    const std::string complaint = "." + complaintOf(rule, scratch);
    const bool written = ::write(report, complaint.data(), complaint.size()) ==
                         static_cast<ssize_t>(complaint.size());
    ::_exit(written ? 0 : 1);
}

/// Reads to the end; false when that has not come by the deadline.
bool readAll(int descriptor, Clock::time_point deadline, std::string& text) {
    for (;;) {
        const auto left =
            std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
        pollfd waiting{descriptor, POLLIN, 0};
        const int ready = ::poll(&waiting, 1, left > 0 ? static_cast<int>(left) : 0);
        if (ready == 0) return false;
        if (ready == -1 && errno == EINTR) continue;
        char part[4096];
        const ssize_t count = ::read(descriptor, part, sizeof part);
        if (count <= 0) return true;
        text.append(part, static_cast<std::size_t>(count));
    }
}

std::string causeOfEnd(int status) {
    if (WIFSIGNALED(status)) return std::string("ended by ") + ::strsignal(WTERMSIG(status));
    return "ended the process with status " + std::to_string(WEXITSTATUS(status));
}

}  // namespace

std::string run(const Rule& rule, std::chrono::milliseconds limit) {
    const ScratchDirectory scratch;
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) == -1) fail("pipe2");
    const Descriptor reading(ends[0]);
    Descriptor writing(ends[1]);
    const pid_t child = ::fork();
    if (child == -1) fail("fork");
    if (child == 0) live(rule, scratch.path(), writing.get());
    ::setpgid(child, child);  // both sides set it, whoever comes first
    writing.close();

    std::string report;
    const bool ended = readAll(reading.get(), Clock::now() + limit, report);
    // What the rule may have started goes with it.
    ::kill(-child, SIGKILL);
    int status = 0;
    while (::waitpid(child, &status, 0) == -1 && errno == EINTR) {
    }
    if (!ended) return "did not return within " + std::to_string(limit.count()) + " ms";
    return report.empty() ? causeOfEnd(status) : report.substr(1);
}

Verdict judge(const Operation& operation, std::chrono::milliseconds limit) {
    std::string complaints;
    for (const Rule& rule : operation.rules) {
        const std::string complaint = run(rule, limit);
        if (complaint.empty()) continue;
        complaints += (complaints.empty() ? ": " : "; ") + rule.promise + " (" + complaint + ")";
    }
    const bool fulfilled = complaints.empty();
    return {fulfilled, (fulfilled ? "ok    " : "FAIL  ") + operation.name + complaints};
}

}  // namespace conformance
