// Trace lines. Each event becomes one line and one write, so that lines of several threads and
// processes do not mix in an append-mode file. Nothing here takes a lock, and a line with the
// format "%s" is written with async-signal-safe calls only: a child between fork and exec traces.
//
//   2026-01-31 12:34:56.123456 4711 E zavtasks:123 runTask: text

#include "platform/ras1.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>
#include <vector>

#include "embedded/ras1_control.h"

std::atomic<unsigned> RAS1_Generation{1};

namespace {

constexpr unsigned kAllLevels = RAS1_DETAIL | RAS1_FLOW | RAS1_ERROR;

/// Which units trace what: a level for all and exceptions by the beginning of the unit's name.
struct Selection {
    struct Rule {
        std::string unitPrefix;
        unsigned flags;
    };
    unsigned general = RAS1_ERROR;
    std::vector<Rule> rules;

    unsigned flagsOf(const char* unit) const {
        for (const Rule& rule : rules) {
            if (std::strncmp(unit, rule.unitPrefix.c_str(), rule.unitPrefix.size()) == 0) {
                return rule.flags;
            }
        }
        return general;
    }
};

unsigned levelNamed(const std::string& word) {
    if (word == "ALL") return kAllLevels;
    if (word == "DETAIL") return RAS1_DETAIL | RAS1_ERROR;
    if (word == "FLOW") return RAS1_FLOW | RAS1_ERROR;
    if (word == "ERROR") return RAS1_ERROR;
    return 0;
}

std::vector<std::string> words(const std::string& text) {
    std::vector<std::string> found;
    std::string word;
    for (const char c : text + " ") {
        if (c != ' ' && c != '\t') {
            word += c;
        } else if (!word.empty()) {
            found.push_back(word);
            word.clear();
        }
    }
    return found;
}

/// "UNIT:name LEVEL ..." without its parentheses; other kinds of groups select nothing.
void addGroup(const std::string& group, Selection& selection) {
    std::string unit;
    unsigned flags = 0;
    for (const std::string& word : words(group)) {
        if (word.rfind("UNIT:", 0) == 0) {
            unit = word.substr(5);
        } else {
            flags |= levelNamed(word);
        }
    }
    if (!unit.empty()) selection.rules.push_back({unit, flags});
}

Selection parseSelection(const std::string& text) {
    Selection selection;
    unsigned general = 0;
    std::string outside;
    std::size_t at = 0;
    while (at < text.size()) {
        const std::size_t open = text.find('(', at);
        outside += text.substr(at, open == std::string::npos ? open : open - at) + " ";
        if (open == std::string::npos) break;
        const std::size_t close = text.find(')', open);
        const std::size_t end = close == std::string::npos ? text.size() : close;
        addGroup(text.substr(open + 1, end - open - 1), selection);
        at = end + 1;
    }
    for (const std::string& word : words(outside)) general |= levelNamed(word);
    if (general != 0) selection.general = general;
    return selection;
}

/// A descriptor of its own for standard error: if the process closes descriptor 2 later and a file
/// or a pipe gets that number, traces must not end up there.
int ownStandardError() {
    return ::fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 3);
}

/// What is in force. Replaced by configure() only; never destroyed, because threads trace until
/// the process is gone.
struct Facility {
    Selection selection;
    int standardError = ownStandardError();
    int log = -1;

    Facility() { configureFromEnvironment(); }

    void configure(const std::string& selectionText, const std::string& logPath) {
        selection = parseSelection(selectionText);
        if (log != -1) ::close(log);
        log = logPath.empty()
                  ? -1
                  : ::open(logPath.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0640);
    }

    void configureFromEnvironment() {
        const char* text = std::getenv("KBB_RAS1");
        const char* path = std::getenv("KBB_RAS1_LOG");
        configure(text != nullptr ? text : "", path != nullptr ? path : "");
    }

    int descriptor() const { return log != -1 ? log : standardError; }
};

Facility& facility() {
    static Facility& instance = *new Facility;   // immortal, see above
    return instance;
}

/// Opens the log and takes the copy of standard error while the process starts, before its files
/// move.
[[maybe_unused]] const Facility& startedEarly = facility();

/// Appends decimal digits, at least `width` of them.
char* putNumber(char* at, long long value, int width) {
    char digits[24];
    int count = 0;
    do {
        digits[count++] = static_cast<char>('0' + value % 10);
        value /= 10;
    } while (value > 0);
    while (count < width) digits[count++] = '0';
    while (count > 0) *at++ = digits[--count];
    return at;
}

char* putText(char* at, const char* end, const char* text) {
    while (*text != '\0' && at < end) *at++ = *text++;
    return at;
}

