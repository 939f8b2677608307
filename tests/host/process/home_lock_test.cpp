#include "host/process/home_lock.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <memory>
#include <string>

#include "host/process/start_error.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

using host::HomeLock;
using host::StartError;

class HomeLocks : public testing::Test {
protected:
    std::string complaint() const {
        try {
            const HomeLock lock(home.path());
        } catch (const StartError& error) {
            return error.what();
        }
        return "";
    }
    std::string usedBy(pid_t pid) const {
        return "home " + home.path() + " is in use by the host with process id " +
               std::to_string(pid);
    }

    ScratchDir home;
};

TEST_F(HomeLocks, NamesTheOwnerToTheSecond) {
    {
        const HomeLock lock(home.path());
        EXPECT_EQ(home.read(".zavhost.lock"), std::to_string(::getpid()) + "\n");
        EXPECT_EQ(complaint(), usedBy(::getpid()));
    }
    EXPECT_EQ(complaint(), "");
}

TEST_F(HomeLocks, TellTheirOwnerToThoseWhoDoNotWantThem) {
    EXPECT_EQ(HomeLock::ownerOf(home.path()), "");
    EXPECT_FALSE(home.exists(".zavhost.lock"));
    {
        const HomeLock lock(home.path());
        EXPECT_EQ(HomeLock::ownerOf(home.path()),
                  "the host with process id " + std::to_string(::getpid()));
    }
    EXPECT_EQ(HomeLock::ownerOf(home.path()), "") << "the file is still there";
    EXPECT_EQ(complaint(), "");
}

TEST_F(HomeLocks, AFileThatAKilledHostLeftDoesNotMatter) {
    home.write(".zavhost.lock", "1\n and more than the new text\n");
    const HomeLock lock(home.path());
    EXPECT_EQ(home.read(".zavhost.lock"), std::to_string(::getpid()) + "\n");
}

TEST_F(HomeLocks, ChildrenDoNotKeepIt) {
    auto lock = std::make_unique<HomeLock>(home.path());
    Program child({"/bin/sh", "-c", "echo runs; exec sleep 1000"});
    ASSERT_TRUE(child.awaitOutput("runs", std::chrono::seconds(20)));
    lock.reset();
    EXPECT_EQ(complaint(), "");
}

TEST_F(HomeLocks, AHomeThatCannotHoldTheFileIsRefused) {
    home.makeDir(".zavhost.lock");
    EXPECT_EQ(complaint(), "cannot make " + home.path() + "/.zavhost.lock: Is a directory");
}

/// A child that tries to take the lock at the parent's sign, reports by one letter whether it has
/// it, and keeps it until the parent gives the second sign.
class Starter {
public:
    explicit Starter(const std::string& home) {
        EXPECT_EQ(::pipe(signs_.data()), 0);
        EXPECT_EQ(::pipe(reports_.data()), 0);
        pid_ = ::fork();
        if (pid_ == 0) run(home);
        ::close(signs_[0]);
        ::close(reports_[1]);
    }
    ~Starter() {
        ::close(signs_[1]);
        ::close(reports_[0]);
        ::waitpid(pid_, nullptr, 0);
    }
    Starter(const Starter&) = delete;
    Starter& operator=(const Starter&) = delete;

    pid_t pid() const { return pid_; }
    void sign() const { EXPECT_EQ(::write(signs_[1], "s", 1), 1); }
    /// "+" if it has the lock, otherwise its complaint.
    std::string report() const {
        std::string text(500, '\0');
        const ssize_t length = ::read(reports_[0], text.data(), text.size());
        text.resize(length < 0 ? 0 : static_cast<std::size_t>(length));
        return text;
    }

private:
    [[noreturn]] void run(const std::string& home) const {
        ::close(signs_[1]);
        awaitSign();
        try {
            const HomeLock lock(home);
            report("+");
            awaitSign();
        } catch (const StartError& error) {
            report(error.what());
        }
        ::_exit(0);
    }
    void awaitSign() const {
        char sign = 0;
        if (::read(signs_[0], &sign, 1) < 0) ::_exit(1);
    }
    void report(const char* text) const {
        if (::write(reports_[1], text, std::strlen(text)) < 0) ::_exit(1);
    }

    std::array<int, 2> signs_{};
    std::array<int, 2> reports_{};
    pid_t pid_ = -1;
};

TEST_F(HomeLocks, OfTwoThatStartAtTheSameInstantOneIsRefusedAThousandTimes) {
    for (int round = 0; round < 1'000; ++round) {
        const Starter first(home.path());
        const Starter second(home.path());
        first.sign();
        second.sign();
        const std::string reports[] = {first.report(), second.report()};
        const int winner = reports[0] == "+" ? 0 : 1;
        const pid_t owner = winner == 0 ? first.pid() : second.pid();
        ASSERT_EQ(reports[winner], "+") << "round " << round;
        ASSERT_EQ(reports[1 - winner], usedBy(owner)) << "round " << round;
    }
}

}  // namespace
