#include "platform/ras1.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "embedded/ras1_control.h"
#include "ras1/selection.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::MatchesRegex;

constexpr unsigned kAll = RAS1_DETAIL | RAS1_FLOW | RAS1_ERROR;

RAS1_UNIT unit{"zavsample"};
const RAS1_BLOCK block{&unit, "doWork"};

struct SelectionCase {
    std::string text;
    unsigned sample;  ///< flags of the unit "zavsample"
    unsigned other;   ///< flags of the unit "zavother"
};

class Selection : public testing::TestWithParam<SelectionCase> {};

TEST_P(Selection, GivesEachUnitItsFlags) {
    const ras1::Selection selection = ras1::parseSelection(GetParam().text);
    EXPECT_EQ(selection.flagsOf("zavsample"), GetParam().sample) << GetParam().text;
    EXPECT_EQ(selection.flagsOf("zavother"), GetParam().other) << GetParam().text;
}

INSTANTIATE_TEST_SUITE_P(
    Forms, Selection,
    testing::Values(
        SelectionCase{"", RAS1_ERROR, RAS1_ERROR}, SelectionCase{"ERROR", RAS1_ERROR, RAS1_ERROR},
        SelectionCase{"ALL", kAll, kAll},
        SelectionCase{"DETAIL", RAS1_DETAIL | RAS1_ERROR, RAS1_DETAIL | RAS1_ERROR},
        SelectionCase{"FLOW DETAIL", kAll, kAll}, SelectionCase{"nonsense", RAS1_ERROR, RAS1_ERROR},
        SelectionCase{"ERROR (UNIT:zavsample ALL)", kAll, RAS1_ERROR},
        SelectionCase{"ERROR(UNIT:zavsample ALL)(UNIT:zavo FLOW)", kAll, RAS1_FLOW | RAS1_ERROR},
        SelectionCase{"ALL (UNIT:zavsample)", 0, kAll},
        SelectionCase{"(UNIT:zavsample DETAIL) ALL", RAS1_DETAIL | RAS1_ERROR, kAll},
        SelectionCase{"ERROR (UNIT:zavs ALL) (UNIT:zavsample ERROR)", kAll, RAS1_ERROR},
        SelectionCase{"ERROR (UNIT:zavsample ALL", kAll, RAS1_ERROR},
        SelectionCase{"ERROR (COMP:x ALL) ()", RAS1_ERROR, RAS1_ERROR},
        SelectionCase{") ( ((", RAS1_ERROR, RAS1_ERROR}));

TEST(Line, CarriesTimeThreadLevelPlaceAndText) {
    const ScratchDir scratch;
    ras1::configure("ALL", scratch.path("log"));
    RAS1_Printf(&block, RAS1_ERROR, 42, "%d files in %s", 3, "depot");
    ras1::configureFromEnvironment();
    EXPECT_THAT(scratch.read("log"),
                MatchesRegex("20[0-9][0-9]-[01][0-9]-[0-3][0-9] [0-2][0-9]:[0-5][0-9]:[0-6][0-9]\\."
                             "[0-9][0-9][0-9][0-9][0-9][0-9] [0-9]+ E zavsample:42 doWork: "
                             "3 files in depot\n"));
}

TEST(Line, ItsDateIsTheCalendars) {
    const ScratchDir scratch;
    ras1::configure("ALL", scratch.path("log"));
    const time_t before = ::time(nullptr);
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "x");
    const time_t after = ::time(nullptr);
    ras1::configureFromEnvironment();
    const std::string seconds = scratch.read("log").substr(0, 19);
    char first[32], last[32];
    tm parts{};
    std::strftime(first, sizeof first, "%Y-%m-%d %H:%M:%S", ::gmtime_r(&before, &parts));
    std::strftime(last, sizeof last, "%Y-%m-%d %H:%M:%S", ::gmtime_r(&after, &parts));
    EXPECT_GE(seconds, first);
    EXPECT_LE(seconds, last);
}

TEST(Line, EventsHaveTheirOwnLetter) {
    const TraceCapture trace;
    RAS1_Entry(&block, 1);
    RAS1_Printf(&block, RAS1_DETAIL, 2, "%s", "found");
    RAS1_Exit(&block, 3);
    RAS1_ExitValue(&block, 4, 17);
    RAS1_ExitValue(&block, 5, -17);
    RAS1_ExitValue(&block, 6, LONG_MIN);
    std::string letters;
    std::vector<std::string> texts;
    for (const TraceLine& line : trace.lines()) {
        letters += line.level;
        texts.push_back(line.text);
        EXPECT_EQ(line.unit, "zavsample");
        EXPECT_EQ(line.function, "doWork");
    }
    EXPECT_EQ(letters, "FDFFFF");
    EXPECT_THAT(texts, ElementsAre("Entry", "found", "Exit", "Exit 17", "Exit -17",
                                   "Exit " + std::to_string(LONG_MIN)));
}

