#include "host/process/log.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <array>
#include <climits>
#include <nlohmann/json.hpp>

#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "system/file_descriptor.h"

namespace {

using host::LogEntry;
using host::Priority;
using nlohmann::json;

LogEntry entry(Priority priority, const std::string& text, const std::string& task = "") {
    return {priority, text, task, std::chrono::system_clock::from_time_t(0)};
}

TEST(Log, ASpokenLineHasTheProgramsName) {
    EXPECT_EQ(host::spokenLine(entry(Priority::Error, "no home")), "zavhost: no home\n");
}

TEST(Log, ALineOfTextHasTimeAndLevel) {
    EXPECT_EQ(host::textLine(entry(Priority::Warning, "late")),
              "1970-01-01T00:00:00.000Z warning zavhost: late\n");
    EXPECT_EQ(host::textLine(entry(Priority::Info, "fine")),
              "1970-01-01T00:00:00.000Z info zavhost: fine\n");
}

TEST(Log, ALineOfJsonHasTheTaskToo) {
    EXPECT_EQ(host::jsonLine(entry(Priority::Notice, "say \"a\"\nb", "j-1")),
              "{\"time\":\"1970-01-01T00:00:00.000Z\",\"level\":\"notice\",\"task\":\"j-1\","
              "\"text\":\"say \\\"a\\\"\\nb\"}\n");
    EXPECT_EQ(json::parse(host::jsonLine(entry(Priority::Error, "\xFF"))).count("task"), 0U);
    for (const char letter : {'x', '\x01'}) {
        const std::string line = host::jsonLine(entry(Priority::Error, std::string(9'000, letter)));
        EXPECT_LE(line.size(), std::size_t{PIPE_BUF});
        const std::string text = json::parse(line)["text"];
        EXPECT_EQ(text.substr(text.size() - 4), letter + std::string("..."));
    }
}

TEST(Log, TheJournalsStreamGetsThePriority) {
    EXPECT_EQ(host::prefixedLine(entry(Priority::Error, "no home")), "<3>no home\n");
    EXPECT_EQ(host::prefixedLine(entry(Priority::Warning, "late")), "<4>late\n");
    EXPECT_EQ(host::prefixedLine(entry(Priority::Info, "fine")), "<6>fine\n");
}

TEST(Log, AnEventIsOneLine) {
    EXPECT_EQ(host::prefixedLine(entry(Priority::Error, "a\nb\r\nc")), "<3>a b  c\n");
}

TEST(Log, NothingInALineSteersATerminal) {
    EXPECT_EQ(host::spokenLine(entry(Priority::Info, "a\033[2Jb\007c\177d\te")),
              "zavhost: a [2Jb c d e\n");
    EXPECT_EQ(host::spokenLine(entry(Priority::Info, "gr\xC3\xBC\xC3\x9F")),
              "zavhost: gr\xC3\xBC\xC3\x9F\n");
}

TEST(Log, TheJournalGetsFields) {
    const ScratchDir scratch;
    const std::string path = scratch.path("journal");
    const sys::FileDescriptor journal(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.copy(address.sun_path, sizeof address.sun_path - 1);
    ASSERT_EQ(::bind(journal.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address),
              0);
    const auto received = [&journal] {
        std::array<char, 1000> text{};
        const ssize_t length = ::recv(journal.get(), text.data(), text.size(), MSG_DONTWAIT);
        return std::string(text.data(), static_cast<std::size_t>(std::max<ssize_t>(length, 0)));
    };
    ASSERT_TRUE(host::sendToJournal(entry(Priority::Warning, "a\nMESSAGE=b", "j-1"), path));
    EXPECT_EQ(received(),
              "PRIORITY=4\nSYSLOG_IDENTIFIER=zavhost\nMESSAGE=a MESSAGE=b\nZAVHOST_TASK=j-1\n");
    ASSERT_TRUE(host::sendToJournal(entry(Priority::Info, "fine"), path));
    EXPECT_EQ(received(), "PRIORITY=6\nSYSLOG_IDENTIFIER=zavhost\nMESSAGE=fine\n");
    EXPECT_FALSE(host::sendToJournal(entry(Priority::Info, "x"), scratch.path("nobody")));
    EXPECT_FALSE(host::sendToJournal(entry(Priority::Info, "x"), std::string(200, 'x')));
}

/// Standard error is something else as long as this object lives.
class StandardError {
public:
    explicit StandardError(int other) : kept_(::dup(STDERR_FILENO)) {
        ::dup2(other, STDERR_FILENO);
    }
    ~StandardError() { ::dup2(kept_.get(), STDERR_FILENO); }
    StandardError(const StandardError&) = delete;
    StandardError& operator=(const StandardError&) = delete;

private:
    const sys::FileDescriptor kept_;
};

TEST(Log, NobodyWhoDoesNotReadHoldsTheHostUp) {
    int ends[2] = {};
    ASSERT_EQ(::pipe2(ends, O_CLOEXEC), 0);
    const sys::FileDescriptor reading(ends[0]);
    const sys::FileDescriptor writing(ends[1]);
    {
        const StandardError pipe(writing.get());
        for (int i = 0; i < 1'000; ++i)
            host::say(Priority::Info, std::string(10'000, 'x'));
    }
    std::array<char, PIPE_BUF> line{};
    ASSERT_EQ(::read(reading.get(), line.data(), line.size()), PIPE_BUF);
    EXPECT_EQ(std::string(line.data(), line.size()).substr(PIPE_BUF - 5), "x...\n");
}

TEST(Log, OnlyTheStreamThatIsNamedIsTheJournals) {
    struct stat found {};
    ASSERT_EQ(::fstat(STDERR_FILENO, &found), 0);
    const std::string device = std::to_string(found.st_dev);
    const std::string inode = std::to_string(found.st_ino);
    const ScopedEnv stream("JOURNAL_STREAM", device + ":" + inode);
    EXPECT_TRUE(host::logsToJournal());
    stream.set((device + ":" + inode + "0").c_str());
    EXPECT_FALSE(host::logsToJournal());
    stream.set("");
    EXPECT_FALSE(host::logsToJournal());
    stream.set(nullptr);
    EXPECT_FALSE(host::logsToJournal());
}

}  // namespace
