#include "host/service/notifier.h"

#include <gtest/gtest.h>

#include <optional>

#include "host/process/start_error.h"
#include "support/host/notify_socket.h"
#include "support/scratch_dir.h"

namespace {

using host::Notifier;

class ServiceNotifier : public testing::Test {
protected:
    ScratchDir scratch;
    const std::string path = scratch.path("notify");
};

TEST_F(ServiceNotifier, SendsOneDatagramToAPath) {
    const NotifySocket manager(path);
    const Notifier notifier(path);
    EXPECT_TRUE(notifier.isWanted());
    EXPECT_TRUE(notifier.tellSurely("READY=1\n"));
    EXPECT_TRUE(notifier.tell("STATUS=x\n"));
    EXPECT_EQ(manager.next(), "READY=1\n");
    EXPECT_EQ(manager.next(), "STATUS=x\n");
}

TEST_F(ServiceNotifier, SendsToAnAbstractName) {
    const std::string name = "@" + path;
    const NotifySocket manager(name);
    EXPECT_TRUE(Notifier(name).tell("READY=1\n"));
    EXPECT_EQ(manager.next(), "READY=1\n");
}

TEST_F(ServiceNotifier, DoesNothingWithoutAnAddress) {
    const Notifier notifier("");
    EXPECT_FALSE(notifier.isWanted());
    EXPECT_FALSE(notifier.tell("READY=1\n"));
}

TEST_F(ServiceNotifier, RefusesAddressesThatItCannotUse) {
    EXPECT_THROW(Notifier("relative"), host::StartError);
    EXPECT_THROW(Notifier("vsock:2:1"), host::StartError);
    EXPECT_THROW(Notifier("/" + std::string(200, 'x')), host::StartError);
    EXPECT_THROW(Notifier("@" + std::string(200, 'x')), host::StartError);
}

TEST_F(ServiceNotifier, SaysThatNobodyTookIt) {
    std::optional<NotifySocket> manager(std::in_place, path);
    const Notifier notifier(path);
    manager.reset();
    EXPECT_FALSE(notifier.tell("READY=1\n"));
    EXPECT_FALSE(notifier.tellSurely("READY=1\n"));
}

TEST_F(ServiceNotifier, DoesNotWaitForAReceiverThatReadsNothing) {
    const NotifySocket manager(path);
    const Notifier notifier(path);
    int taken = 0;
    while (notifier.tell("STATUS=x\n") && taken < 100'000)
        ++taken;
    EXPECT_GT(taken, 0);
    EXPECT_LT(taken, 100'000) << "the receiver's room is bounded";
    EXPECT_EQ(manager.next(), "STATUS=x\n");
    EXPECT_TRUE(notifier.tell("STATUS=y\n")) << "there is room again";
}

TEST_F(ServiceNotifier, ANoticeOfReloadingCarriesTheTime) {
    const std::string notice = host::reloadingNotice();
    EXPECT_EQ(notice.rfind("RELOADING=1\nMONOTONIC_USEC=", 0), 0U) << notice;
    EXPECT_GT(std::stoll(notice.substr(notice.rfind('=') + 1)), 0);
    EXPECT_EQ(notice.back(), '\n');
}

}  // namespace
