// ctest-label: threaded
#include "ctl/client/guarded.h"

#include <gtest/gtest.h>

#include "ctl/client/canned_host.h"

namespace {

/// Whether a host counts as guarded that answers so.
bool isGuardedWith(int status, const std::string& health) {
    const ctl_test::CannedHost host([&](const ctl_test::CannedHost& self) {
        const ctl_test::Peer peer = self.accept();
        peer.request();
        peer.answer(status, health);
    });
    const ctl::HostAddress address = {host.path(), "", std::chrono::seconds(20)};
    return ctl::isGuarded(address, ctl::deadlineIn(address.timeout));
}

TEST(Guarded, IsAHostThatDoesNotSayOtherwise) {
    EXPECT_TRUE(isGuardedWith(200, R"({"guarded": true})"));
    EXPECT_TRUE(isGuardedWith(200, R"({"version": "1.0.0"})"));
    EXPECT_TRUE(isGuardedWith(404, "{}"));
}

TEST(Guarded, IsNoHostThatSaysItIsNot) {
    EXPECT_FALSE(isGuardedWith(200, R"({"guarded": false})"));
}

}  // namespace