/// Days since the epoch to year, month and day (proleptic Gregorian calendar, UTC); gmtime is not
/// async-signal-safe.
void civilDate(long long days, int& year, int& month, int& day) {
    const long long z = days + 719468;
    const long long era = z / 146097;
    const long long dayOfEra = z - era * 146097;
    const long long yearOfEra =
        (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
    const long long dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    const long long shifted = (5 * dayOfYear + 2) / 153;
    day = static_cast<int>(dayOfYear - (153 * shifted + 2) / 5 + 1);
    month = static_cast<int>(shifted < 10 ? shifted + 3 : shifted - 9);
    year = static_cast<int>(yearOfEra + era * 400 + (month <= 2 ? 1 : 0));
}

char* putTime(char* at) {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    const long long seconds = now.tv_sec;
    int year = 0, month = 0, day = 0;
    civilDate(seconds / 86400, year, month, day);
    at = putNumber(at, year, 4);
    *at++ = '-';
    at = putNumber(at, month, 2);
    *at++ = '-';
    at = putNumber(at, day, 2);
    *at++ = ' ';
    at = putNumber(at, seconds / 3600 % 24, 2);
    *at++ = ':';
    at = putNumber(at, seconds / 60 % 60, 2);
    *at++ = ':';
    at = putNumber(at, seconds % 60, 2);
    *at++ = '.';
    return putNumber(at, now.tv_nsec / 1000, 6);
}

/// Everything of a line that stands before its text.
std::size_t putHead(char (&head)[256], const RAS1_BLOCK& block, char letter, int line) {
    const char* const end = head + sizeof head - 32;
    char* at = putTime(head);
    *at++ = ' ';
    at = putNumber(at, ::syscall(SYS_gettid), 1);
    *at++ = ' ';
    *at++ = letter;
    *at++ = ' ';
    at = putText(at, end, block.unit->name);
    *at++ = ':';
    at = putNumber(at, line, 1);
    *at++ = ' ';
    at = putText(at, end, block.function);
    *at++ = ':';
    *at++ = ' ';
    return static_cast<std::size_t>(at - head);
}

/// Text that holds line ends would make a line look like several (and let a caller's data forge
/// some), so they and the backslash are written as escapes. The trailing line feeds that some texts
/// have are dropped.
bool needsEscapes(const char* text, std::size_t length) {
    return std::memchr(text, '\n', length) != nullptr || std::memchr(text, '\r', length) != nullptr ||
           std::memchr(text, '\\', length) != nullptr;
}

std::string escaped(const char* text, std::size_t length) {
    std::string out;
    out.reserve(length + length / 8);
    for (std::size_t i = 0; i < length; ++i) {
        switch (text[i]) {
            case '\n': out += "\\n"; break;
            case '\r': out += "\\r"; break;
            case '\\': out += "\\\\"; break;
            default: out += text[i];
        }
    }
    return out;
}

void writeLine(const RAS1_BLOCK& block, char letter, int line, const char* text,
               std::size_t length) {
    const int savedErrno = errno;
    char head[256];
    const std::size_t headLength = putHead(head, block, letter, line);
    char newline = '\n';
    iovec parts[3] = {{head, headLength},
                      {const_cast<char*>(text), length},
                      {&newline, 1}};
    ssize_t written = 0;
    do {
        written = ::writev(facility().descriptor(), parts, 3);
    } while (written == -1 && errno == EINTR);
    errno = savedErrno;
}

void writeText(const RAS1_BLOCK& block, char letter, int line, const char* text,
               std::size_t length) {
    while (length > 0 && text[length - 1] == '\n') --length;
    if (needsEscapes(text, length)) {
        const std::string safe = escaped(text, length);
        writeLine(block, letter, line, safe.data(), safe.size());
    } else {
        writeLine(block, letter, line, text, length);
    }
}

}  // namespace

unsigned RAS1_Sync(RAS1_UNIT* unit) {
    const unsigned generation = RAS1_Generation.load(std::memory_order_acquire);
    const unsigned flags = facility().selection.flagsOf(unit->name);
    unit->flags.store(flags, std::memory_order_relaxed);
    unit->generation.store(generation, std::memory_order_release);
    return flags;
}

void RAS1_Entry(const RAS1_BLOCK* block, int line) {
    writeLine(*block, 'F', line, "Entry", 5);
}

void RAS1_Exit(const RAS1_BLOCK* block, int line) {
    writeLine(*block, 'F', line, "Exit", 4);
}

void RAS1_ExitValue(const RAS1_BLOCK* block, int line, long value) {
    char text[40] = "Exit ";
    char* at = text + 5;
    if (value < 0) *at++ = '-';
    // The most negative value has no positive counterpart in its own type.
    at = putNumber(at, value < 0 ? -static_cast<long long>(value + 1) + 1 : value, 1);
    writeLine(*block, 'F', line, text, static_cast<std::size_t>(at - text));
}

void RAS1_Printf(const RAS1_BLOCK* block, unsigned level, int line, const char* format, ...) {
    const char letter = level == RAS1_ERROR ? 'E' : 'D';
    std::va_list arguments;
    va_start(arguments, format);
    if (std::strcmp(format, "%s") == 0) {
        const char* const text = va_arg(arguments, const char*);
        writeText(*block, letter, line, text, std::strlen(text));
    } else {
        char buffer[1024];
        std::va_list again;
        va_copy(again, arguments);
        const int length = std::vsnprintf(buffer, sizeof buffer, format, arguments);
        if (length >= 0 && static_cast<std::size_t>(length) < sizeof buffer) {
            writeText(*block, letter, line, buffer, static_cast<std::size_t>(length));
        } else if (length >= 0) {
            std::string whole(static_cast<std::size_t>(length) + 1, '\0');
            std::vsnprintf(whole.data(), whole.size(), format, again);
            writeText(*block, letter, line, whole.data(), static_cast<std::size_t>(length));
        }
        va_end(again);
    }
    va_end(arguments);
}

namespace ras1 {

void configure(const std::string& selection, const std::string& logPath) {
    facility().configure(selection, logPath);
    ++RAS1_Generation;
}

void configureFromEnvironment() {
    facility().configureFromEnvironment();
    ++RAS1_Generation;
}

}  // namespace ras1
