#include "host/commands/recorder.h"

#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <ctime>
#include <system_error>
#include <thread>
#include <utility>

#include "host/commands/child_end.h"
#include "host/commands/restart_output.h"
#include "host/commands/trace_texts.h"
#include "host/process/children/descendants.h"
#include "host/process/children/orphans.h"

namespace host {
namespace {

constexpr std::size_t kMostCommands = 64;
constexpr std::size_t kLongestLine = std::size_t{16} * 1024;

/// What an ended command left in its pipes may still be read.
constexpr std::uint64_t kLeftInPipes = std::uint64_t{256} * 1024;
constexpr std::uint64_t kUsualOutput = std::uint64_t{16} << 20;

std::atomic<bool> endsDescendants{false};
std::atomic<std::uint64_t> mostOutput{kUsualOutput};

bool begins(std::string_view text, std::string_view with) {
    return text.substr(0, with.size()) == with;
}

bool contains(std::string_view text, std::string_view word) {
    return text.find(word) != std::string_view::npos;
}

/// The rest of a text that begins so; nothing if it does not.
std::optional<std::string_view> after(std::string_view text, std::string_view beginning) {
    if (!begins(text, beginning)) return std::nullopt;
    return text.substr(beginning.size());
}

int numberInLine(std::string_view text) {
    int number = 0;
    std::from_chars(text.data(), text.data() + text.size(), number);
    return number;
}

std::string reason(const char* what, int error) {
    return std::string(what) + ": " + std::generic_category().message(error);
}

std::int64_t nanoseconds() {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    return std::int64_t{now.tv_sec} * 1'000'000'000 + now.tv_nsec;
}

WallClock::time_point wallTime(std::int64_t sinceEpoch) {
    return WallClock::time_point(
        std::chrono::duration_cast<WallClock::duration>(std::chrono::nanoseconds(sinceEpoch)));
}

/// The number of the pipe behind a descriptor; 0 if there is none. A child between fork and exec
/// may call it.
std::uint64_t pipeOf(int descriptor) {
    struct stat file {};
    return ::fstat(descriptor, &file) == 0 && S_ISFIFO(file.st_mode) ? file.st_ino : 0;
}

/// Not before: a line tells where the output of an install goes.
void maskLines(std::vector<Command>& commands) {
    for (Command& command : commands)
        command.line = secrets::masked(command.line);
}

}  // namespace

void endWhatGivenUpCommandsStarted() {
    endsDescendants.store(true);
}

void limitOutput(std::uint64_t bytes) {
    mostOutput.store(bytes);
}

void Recorder::hear(const ras1::HeardLine& line) noexcept {
    const std::string_view text(line.text, line.length);
    if (hearInChild(line, text)) return;
    try {
        const std::string_view unit = line.unit;
        if (unit == trace::kRunnerUnit) {
            hearRunner(text);
        } else if (unit == trace::kProcessUnit) {
            hearProcess(line, text);
        } else if (const auto answer = after(text, trace::kAnswer)) {
            const embedded::MutexLock lock(lock_);
            others_.answer = numberInLine(*answer);
        } else if (begins(text, trace::kNoInventory)) {
            const embedded::MutexLock lock(lock_);
            others_.noInventory = true;
        }
    } catch (...) {
        // For want of memory something stays unknown. The command itself must not suffer.
    }
}

bool Recorder::hearInChild(const ras1::HeardLine& line, std::string_view text) {
    const int error = errno;
    if (std::string_view(line.unit) != trace::kProcessUnit) return false;
    if (const auto pid = after(text, trace::kInChild)) {
        notes_.started.store(nanoseconds());
        notes_.pid.store(numberInLine(*pid));
        // Looked at after the process can be seen: who ends commands sees it, or it sees that.
        if (ending_.wanted.load() || ending_.tooMuch.load()) {
            ending_.reached.store(true);
            ::kill(::getpid(), SIGKILL);
        }
        return true;
    }
    if (begins(text, trace::kConnected)) {
        notes_.out.store(pipeOf(STDOUT_FILENO));
        notes_.err.store(pipeOf(STDERR_FILENO));
        return true;
    }
    if (begins(text, trace::kNotConnected)) {
        notes_.notConnected.store(true);
        return true;
    }
    if (begins(text, trace::kNotExecuted)) {
        notes_.notExecuted.store(error);
        return true;
    }
    return false;
}

void Recorder::hearRunner(std::string_view text) {
    if (const auto command = after(text, trace::kCommand)) {
        begin(command->substr(0, command->rfind(trace::kCommandEnd)));
    } else if (const auto out = after(text, trace::kOutput)) {
        keep(*out, false);
    } else if (const auto errors = after(text, trace::kErrors)) {
        keep(*errors, true);
    } else if (begins(text, trace::kNotStarted)) {
        close({});
    } else if (begins(text, trace::kTimedOut)) {
        {
            const embedded::MutexLock lock(lock_);
            if (open_) commands_.back().timedOut = true;
        }
        close({});
    } else if (const auto good = after(text, trace::kGoodEnd)) {
        close(*good);
    } else if (const auto bad = after(text, trace::kBadEnd)) {
        close(*bad);
    }
}

void Recorder::hearProcess(const ras1::HeardLine& line, std::string_view text) {
    if (const auto seconds = after(text, trace::kTimeout)) {
        timeout_ = std::chrono::seconds(std::max(0, numberInLine(*seconds)));
        const embedded::MutexLock lock(lock_);
        deadline_ = began_ + timeout_;
    } else if (const auto pid = after(text, trace::kWaiting)) {
        waitForEnd(numberInLine(*pid), line.function == trace::kGivesUp);
    } else if (const auto givenUp = after(text, trace::kGivenUp)) {
        if (endsDescendants.load()) killDescendants(numberInLine(*givenUp), orphansBefore_);
    } else if (const auto program = after(text, trace::kNoProgram)) {
        const std::string path(*program);
        const int error = ::access(path.c_str(), X_OK) == 0 ? 0 : errno;
        const embedded::MutexLock lock(lock_);
        if (open_) commands_.back().error = reason(path.c_str(), error);
    }
}

void Recorder::begin(std::string_view line) {
    if (endsDescendants.load()) orphansBefore_ = orphans();
    // Before the plug-in's own clock starts: the wait below must not outlast the plug-in's.
    began_ = std::chrono::steady_clock::now();
    notes_.pid.store(0);
    notes_.started.store(0);
    notes_.out.store(0);
    notes_.err.store(0);
    notes_.notExecuted.store(0);
    notes_.notConnected.store(false);
    const embedded::MutexLock lock(lock_);
    if (commands_.empty()) orphansBeforeFirst_ = orphansBefore_;
    if (commands_.size() == kMostCommands) commands_.pop_front();
    reaped_ = false;
    thread_ = static_cast<pid_t>(::syscall(SYS_gettid));
    Command& command = commands_.emplace_back();
    open_ = true;
    deadline_.reset();
    static std::atomic<std::uint64_t> commandsHeard{0};
    command.number = ++commandsHeard;
    hidesOutput_ =
        contains(line, trace::kReadsConfiguration) || contains(line, trace::kWritesConfiguration);
    out_ = {};
    err_ = {};
    command.line = line.substr(0, kLongestLine);
    command.started = WallClock::now();
    others_.output.clear();
    others_.outputComplete = true;
}

/// The plug-in holds all that its command writes in memory, several times over.
void Recorder::count(std::size_t bytes) {
    written_ += bytes;
    const std::uint64_t most = mostOutput.load();
    if (written_ <= most) return;
    if (!ending_.tooMuch.exchange(true)) mostRead_ = most + kLeftInPipes;
    endForOutput();
    if (written_ > mostRead_) endWriters();
}

/// What still writes has made a session of its own and kept the command's pipes; an agent that has
/// left its starter properly has not. The plug-in would read on until the command's time is over.
/// Who cannot be ended is not read until then: that would fill the memory.
void Recorder::endWriters() {
    constexpr std::chrono::milliseconds kBetweenLooks{50};
    const std::set<ino_t> pipes = pipesOfCommand();
    while (haveWriters(pipes)) {
        killWritersTo(pipes);
        const auto now = std::chrono::steady_clock::now();
        if (now >= began_ + timeout_) return;
        std::this_thread::sleep_until(std::min(now + kBetweenLooks, began_ + timeout_));
    }
    mostRead_ = written_ + kLeftInPipes;
}

/// As its child has said. One that has a memory of its own cannot, and is looked at while it lives.
std::set<ino_t> Recorder::pipesOfCommand() const {
    std::set<ino_t> pipes;
    for (const std::uint64_t pipe : {notes_.out.load(), notes_.err.load()}) {
        if (pipe != 0) pipes.insert(static_cast<ino_t>(pipe));
    }
    if (!pipes.empty()) return pipes;
    withCommandInHand([&pipes](pid_t command) {
        if (command != 0) pipes = pipesToWrite(command);
    });
    return pipes;
}

/// Kills at once: what a command writes while it makes up its mind would fill the memory.
void Recorder::endForOutput() {
    constexpr int kMostRounds = 1000;
    Descendants descendants(orphansBeforeFirst().value_or(std::vector<pid_t>()));
    for (int round = 0; round < kMostRounds; ++round) {
        bool goOn = false;
        withCommandInHand([&](pid_t command) {
            descendants.look(command, true);
            goOn = descendants.kill();
        });
        if (!goOn) return;
    }
}

void Recorder::keep(std::string_view text, bool isError) {
    std::string shown;
    const std::optional<OutputPiece> piece = store(text, isError, shown);
    if (!piece) return;
    if (sink_ && !shown.empty()) sink_(*piece);
    count(text.size());
}

/// Sets `shown` to what of the text may be kept and shown; the piece that it returns is that.
std::optional<OutputPiece> Recorder::store(std::string_view text, bool isError,
                                           std::string& shown) {
    const embedded::MutexLock lock(lock_);
    if (!open_) return std::nullopt;
    Command& command = commands_.back();
    shown = isError ? err_.feed(text) : hidesOutput_ ? std::string() : out_.feed(text);
    Tail& tail = isError ? command.err : command.out;
    tail.append(shown);
    if (!isError && outputBytes_ != 0) keepWhole(text);
    return OutputPiece{command.number, isError, shown, tail.total()};
}

void Recorder::keepWhole(std::string_view text) {
    const std::size_t room = outputBytes_ - others_.output.size();
    others_.output.append(text.substr(0, room));
    if (text.size() > room) others_.outputComplete = false;
}

void Recorder::waitForEnd(pid_t pid, bool onlyLook) {
    {
        const embedded::MutexLock lock(lock_);
        if (!open_ || pid <= 0) return;
    }
    const auto until = onlyLook ? std::chrono::steady_clock::now() : began_ + timeout_;
    const std::optional<ChildEnd> end = awaitChildEnd(pid, until);
    const embedded::MutexLock lock(lock_);
    reaped_ = true;  // as soon as the plug-in goes on
    Command& command = commands_.back();
    command.pid = pid;
    if (!end) return;
    command.ended = WallClock::now();
    (end->bySignal ? command.signal : command.exit) = end->number;
    // Where the child has a memory of its own, this is all that shows.
    if (end->bySignal && ending_.wanted.load()) ending_.reached.store(true);
}

void Recorder::close(std::string_view status) {
    const embedded::MutexLock lock(lock_);
    if (!open_) return;
    open_ = false;
    Command& command = commands_.back();
    command = withNotes(command);
    addRestartOutput(command);
    if (!command.ended) command.ended = WallClock::now();
    if (const int error = notes_.notExecuted.load()) {
        command.error = reason("cannot be executed", error);
        command.executedNothing = true;
    } else if (notes_.notConnected.load()) {
        command.error = "its standard streams could not be connected";
    }
    if (command.timedOut && !command.exit) command.signal = SIGKILL;
    if (!command.error.empty()) {
        command.exit.reset();
        command.signal.reset();
    } else if (!command.exit && !command.signal && !status.empty()) {
        command.exit = numberInLine(status);
    } else if (!command.exit && !command.signal) {
        command.error = "could not be started";
    }
}

Command Recorder::withNotes(const Command& command) const {
    Command whole = command;
    if (const pid_t pid = notes_.pid.load()) whole.pid = pid;
    if (const std::int64_t started = notes_.started.load()) whole.started = wallTime(started);
    return whole;
}

Heard Recorder::take() {
    const embedded::MutexLock lock(lock_);
    Heard heard = std::exchange(others_, {});
    heard.commands.assign(std::make_move_iterator(commands_.begin()),
                          std::make_move_iterator(commands_.end()));
    commands_.clear();
    open_ = false;
    written_ = 0;
    mostRead_ = 0;
    heard.tooMuchOutput = ending_.tooMuch.exchange(false);
    maskLines(heard.commands);
    return heard;
}

void Recorder::endCommands() {
    ending_.reached.store(false);
    ending_.wanted.store(true);
}

bool Recorder::letCommandsRun() {
    ending_.wanted.store(false);
    return ending_.reached.exchange(false);
}

void Recorder::withCommandInHand(const std::function<void(pid_t)>& look) const {
    const embedded::MutexLock lock(lock_);
    look(commandInHand());
}

std::optional<std::chrono::steady_clock::time_point> Recorder::deadline() const {
    const embedded::MutexLock lock(lock_);
    return open_ ? deadline_ : std::nullopt;
}

/// Where a child has a memory of its own, it cannot say which it is.
pid_t Recorder::commandInHand() const {
    if (!open_ || reaped_) return 0;
    if (const pid_t pid = notes_.pid.load()) return pid;
    const std::vector<pid_t> children = childrenOf(thread_);
    return children.empty() ? 0 : children.front();
}

std::optional<std::vector<pid_t>> Recorder::orphansBeforeFirst() const {
    const embedded::MutexLock lock(lock_);
    if (commands_.empty()) return std::nullopt;
    return orphansBeforeFirst_;
}

std::vector<Command> Recorder::commands() const {
    embedded::MutexLock lock(lock_);
    std::vector<Command> found(commands_.begin(), commands_.end());
    const bool running = open_;
    if (running) found.back() = withNotes(found.back());
    lock.unlock();
    if (running) addRestartOutput(found.back());
    lock.lock();
    maskLines(found);
    return found;
}

}  // namespace host
