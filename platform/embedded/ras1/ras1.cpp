// Trace lines. Each event is one line, written with one call, so that lines of several threads and
// processes do not mix in an append-mode file. Nobody waits for a lock here, and a line with the
// format "%s" needs async-signal-safe calls only, so that a child can trace between fork and exec.
//
//   2026-01-31 12:34:56.123456 4711 E zavtasks:123 runTask: text

#include "platform/ras1.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <memory>
#include <string>
#include <vector>

#include "embedded/ras1_control.h"
#include "ras1/ears.h"
#include "ras1/log_file.h"
#include "ras1/secrets.h"
#include "ras1/selection.h"

std::atomic<unsigned> RAS1_Generation{1};

namespace {

/// Whether a write may raise SIGPIPE.
bool hasReader(int descriptor) {
    struct stat found {};
    return ::fstat(descriptor, &found) == 0 && (S_ISFIFO(found.st_mode) || S_ISSOCK(found.st_mode));
}

/// The settings in force. Only configure() replaces them, on one thread at a time, while others may
/// be tracing. Never destroyed, because threads trace until the process ends.
class Facility {
    /// One of those who change where lines go.
    class Turn {
    public:
        explicit Turn(std::atomic_flag& taken) : taken_(taken) {
            while (taken_.test_and_set(std::memory_order_acquire))
                ::sched_yield();
        }
        ~Turn() { taken_.clear(std::memory_order_release); }
        Turn(const Turn&) = delete;
        Turn& operator=(const Turn&) = delete;

    private:
        std::atomic_flag& taken_;
    };

public:
    Facility() { configureFromEnvironment(); }

    void configure(const std::string& selectionText, const std::string& logPath) {
        const Turn turn(changing_);
        selections_.push_back(
            std::make_unique<const ras1::Selection>(ras1::parseSelection(selectionText)));
        selection_.store(selections_.back().get(), std::memory_order_release);
        logPath_ = logPath;
        redirect(ras1::openLog(logPath));
    }

    bool reopenLog() {
        if (logPath_.empty()) return true;
        const int log = ras1::openLog(logPath_);
        if (log == -1) return false;
        redirect(log);
        return true;
    }

    void limitLog(std::uint64_t bytes, int kept) {
        process_.store(::getpid(), std::memory_order_relaxed);
        kept_.store(kept, std::memory_order_relaxed);
        mostBytes_.store(bytes, std::memory_order_relaxed);
    }

    /// To be told of every line. The one that fills the file makes room for the next: its thread
    /// only, and nobody waits for it.
    void wrote(std::size_t bytes) {
        const std::uint64_t size = bytes_.fetch_add(bytes, std::memory_order_relaxed) + bytes;
        const std::uint64_t most = mostBytes_.load(std::memory_order_relaxed);
        if (most == 0 || size < most) return;
        // A child between fork and exec must not, and shares this memory with its parent.
        if (::getpid() != process_.load(std::memory_order_relaxed)) return;
        if (changing_.test_and_set(std::memory_order_acquire)) return;
        startOver();
        changing_.clear(std::memory_order_release);
    }

    void configureFromEnvironment() {
        const char* text = std::getenv("KBB_RAS1");
        const char* path = std::getenv("KBB_RAS1_LOG");
        configure(text != nullptr ? text : "", path != nullptr ? path : "");
    }

    const ras1::Selection& selection() const { return *selection_.load(std::memory_order_acquire); }
    int descriptor() const { return lines_.load(std::memory_order_relaxed); }
    void showSecrets(bool shown) { secretsShown_.store(shown, std::memory_order_relaxed); }
    bool showsSecrets() const { return secretsShown_.load(std::memory_order_relaxed); }
    bool readerMayGo() const { return readerMayGo_.load(std::memory_order_relaxed); }

private:
    /// Sends lines to `log`, which it takes over, or to standard error if `log` is -1. The number
    /// of the descriptor in use stays the same, so that a thread which is about to write finds one
    /// of the two files and never a third.
    void redirect(int log) {
        const int target = log != -1 ? log : standardError_;
        const int current = descriptor();
        if (current == -1) {
            lines_.store(log != -1 ? log : ras1::ownDescriptor(standardError_),
                         std::memory_order_relaxed);
        } else if (target == -1) {
            lines_.store(-1, std::memory_order_relaxed);
            ::close(current);
        } else {
            ::dup3(target, current, O_CLOEXEC);
            if (log != -1) ::close(log);
        }
        readerMayGo_.store(hasReader(descriptor()), std::memory_order_relaxed);
        bytes_.store(log != -1 ? ras1::sizeOf(descriptor()) : 0, std::memory_order_relaxed);
    }

    /// Lines go on to the old file, whatever it is called then, when no new one can be made.
    void startOver() {
        bytes_.store(0, std::memory_order_relaxed);
        if (logPath_.empty() || !ras1::shiftLogs(logPath_, kept_.load(std::memory_order_relaxed)))
            return;
        const int log = ras1::openLog(logPath_);
        if (log != -1) redirect(log);
    }

