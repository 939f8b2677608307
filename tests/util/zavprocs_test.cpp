#include "util/zavprocs.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <pwd.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "platform/fsi1.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"

using namespace ZAV;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

std::vector<std::string> split(const char* text) {
    const String command(text);
    char** arguments = nullptr;
    const int count = MakeArgv(&command, &arguments);
    std::vector<std::string> result;
    for (int i = 0; i < count; ++i) {
        result.emplace_back(arguments[i]);
        std::free(arguments[i]);
    }
    EXPECT_EQ(arguments[count], nullptr);
    std::free(arguments);
    return result;
}

struct TwoEnds {
    FileDescriptor readEnd;
    FileDescriptor writeEnd;
};

TwoEnds makePipe() {
    int ends[2];
    EXPECT_EQ(::pipe2(ends, O_CLOEXEC), 0);
    return {FileDescriptor(ends[0]), FileDescriptor(ends[1])};
}

std::unique_ptr<user_s_t, decltype(&std::free)> token(const char* user, const char* group) {
    return {create_user_token(user, group, nullptr), &std::free};
}

}  // namespace

TEST(MakeArgv, SplitsAtBlanksAndGroupsWithQuotes) {
    EXPECT_THAT(split("/bin/sh -c 'echo a b'"), ElementsAre("/bin/sh", "-c", "echo a b"));
    EXPECT_THAT(split("/bin/sh -c \"echo a b\""), ElementsAre("/bin/sh", "-c", "echo a b"));
    EXPECT_THAT(split("a  b"), ElementsAre("a", "b"));
    EXPECT_THAT(split("a"), ElementsAre("a"));
}

TEST(MakeArgv, AlwaysYieldsOneArgument) {
    EXPECT_THAT(split(""), ElementsAre(""));
    EXPECT_THAT(split("   "), ElementsAre(""));
    EXPECT_THAT(split("''"), ElementsAre(""));
}

TEST(MakeArgv, LeadingBlanksAndQuotesMakeNoArgument) {
    EXPECT_THAT(split("  a b"), ElementsAre("a", "b"));
    EXPECT_THAT(split("'/opt/a dir/run' x"), ElementsAre("/opt/a dir/run", "x"));
    EXPECT_THAT(split(" \"/opt/a dir/run\" x"), ElementsAre("/opt/a dir/run", "x"));
}

TEST(MakeArgv, PlacesLeftOverAreEmpty) {
    EXPECT_THAT(split("a "), ElementsAre("a", ""));
    EXPECT_THAT(split("a '' b"), ElementsAre("a", "b", ""));
}

TEST(MakeArgv, AQuoteInsideAWordEndsTheArgument) {
    EXPECT_THAT(split("a'b' c"), ElementsAre("a", "b"));
    EXPECT_THAT(split("a\"b\"c"), ElementsAre("a"));
}

TEST(MakeArgv, BothKindsOfQuoteToggleTheSameFlag) {
    EXPECT_THAT(split("x 'a \"b c\" d'"), ElementsAre("x", "a ", "b"));
}

TEST(MakeArgv, AnEscapedQuoteIsKeptWithItsBackslash) {
    EXPECT_THAT(split("a \\\"b c\\\""), ElementsAre("a", "\\\"b", "c\\\""));
    EXPECT_THAT(split("'a\\' b'"), ElementsAre("a\\' b"));
}

TEST(MakeArgv, TabsAreNoSeparators) {
    EXPECT_THAT(split("a\tb c"), ElementsAre("a\tb", "c"));
}

TEST(MakeArgv, AnOpenQuoteRunsToTheEnd) {
    EXPECT_THAT(split("a 'b c "), ElementsAre("a", "b c "));
}

TEST(MakeArgv, RefusesMissingArguments) {
    TraceCapture traces;
    char** arguments = nullptr;
    const String command("a");
    errno = 0;
    EXPECT_EQ(MakeArgv(nullptr, &arguments), 255);
    EXPECT_EQ(errno, EINVAL);
    EXPECT_EQ(MakeArgv(&command, nullptr), 255);
    EXPECT_THAT(traces.errors("zavprocs"),
                ElementsAre("Error occurred. ERRNO:22 Invalid argument",
                            "Error occurred. ERRNO:22 Invalid argument"));
}