TEST(Line, LineEndsInATextStayInOneLine) {
    const TraceCapture trace;
    const std::string text = "one\ntwo\r\nC:\\dir";
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", (text + "\n\n").c_str());
    RAS1_Printf(&block, RAS1_ERROR, 1, "<%s>", text.c_str());
    EXPECT_THAT(trace.errors(), ElementsAre(text, "<" + text + ">"));
}

TEST(Line, TextsOfAnyLengthAreWrittenWhole) {
    const TraceCapture trace;
    std::vector<std::string> expected;
    for (const std::size_t length : {0U, 1U, 1023U, 1024U, 1025U, 4096U, 100000U}) {
        const std::string plain(length, 'x');
        std::string escaped = plain;
        for (std::size_t i = 0; i + 1 < length; i += 2)
            escaped[i] = '\\';
        RAS1_Printf(&block, RAS1_ERROR, 1, "%s", plain.c_str());
        RAS1_Printf(&block, RAS1_ERROR, 1, "%s:", plain.c_str());
        RAS1_Printf(&block, RAS1_ERROR, 1, "%s", escaped.c_str());
        expected.insert(expected.end(), {plain, plain + ":", escaped});
    }
    EXPECT_EQ(trace.errors(), expected);
}

TEST(Line, ANullTextIsSaidToBeOne) {
    const TraceCapture trace;
    const char* const nothing = ::getenv("ZAV_NO_SUCH_VARIABLE");
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", nothing);
    EXPECT_THAT(trace.errors(), ElementsAre("(null)"));
}

TEST(Line, LongNamesDoNotOverrunTheHead) {
    static const std::string longName(500, 'u');
    static RAS1_UNIT longUnit{longName.c_str()};
    const RAS1_BLOCK longBlock{&longUnit, longName.c_str()};
    const TraceCapture trace;
    RAS1_Printf(&longBlock, RAS1_ERROR, INT_MAX, "%s", "text");
    ASSERT_EQ(trace.lines().size(), 1U);
}

TEST(Line, LeavesErrnoAlone) {
    const TraceCapture trace;
    errno = EXDEV;
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "text");
    EXPECT_EQ(errno, EXDEV);
}

TEST(Line, AChildBetweenForkAndExecTraces) {
    const TraceCapture trace;
    const pid_t child = ::fork();
    if (child == 0) {
        RAS1_Printf(&block, RAS1_DETAIL, 1, "%s", "in the\nchild");
        ::_exit(0);
    }
    ASSERT_EQ(::waitpid(child, nullptr, 0), child);
    EXPECT_THAT(trace.details(), ElementsAre("in the\nchild"));
}

TEST(Flags, FollowTheSelectionInForce) {
    {
        const TraceCapture trace("ERROR (UNIT:zavsample DETAIL)");
        EXPECT_EQ(RAS1_Flags(unit), RAS1_DETAIL | RAS1_ERROR);
    }
    {
        const TraceCapture trace("ALL");
        EXPECT_EQ(RAS1_Flags(unit), kAll);
    }
}

TEST(Flags, ErrorsAreOnUnlessTheEnvironmentSaysMore) {
    ::unsetenv("KBB_RAS1");
    ras1::configureFromEnvironment();
    EXPECT_EQ(RAS1_Flags(unit), unsigned{RAS1_ERROR});
    ::setenv("KBB_RAS1", "ALL", 1);
    ras1::configureFromEnvironment();
    EXPECT_EQ(RAS1_Flags(unit), kAll);
    ::unsetenv("KBB_RAS1");
    ras1::configureFromEnvironment();
}

TEST(Log, IsTheFileThatTheEnvironmentNamesAndIsAppendedTo) {
    const ScratchDir scratch;
    scratch.write("log", "before\n");
    ::setenv("KBB_RAS1_LOG", scratch.path("log").c_str(), 1);
    ras1::configureFromEnvironment();
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "text");
    ::unsetenv("KBB_RAS1_LOG");
    ras1::configureFromEnvironment();
    EXPECT_THAT(scratch.read("log"), MatchesRegex("before\n.* doWork: text\n"));
}