    /// The last one is in force; threads may still be reading earlier ones.
    std::vector<std::unique_ptr<const ras1::Selection>> selections_;
    std::atomic<const ras1::Selection*> selection_{nullptr};
    /// Set while somebody changes where lines go.
    std::atomic_flag changing_ = ATOMIC_FLAG_INIT;
    std::string logPath_;  ///< of whoever has set `changing_`
    const int standardError_ = ras1::ownDescriptor(STDERR_FILENO);
    std::atomic<int> lines_{-1};               ///< where lines go
    std::atomic<std::uint64_t> bytes_{0};      ///< in the log
    std::atomic<std::uint64_t> mostBytes_{0};  ///< 0: no limit
    std::atomic<int> kept_{0};
    std::atomic<pid_t> process_{0};
    std::atomic<bool> secretsShown_{false};
    std::atomic<bool> readerMayGo_{false};  ///< lines go to a pipe or a socket
};

Facility& facility() {
    static Facility& instance = *new Facility;  // immortal, see above
    return instance;
}

/// Opens the log and duplicates standard error at the start of the process, before it redirects
/// anything.
[[maybe_unused]] const Facility& startedEarly = facility();

// A unit that is heard traces more than is logged. Its flags then hold, above the bits that callers
// test, which levels are logged and which are heard. The mark stays when nobody listens any more,
// because a caller may have tested the old flags before.
constexpr unsigned kLoggedShift = 8;
constexpr unsigned kHeardShift = 16;
constexpr unsigned kMarked = 1U << 24;

unsigned flagsFor(const RAS1_UNIT& unit) {
    const unsigned logged = facility().selection().flagsOf(unit.name);
    const unsigned heard = ras1::Ears::ofProcess().levelsOf(unit.name);
    const unsigned marked = unit.flags.load(std::memory_order_relaxed) & kMarked;
    if (heard == 0 && marked == 0) return logged;
    return logged | heard | logged << kLoggedShift | heard << kHeardShift | kMarked;
}

/// Appends a number in decimal, with at least `width` digits.
char* putNumber(char* at, long long value, int width) {
    char digits[24];
    int count = 0;
    // The negation of the most negative value does not fit its type.
    unsigned long long rest = static_cast<unsigned long long>(value);
    if (value < 0) {
        *at++ = '-';
        rest = 0 - rest;
    }
    do {
        digits[count++] = static_cast<char>('0' + rest % 10);
        rest /= 10;
    } while (rest > 0);
    while (count < width)
        digits[count++] = '0';
    while (count > 0)
        *at++ = digits[--count];
    return at;
}

char* putText(char* at, const char* end, const char* text) {
    while (*text != '\0' && at < end)
        *at++ = *text++;
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

/// Writes everything that precedes a line's text; returns its length.
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

/// A text with line ends would look like several lines, and data could forge some. Line ends and
/// backslashes are therefore written as escapes. Trailing line feeds, which some texts have, are
/// dropped.
bool needsEscapes(const char* text, std::size_t length) {
    return std::memchr(text, '\n', length) != nullptr ||
           std::memchr(text, '\r', length) != nullptr || std::memchr(text, '\\', length) != nullptr;
}

/// Memory for an escaped text, not from the allocator, which a child must not call after fork.
class Scratch {
public:
    explicit Scratch(std::size_t size) : size_(size) {
        if (size <= sizeof small_) return;
        void* const mapped =
            ::mmap(nullptr, size, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
        at_ = mapped == MAP_FAILED ? nullptr : static_cast<char*>(mapped);
    }
    ~Scratch() {
        if (at_ != small_ && at_ != nullptr) ::munmap(at_, size_);
    }
    Scratch(const Scratch&) = delete;
    Scratch& operator=(const Scratch&) = delete;
    char* get() { return at_; }

private:
    const std::size_t size_;
    char small_[2048];
    char* at_ = small_;
};

std::size_t putEscaped(char* out, const char* text, std::size_t length) {
    char* at = out;
    for (std::size_t i = 0; i < length; ++i) {
        const char c = text[i];
        const bool special = c == '\n' || c == '\r' || c == '\\';
        if (special) *at++ = '\\';
        *at++ = c == '\n' ? 'n' : c == '\r' ? 'r' : c;
    }
    return static_cast<std::size_t>(at - out);
}

/// Keeps a write to a pipe without a reader from ending the process: blocks SIGPIPE in this thread
/// and discards one that arrived.
class SigpipeShield {
public:
    explicit SigpipeShield(bool wanted) : wanted_(wanted) {
        if (!wanted_) return;
        sigset_t pending;
        ::sigemptyset(&pipe_);
        ::sigaddset(&pipe_, SIGPIPE);
        ::sigpending(&pending);
        wasPending_ = ::sigismember(&pending, SIGPIPE) == 1;
        ::pthread_sigmask(SIG_BLOCK, &pipe_, &before_);
    }
    ~SigpipeShield() {
        if (!wanted_) return;
        const timespec now{};
        if (!wasPending_) {
            while (::sigtimedwait(&pipe_, nullptr, &now) == -1 && errno == EINTR) {
            }
        }
        ::pthread_sigmask(SIG_SETMASK, &before_, nullptr);
    }
    SigpipeShield(const SigpipeShield&) = delete;
    SigpipeShield& operator=(const SigpipeShield&) = delete;

private:
    const bool wanted_;
    bool wasPending_ = false;
    sigset_t pipe_{};
    sigset_t before_{};
};

void writeLine(const RAS1_BLOCK& block, char letter, int line, const char* text,
               std::size_t length) {
    const int savedErrno = errno;
    char head[256];
    const std::size_t headLength = putHead(head, block, letter, line);
    char newline = '\n';
    iovec parts[3] = {{head, headLength}, {const_cast<char*>(text), length}, {&newline, 1}};
    {
        const SigpipeShield shield(facility().readerMayGo());
        ssize_t written;
        while ((written = ::writev(facility().descriptor(), parts, 3)) == -1 && errno == EINTR) {
        }
        if (written > 0) facility().wrote(static_cast<std::size_t>(written));
    }
    errno = savedErrno;
}

void writeEscaped(const RAS1_BLOCK& block, char letter, int line, const char* text,
                  std::size_t length) {
    while (length > 0 && text[length - 1] == '\n')
        --length;
    if (!needsEscapes(text, length)) {
        writeLine(block, letter, line, text, length);
        return;
    }
    Scratch safe(length * 2);
    if (safe.get() == nullptr) return;
    writeLine(block, letter, line, safe.get(), putEscaped(safe.get(), text, length));
}

void writeText(const RAS1_BLOCK& block, char letter, int line, const char* text,
               std::size_t length) {
    if (facility().showsSecrets()) {
        writeEscaped(block, letter, line, text, length);
        return;
    }
    const ras1::Masking masking(block.unit->name, text, length);
    if (!masking.changes()) {
        writeEscaped(block, letter, line, text, length);
        return;
    }
    Scratch masked(masking.length());
    if (masked.get() == nullptr) return;
    masking.put(masked.get());
    writeEscaped(block, letter, line, masked.get(), masking.length());
}

void tell(const RAS1_BLOCK& block, unsigned level, const char* text, std::size_t length) {
    const int savedErrno = errno;
    ras1::Ears::ofProcess().tell({block.unit->name, block.function, level, text, length});
    errno = savedErrno;
}

/// Takes a line to those who want it: the log, a listener, or both.
void passOn(const RAS1_BLOCK& block, unsigned level, int line, const char* text,
            std::size_t length) {
    const unsigned flags = block.unit->flags.load(std::memory_order_relaxed);
    const bool marked = (flags & kMarked) != 0;
    if (marked && (flags >> kHeardShift & level) != 0) tell(block, level, text, length);
    if (marked && (flags >> kLoggedShift & level) == 0) return;
    writeText(block, level == RAS1_ERROR ? 'E' : 'D', line, text, length);
}

}  // namespace

unsigned RAS1_Sync(RAS1_UNIT* unit) {
    const unsigned generation = RAS1_Generation.load(std::memory_order_acquire);
    const unsigned flags = flagsFor(*unit);
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
    const char* const at = putNumber(text + 5, value, 1);
    writeLine(*block, 'F', line, text, static_cast<std::size_t>(at - text));
}

void RAS1_Printf(const RAS1_BLOCK* block, unsigned level, int line, const char* format, ...) {
    std::va_list arguments;
    va_start(arguments, format);
    if (std::strcmp(format, "%s") == 0) {
        const char* const given = va_arg(arguments, const char*);
        const char* const text = given != nullptr ? given : "(null)";
        passOn(*block, level, line, text, std::strlen(text));
    } else {
        char buffer[1024];
        std::va_list again;
        va_copy(again, arguments);
        const int length = std::vsnprintf(buffer, sizeof buffer, format, arguments);
        if (length >= 0 && static_cast<std::size_t>(length) < sizeof buffer) {
            passOn(*block, level, line, buffer, static_cast<std::size_t>(length));
        } else if (length >= 0) {
            std::string whole(static_cast<std::size_t>(length) + 1, '\0');
            std::vsnprintf(whole.data(), whole.size(), format, again);
            passOn(*block, level, line, whole.data(), static_cast<std::size_t>(length));
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

bool reopenLog() {
    return facility().reopenLog();
}

void limitLog(std::uint64_t bytes, int kept) {
    facility().limitLog(bytes, kept);
}

void configureFromEnvironment() {
    facility().configureFromEnvironment();
    ++RAS1_Generation;
}

void showSecrets(bool shown) {
    facility().showSecrets(shown);
}

}  // namespace ras1
