#include "ctl/client/address/peer.h"

#include <gtest/gtest.h>
#include <sys/socket.h>

#include "ctl/client/chunks.h"

namespace {

using ctl::isTrusted;

constexpr uid_t kNobodyNamed = static_cast<uid_t>(-1);

TEST(Peer, IsTrustedWhenItIsOneselfOrRootOrTheOneThatWasNamed) {
    EXPECT_TRUE(isTrusted(1000, 1000, kNobodyNamed));
    EXPECT_TRUE(isTrusted(1000, 0, kNobodyNamed));
    EXPECT_TRUE(isTrusted(1000, 1001, 1001));
    EXPECT_FALSE(isTrusted(1000, 1001, kNobodyNamed));
    EXPECT_FALSE(isTrusted(1000, 1001, 1002));
    EXPECT_FALSE(isTrusted(1000, kNobodyNamed, kNobodyNamed));
}

TEST(Peer, IsAnybodyForRoot) {
    EXPECT_TRUE(isTrusted(0, 1001, kNobodyNamed));
}

TEST(Peer, OfANameThatNobodyHasIsWrongUsage) {
    try {
        ctl::trustHostUser("nobody-is-called-so");
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kWrongUsage);
        EXPECT_STREQ(failure.what(), "there is no user nobody-is-called-so");
    }
    EXPECT_THROW(ctl::trustHostUser("12x"), ctl::Failure);
    EXPECT_THROW(ctl::trustHostUser("4294967295"), ctl::Failure);
    ctl::trustHostUser("root");
    ctl::trustHostUser("4294967");
}

TEST(Peer, OfOnesOwnUserIsTrusted) {
    int ends[2];
    ASSERT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
    const ctl_test::Descriptor here(ends[0]);
    const ctl_test::Descriptor there(ends[1]);
    ctl::refuseStranger(here.get(), "here");
}

TEST(Peer, ThatTheKernelDoesNotTellIsRefused) {
    EXPECT_THROW(ctl::refuseStranger(-1, "nowhere"), ctl::Failure);
}

}  // namespace
