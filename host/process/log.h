/// What the host says to its operator.
#pragma once

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <string>

namespace host {

/// How much a line matters, as the system's journal counts it.
enum class Priority { Error = 3, Warning = 4, Notice = 5, Info = 6 };

/// Whether standard error goes to the system's journal. Any thread.
inline bool logsToJournal() {
    const char* const stream = std::getenv("JOURNAL_STREAM");
    struct stat found {};
    return stream != nullptr && ::fstat(STDERR_FILENO, &found) == 0 &&
           stream == std::to_string(found.st_dev) + ":" + std::to_string(found.st_ino);
}

/// One line: for the journal with its priority in front, else with the program's name. Clients'
/// words may be in the text, so blanks stand for its control characters, which a terminal would
/// obey.
inline std::string logLine(Priority priority, std::string text, bool toJournal) {
    constexpr char kDelete = 0x7F;
    std::replace_if(
        text.begin(), text.end(),
        [](char character) {
            return static_cast<unsigned char>(character) < ' ' || character == kDelete;
        },
        ' ');
    const std::string beginning = toJournal ? "<" + std::to_string(static_cast<int>(priority)) + ">"
                                            : std::string("zavhost: ");
    return beginning + text + "\n";
}

/// Says it on standard error, in one piece. Any thread.
inline void say(Priority priority, const std::string& text) {
    const std::string line = logLine(priority, text, logsToJournal());
    while (::write(STDERR_FILENO, line.data(), line.size()) < 0 && errno == EINTR) {
    }
}

}  // namespace host