/// Runs `body` in a child of this process; its exit status.
template <typename Body>
int inChild(Body body) {
    const pid_t child = ::fork();
    if (child == 0) {
        body();
        ::_exit(0);
    }
    int status = 0;
    EXPECT_EQ(::waitpid(child, &status, 0), child);
    return status;
}

TEST(Log, IsOpenedAnewUnderItsNameAfterItWasRenamed) {
    ScratchDir scratch;
    const std::string log = scratch.path("log");
    ras1::configure("ERROR", log);
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "first");
    ASSERT_EQ(std::rename(log.c_str(), scratch.path("old").c_str()), 0);
    EXPECT_TRUE(ras1::reopenLog());
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "second");
    EXPECT_THAT(scratch.read("old"), MatchesRegex("[^\n]*first\n"));
    EXPECT_THAT(scratch.read("log"), MatchesRegex("[^\n]*second\n"));
    ras1::configureFromEnvironment();
}

TEST(Log, GoesOnInTheOldFileWhenItCannotBeOpenedAnew) {
    ScratchDir scratch;
    const std::string log = scratch.write("dir/log", "");
    ras1::configure("ERROR", log);
    ASSERT_EQ(std::rename(scratch.path("dir").c_str(), scratch.path("moved").c_str()), 0);
    EXPECT_FALSE(ras1::reopenLog());
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "still");
    EXPECT_THAT(scratch.read("moved/log"), MatchesRegex("[^\n]*still\n"));
    ras1::configureFromEnvironment();
}

/// The number of lines in a file, each of which must be whole.
std::size_t wholeLines(const std::string& text) {
    std::size_t count = 0;
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line); ++count)
        EXPECT_THAT(line, MatchesRegex(".* E .*: line [0-9]+"));
    EXPECT_TRUE(text.empty() || text.back() == '\n');
    return count;
}

class ALimitedLog : public testing::Test {
protected:
    ALimitedLog() {
        ras1::limitLog(4096, 3);
        ras1::configure("ERROR", scratch_.path("log"));
    }
    ~ALimitedLog() override {
        ras1::limitLog(0, 3);
        ras1::configureFromEnvironment();
    }
    static void trace(int lines) {
        for (int i = 0; i < lines; ++i)
            RAS1_Printf(&block, RAS1_ERROR, 1, "line %d", i);
    }
    ScratchDir scratch_;
};

TEST_F(ALimitedLog, IsBegunAnewAndThreeOlderOnesAreKept) {
    trace(1000);
    for (const char* name : {"log.1", "log.2", "log.3"}) {
        const std::string text = scratch_.read(name);
        EXPECT_GE(text.size(), 4096U) << name;
        EXPECT_LT(text.size(), 4096U + 200U) << name;
        wholeLines(text);
    }
    EXPECT_LT(scratch_.read("log").size(), 4096U);
    EXPECT_FALSE(scratch_.exists("log.4"));
    EXPECT_THAT(scratch_.read("log.1") + scratch_.read("log"), HasSubstr("line 999\n"));
}

TEST_F(ALimitedLog, LosesNoLineWhenManyThreadsFillIt) {
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i)
        threads.emplace_back([] { trace(40); });
    for (std::thread& thread : threads)
        thread.join();
    std::size_t lines = 0;
    for (const char* name : {"log", "log.1", "log.2", "log.3"}) {
        if (scratch_.exists(name)) lines += wholeLines(scratch_.read(name));
    }
    EXPECT_EQ(lines, 160U);
}

TEST_F(ALimitedLog, IsNotRenamedByAChild) {
    EXPECT_EQ(inChild([] { trace(100); }), 0);
    EXPECT_FALSE(scratch_.exists("log.1"));
    trace(100);
    EXPECT_TRUE(scratch_.exists("log.1"));
}

TEST_F(ALimitedLog, GrowsOnWhereItCannotBeRenamed) {
    scratch_.makeDir("log.1/full");
    trace(200);
    EXPECT_EQ(wholeLines(scratch_.read("log")), 200U);
}

TEST(Log, MayBeTheNullDeviceWhateverItsLimit) {
    ras1::limitLog(1, 3);
    ras1::configure("ERROR", "/dev/null");
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "text");
    RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "text");
    struct stat found {};
    ASSERT_EQ(::lstat("/dev/null", &found), 0);
    EXPECT_TRUE(S_ISCHR(found.st_mode));
    ras1::limitLog(0, 3);
    ras1::configureFromEnvironment();
}