TEST(UserToken, IsTheCallersOwnByDefault) {
    TraceCapture traces;
    const auto own = token(nullptr, nullptr);
    EXPECT_EQ(own->uid, ::getuid());
    EXPECT_EQ(own->gid, ::getgid());
    EXPECT_EQ(traces.count('D', "User: (null) UID: " + std::to_string(::getuid()) +
                                    " Group: (null) GID: " + std::to_string(::getgid())),
              1);
}

TEST(UserToken, LooksNamesUp) {
    TraceCapture traces;
    const auto daemon = token("daemon", "sys");
    EXPECT_EQ(daemon->uid, ::getpwnam("daemon")->pw_uid);
    EXPECT_EQ(daemon->gid, ::getgrnam("sys")->gr_gid);
    EXPECT_EQ(traces.count('D', "User: daemon UID: " + std::to_string(daemon->uid) +
                                    " Group: sys GID: " + std::to_string(daemon->gid)),
              1);
}

TEST(UserToken, AnUnknownUserIsNobody) {
    const passwd* const nobody = ::getpwnam("nobody");
    const std::uint32_t expected = nobody != nullptr ? nobody->pw_uid : 65533;
    EXPECT_EQ(token("no-such-user-here", nullptr)->uid, expected);
}

TEST(UserToken, AnUnknownGroupIsTheUsersOwnOnlyWhereAGroupNobodyExists) {
    const bool hasNobody = ::getgrnam("nobody") != nullptr;
    const std::uint32_t primary = ::getpwnam("daemon")->pw_gid;
    EXPECT_EQ(token("daemon", "no-such-group-here")->gid, hasNobody ? primary : 65533u);
    // Without a user there is no entry that has a group.
    EXPECT_EQ(token(nullptr, "no-such-group-here")->gid, 65533u);
}

TEST(ErrorMessage, HasNumberAndText) {
    const std::unique_ptr<char, decltype(&std::free)> message(getErrorMsg(ENOENT), &std::free);
    EXPECT_STREQ(message.get(), "Error occurred: ERRNO:2 No such file or directory");
}

