#include "fleet/log/log.h"

#include <unistd.h>

#include <cstdlib>

namespace fleet {
namespace {

constexpr std::size_t kLongestLine = 4096;

std::string& programName() {
    static std::string name = "fleet";
    return name;
}

bool isControl(unsigned char letter) {
    return letter < 0x20 || letter == 0x7f;
}

}  // namespace

void nameProgram(const std::string& name) {
    programName() = name;
}

std::string lineOf(Priority priority, const std::string& text, bool isForJournal) {
    std::string line;
    if (isForJournal) line = '<' + std::to_string(static_cast<int>(priority)) + '>';
    if (!isForJournal) line += programName() + ": ";
    for (const char letter : text)
        line += isControl(static_cast<unsigned char>(letter)) ? ' ' : letter;
    if (line.size() >= kLongestLine) line.resize(kLongestLine - 1);
    return line + '\n';
}

void say(Priority priority, const std::string& text) {
    // systemd sets this where standard error goes to its journal.
    static const bool isForJournal = std::getenv("JOURNAL_STREAM") != nullptr;
    const std::string line = lineOf(priority, text, isForJournal);
    // A log that nobody takes is no reason to end.
    if (::write(STDERR_FILENO, line.data(), line.size()) < 0) return;
}

}  // namespace fleet
