// ctest-label: threaded
#include "ctl/client/transfer/interruption.h"

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>

namespace {

using ctl::Interruption;

class Sockets {
public:
    Sockets() { EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM, 0, ends_), 0); }
    ~Sockets() {
        ::close(ends_[0]);
        ::close(ends_[1]);
    }
    int own() const { return ends_[0]; }
    /// Whether the other end sees that nothing more comes.
    bool ended() const {
        char byte = 0;
        return ::recv(ends_[1], &byte, 1, MSG_DONTWAIT) == 0;
    }

private:
    int ends_[2];
};

TEST(AnInterruption, EndsTheSendingAndNotTheProgram) {
    const Interruption interruption;
    const Sockets sockets;
    Interruption::watch(sockets.own());
    EXPECT_EQ(Interruption::signal(), 0);
    EXPECT_FALSE(sockets.ended());
    ::raise(SIGINT);
    EXPECT_EQ(Interruption::signal(), SIGINT);
    EXPECT_TRUE(sockets.ended());
    Interruption::forget(sockets.own());
}

TEST(AnInterruption, EndsTheSendingOnASocketThatComesLater) {
    const Interruption interruption;
    ::raise(SIGTERM);
    const Sockets sockets;
    Interruption::watch(sockets.own());
    EXPECT_TRUE(sockets.ended());
    Interruption::forget(sockets.own());
}

TEST(AnInterruption, MayBeAProgramsOwn) {
    const Sockets sockets;
    Interruption::watch(sockets.own());
    Interruption::interrupt(SIGTERM);
    EXPECT_EQ(Interruption::signal(), SIGTERM);
    EXPECT_TRUE(sockets.ended());
    Interruption::forget(sockets.own());
}

TEST(AnInterruption, LeavesSocketsAloneThatItWasToldToForget) {
    const Interruption interruption;
    const Sockets sockets;
    Interruption::watch(sockets.own());
    Interruption::forget(sockets.own());
    ::raise(SIGINT);
    EXPECT_FALSE(sockets.ended());
}

TEST(AnInterruption, EndsTheProgramTheSecondTime) {
    EXPECT_EXIT(
        {
            const Interruption interruption;
            ::raise(SIGINT);
            ::raise(SIGINT);
        },
        testing::KilledBySignal(SIGINT), "");
}

TEST(AnInterruption, GivesTheSignalsBack) {
    { const Interruption interruption; }
    EXPECT_EXIT(::raise(SIGTERM), testing::KilledBySignal(SIGTERM), "");
}

TEST(AnInterruption, LeavesIgnoredSignalsIgnored) {
    std::signal(SIGHUP, SIG_IGN);
    const Interruption interruption;
    ::raise(SIGHUP);
    EXPECT_EQ(Interruption::signal(), 0);
}

}  // namespace
