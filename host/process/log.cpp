#include "host/process/log.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <nlohmann/json.hpp>

#include "system/file_descriptor.h"
#include "text/utc_time.h"

namespace host {
namespace {

constexpr std::string_view kJournal = "/run/systemd/journal/socket";

/// At the end of what was too long.
constexpr std::string_view kCut = "...";

enum class LogState { Spoken, Text, Json };
std::atomic<LogState> state{LogState::Spoken};

const char* levelOf(Priority priority) {
    switch (priority) {
        case Priority::Error:
            return "error";
        case Priority::Warning:
            return "warning";
        case Priority::Notice:
            return "notice";
        case Priority::Info:
            break;
    }
    return "info";
}

std::string number(Priority priority) {
    return std::to_string(static_cast<int>(priority));
}

std::string harmless(std::string text) {
    constexpr char kDelete = 0x7F;
    std::replace_if(
        text.begin(), text.end(),
        [](char character) {
            return static_cast<unsigned char>(character) < ' ' || character == kDelete;
        },
        ' ');
    return text;
}

bool isJournalStream(struct stat found) {
    const char* const stream = std::getenv("JOURNAL_STREAM");
    return stream != nullptr &&
           stream == std::to_string(found.st_dev) + ":" + std::to_string(found.st_ino);
}

/// Whether standard error takes a line now. A pipe that nobody reads would hold up the host, and
/// its end: somebody who has been waited for in vain is not waited for again until he reads.
bool takesLine() {
    constexpr int kPatienceMs = 1'000;
    static std::atomic<bool> isStuck{false};
    pollfd output{STDERR_FILENO, POLLOUT, 0};
    int ready = 0;
    do {
        ready = ::poll(&output, 1, isStuck.load() ? 0 : kPatienceMs);
    } while (ready < 0 && errno == EINTR);
    isStuck.store(ready == 0);
    return ready != 0;
}

void writeLine(std::string line) {
    // A pipe that is ready takes so much at once.
    if (line.size() > PIPE_BUF) {
        line.replace(PIPE_BUF - 4, std::string::npos, std::string(kCut) + "\n");
    }
    if (!takesLine()) return;
    while (::write(STDERR_FILENO, line.data(), line.size()) < 0 && errno == EINTR) {
    }
}

/// A stream alone carries no fields.
void tellJournal(const LogEntry& entry) {
    struct stat found {};
    const bool isSocket = ::fstat(STDERR_FILENO, &found) == 0 && S_ISSOCK(found.st_mode);
    if (!isSocket || !sendToJournal(entry, kJournal)) writeLine(prefixedLine(entry));
}

}  // namespace

std::string spokenLine(const LogEntry& entry) {
    return "zavhost: " + harmless(entry.text) + "\n";
}

std::string textLine(const LogEntry& entry) {
    return text::utcTime(entry.time) + " " + levelOf(entry.priority) + " " + spokenLine(entry);
}

std::string jsonLine(const LogEntry& entry) {
    nlohmann::ordered_json document = {{"time", text::utcTime(entry.time)},
                                       {"level", levelOf(entry.priority)}};
    if (!entry.task.empty()) document["task"] = entry.task;
    std::string text = entry.text;
    for (;;) {
        document["text"] = text;
        std::string line =
            document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) + "\n";
        // Half a document is no JSON, so its text is cut instead. A short one is not the reason.
        if (line.size() <= PIPE_BUF || text.size() <= 2 * kCut.size()) return line;
        text = text.substr(0, text.size() / 2).append(kCut);
    }
}

std::string prefixedLine(const LogEntry& entry) {
    return "<" + number(entry.priority) + ">" + harmless(entry.text) + "\n";
}

bool logsToJournal() {
    struct stat found {};
    return ::fstat(STDERR_FILENO, &found) == 0 && isJournalStream(found);
}

bool sendToJournal(const LogEntry& entry, std::string_view path) {
    std::string fields = "PRIORITY=" + number(entry.priority) +
                         "\nSYSLOG_IDENTIFIER=zavhost\nMESSAGE=" + harmless(entry.text) + "\n";
    if (!entry.task.empty()) fields += "ZAVHOST_TASK=" + harmless(entry.task) + "\n";
    sockaddr_un address{};
    if (path.size() >= sizeof address.sun_path) return false;
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, path.size());
    const sys::FileDescriptor socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    if (!socket) return false;
    // A journal that is stuck holds nobody up.
    const ssize_t sent =
        ::sendto(socket.get(), fields.data(), fields.size(), MSG_NOSIGNAL | MSG_DONTWAIT,
                 reinterpret_cast<const sockaddr*>(&address), sizeof address);
    return sent == static_cast<ssize_t>(fields.size());
}

void beginLog(LogFormat format) {
    state.store(format == LogFormat::Json ? LogState::Json : LogState::Text);
}

void say(Priority priority, const std::string& text, const std::string& task) {
    const LogEntry entry{priority, text, task, std::chrono::system_clock::now()};
    const LogState now = state.load();
    if (now == LogState::Json) {
        writeLine(jsonLine(entry));
    } else if (logsToJournal()) {
        tellJournal(entry);
    } else {
        writeLine(now == LogState::Text ? textLine(entry) : spokenLine(entry));
    }
}

}  // namespace host