TEST(PruneLogs, ElevenLogsLoseOnlyTheOldest) {
    TraceCapture traces;
    const ScratchDir home;
    for (int i = 0; i < 11; ++i) {
        const std::string path = home.write("logs/zavproc_ras1_" + std::to_string(i) + ".log", "x");
        const timespec times[2] = {{5000 + (i + 4) % 11, 0}, {5000 + (i + 4) % 11, 0}};
        ASSERT_EQ(::utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
    }
    pruneLogs(home.path("logs").c_str(), "zavproc_ras1", 10);
    for (int i = 0; i < 11; ++i) {
        const bool isOldest = i == 7;
        EXPECT_NE(home.exists("logs/zavproc_ras1_" + std::to_string(i) + ".log"), isOldest) << i;
    }
    EXPECT_EQ(traces.count('D', "deleting file: " + home.path("logs/zavproc_ras1_7.log")), 1);
    EXPECT_THAT(traces.errors(), IsEmpty());
}

TEST(PruneLogs, CountsFilesWithThePrefixOnly) {
    const ScratchDir home;
    home.write("a_1", "");
    home.write("a_2", "");
    home.write("b_a_3", "");
    home.makeDir("a_dir");
    pruneLogs(home.path().c_str(), "a_", 3);
    EXPECT_TRUE(home.exists("a_1"));
    EXPECT_TRUE(home.exists("a_2"));
    pruneLogs(home.path().c_str(), "a_", 2);
    EXPECT_NE(home.exists("a_1"), home.exists("a_2"));
    EXPECT_TRUE(home.exists("b_a_3"));
    EXPECT_TRUE(home.exists("a_dir"));
}

TEST(PruneLogs, OfSeveralOldestLogsTheFirstListedGoes) {
    const ScratchDir home;
    for (const char* name : {"a_1", "a_2", "a_3"}) {
        const timespec times[2] = {{5000, 0}, {5000, 0}};
        ASSERT_EQ(::utimensat(AT_FDCWD, home.write(name, "").c_str(), times, 0), 0);
    }
    FSI1_LIST* list = nullptr;
    ASSERT_EQ(FSI1_NewList(home.path().c_str(), &list), FSI1_OK);
    std::vector<std::string> paths;
    FSI1_ENTRY entry;
    while (FSI1_FetchList(list, &entry) == FSI1_OK)
        paths.emplace_back(entry.path);
    FSI1_DeleteList(list);
    ASSERT_EQ(paths.size(), 3u);
    pruneLogs(home.path().c_str(), "a_", 3);
    EXPECT_NE(::access(paths[0].c_str(), F_OK), 0);
    EXPECT_EQ(::access(paths[1].c_str(), F_OK), 0);
    EXPECT_EQ(::access(paths[2].c_str(), F_OK), 0);
}

TEST(PruneLogs, AMissingDirectoryIsTraced) {
    TraceCapture traces;
    pruneLogs("/no/such/directory", "a", 1);
    EXPECT_THAT(traces.errors(), ElementsAre("FSI1_NewList error 2"));
}

TEST(InputStream, ReadsBytesAndBlocksUpToTheEnd) {
    auto [readEnd, writeEnd] = makePipe();
    ASSERT_EQ(::write(writeEnd.get(),
                      "\xff"
                      "abcd",
                      5),
              5);
    writeEnd.close();
    ProcessInputStream stream;
    stream.attach(std::move(readEnd));
    EXPECT_EQ(stream.read(), 255);
    char buffer[8] = "";
    EXPECT_EQ(stream.read(buffer, 3), 3);
    EXPECT_STREQ(buffer, "abc");
    EXPECT_EQ(stream.read(buffer, 8), 1);
    EXPECT_EQ(stream.read(buffer, 8), 0);
    EXPECT_EQ(stream.read(), -1);
    EXPECT_TRUE(stream.close());
    EXPECT_FALSE(stream.close());
    EXPECT_EQ(stream.read(buffer, 8), -1);
    EXPECT_EQ(stream.setNonBlocking(true), -1);
}

TEST(InputStream, NonBlockingModeDoesNotWait) {
    auto [readEnd, writeEnd] = makePipe();
    ProcessInputStream stream;
    stream.attach(std::move(readEnd));
    EXPECT_FALSE(stream.isNonBlocking());
    EXPECT_EQ(stream.setNonBlocking(true), 0);
    EXPECT_TRUE(stream.isNonBlocking());
    char byte;
    EXPECT_EQ(stream.read(&byte, 1), -1);
    EXPECT_EQ(errno, EAGAIN);
    EXPECT_EQ(stream.setNonBlocking(false), 0);
    EXPECT_EQ(::fcntl(stream.descriptor(), F_GETFL) & O_NONBLOCK, 0);
}

TEST(OutputStream, WritesEverything) {
    auto [readEnd, writeEnd] = makePipe();
    ProcessOutputStream stream;
    stream.attach(std::move(writeEnd));
    EXPECT_TRUE(stream.write("abc", 3));
    EXPECT_TRUE(stream.write("", 0));
    char buffer[8];
    EXPECT_EQ(::read(readEnd.get(), buffer, sizeof buffer), 3);
    EXPECT_TRUE(stream.close());
    EXPECT_FALSE(stream.close());
    EXPECT_FALSE(stream.write("abc", 3));
}

TEST(OutputStream, AVanishedReaderCostsNoSignal) {
    auto [readEnd, writeEnd] = makePipe();
    readEnd.close();
    ProcessOutputStream stream;
    stream.attach(std::move(writeEnd));
    EXPECT_FALSE(stream.write("abc", 3));
    EXPECT_EQ(errno, EPIPE);
    sigset_t pending;
    ::sigpending(&pending);
    EXPECT_EQ(::sigismember(&pending, SIGPIPE), 0);
    sigset_t blocked;
    ::pthread_sigmask(SIG_BLOCK, nullptr, &blocked);
    EXPECT_EQ(::sigismember(&blocked, SIGPIPE), 0);
}

TEST(OutputStream, ASignalThatWasPendingStaysPending) {
    sigset_t sigpipe;
    ::sigemptyset(&sigpipe);
    ::sigaddset(&sigpipe, SIGPIPE);
    sigset_t before;
    ::pthread_sigmask(SIG_BLOCK, &sigpipe, &before);
    ::raise(SIGPIPE);

    auto [readEnd, writeEnd] = makePipe();
    readEnd.close();
    ProcessOutputStream stream;
    stream.attach(std::move(writeEnd));
    EXPECT_FALSE(stream.write("abc", 3));

    const timespec now{};
    EXPECT_EQ(::sigtimedwait(&sigpipe, nullptr, &now), SIGPIPE);
    ::pthread_sigmask(SIG_SETMASK, &before, nullptr);
}