TEST(Log, NeverTakesTheNumberOfAStandardStream) {
    const ScratchDir scratch;
    const int status = inChild([&] {
        ::close(0);
        ::close(1);
        ::close(2);
        ras1::configure("ALL", scratch.path("log"));
        RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "written");
        ::_exit(::fcntl(0, F_GETFD) == -1 && ::fcntl(1, F_GETFD) == -1 && ::fcntl(2, F_GETFD) == -1
                    ? 0
                    : 1);
    });
    EXPECT_EQ(status, 0);
    EXPECT_THAT(scratch.read("log"), MatchesRegex(".* doWork: written\n"));
}

TEST(Log, IsNotInheritedByPrograms) {
    const ScratchDir scratch;
    ras1::configure("ALL", scratch.path("log"));
    const std::string listing = scratch.script("list", "ls -l /proc/self/fd > \"$1\"");
    const std::string out = scratch.path("out");
    EXPECT_EQ(inChild([&] {
                  ::execl(listing.c_str(), listing.c_str(), out.c_str(), nullptr);
                  ::_exit(1);
              }),
              0);
    ras1::configureFromEnvironment();
    EXPECT_EQ(scratch.read("out").find(scratch.path("log")), std::string::npos);
}

/// Puts `descriptor` in the place of standard error and of every duplicate of it.
void becomeStandardError(int descriptor) {
    const auto target = [](int fd) {
        char name[PATH_MAX] = "";
        const std::string link = "/proc/self/fd/" + std::to_string(fd);
        return ::readlink(link.c_str(), name, sizeof name - 1) > 0 ? std::string(name) : "";
    };
    const std::string before = target(STDERR_FILENO);
    for (int fd = STDERR_FILENO; fd < 256; ++fd) {
        if (fd != descriptor && target(fd) == before) ::dup3(descriptor, fd, O_CLOEXEC);
    }
}

TEST(Log, APipeWithoutAReaderCostsTheProcessNothing) {
    const int status = inChild([&] {
        ::signal(SIGPIPE, SIG_DFL);
        int ends[2];
        if (::pipe2(ends, O_CLOEXEC) != 0) ::_exit(2);
        ::close(ends[0]);
        becomeStandardError(ends[1]);
        ras1::configure("ALL", "");
        RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "nobody reads this");
        sigset_t left;
        ::sigpending(&left);
        ::_exit(::sigismember(&left, SIGPIPE));
    });
    EXPECT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 0);
}

/// What reaches standard error when the log is to be `path`.
std::string standardErrorWithLog(const ScratchDir& scratch, const std::string& path) {
    const std::string errors = scratch.write("errors", "");
    EXPECT_EQ(inChild([&] {
                  becomeStandardError(::open(errors.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC));
                  ras1::configure("ALL", path);
                  RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "written");
                  ::_exit(0);
              }),
              0);
    return scratch.read("errors");
}

TEST(Log, ALinkIsNotFollowed) {
    const ScratchDir scratch;
    const std::string target = scratch.write("target", "untouched");
    ASSERT_EQ(::symlink(target.c_str(), scratch.path("log").c_str()), 0);
    EXPECT_THAT(standardErrorWithLog(scratch, scratch.path("log")),
                MatchesRegex(".* doWork: written\n"));
    EXPECT_EQ(scratch.read("target"), "untouched");
}

TEST(Log, IsForItsOwnerAloneWhateverTheMask) {
    const ScratchDir scratch;
    const std::string log = scratch.path("log");
    EXPECT_EQ(inChild([&] {
                  ::umask(0);
                  ras1::configure("ALL", log);
                  RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "written");
                  ::_exit(0);
              }),
              0);
    struct stat found {};
    ASSERT_EQ(::stat(log.c_str(), &found), 0);
    EXPECT_EQ(found.st_mode, S_IFREG | 0600U);
}

TEST(Log, APipeOrADeviceIsNoLogAndIsNotWaitedFor) {
    const ScratchDir scratch;
    ASSERT_EQ(::mkfifo(scratch.path("pipe").c_str(), 0600), 0);
    for (const std::string& path : {scratch.path("pipe"), std::string("/dev/zero")}) {
        EXPECT_THAT(standardErrorWithLog(scratch, path), MatchesRegex(".* doWork: written\n"))
            << path;
    }
    const int reader = ::open(scratch.path("pipe").c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    EXPECT_THAT(standardErrorWithLog(scratch, scratch.path("pipe")),
                MatchesRegex(".* doWork: written\n"));
    ::close(reader);
}

TEST(Log, TheNullDeviceMeansNoLog) {
    const ScratchDir scratch;
    EXPECT_EQ(standardErrorWithLog(scratch, "/dev/null"), "");
}

}  // namespace
