// ctest-label: threaded
#include "host/service/status_reporter.h"

#include <gtest/gtest.h>

#include <atomic>
#include <stdexcept>

#include "support/gate.h"
#include "support/host/notify_socket.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

using host::Notifier;
using host::StatusReporter;
using std::chrono::milliseconds;

class ServiceStatus : public testing::Test {
protected:
    ScratchDir scratch;
    const NotifySocket manager{scratch.path("notify")};
    const Notifier notifier{scratch.path("notify")};
};

TEST_F(ServiceStatus, IsSentWhenItHasChangedAndOnlyThen) {
    std::atomic<int> looks{0};
    StatusReporter reporter(
        notifier, [&looks] { return ++looks < 5 ? std::string("idle") : std::string("1 queued"); },
        milliseconds(1));
    for (int i = 1; i < 8; ++i) {
        ASSERT_TRUE(eventually([&] { return looks == i; }));
        reporter.changed();
    }
    EXPECT_EQ(manager.next(), "STATUS=idle\n");
    EXPECT_EQ(manager.next(), "STATUS=1 queued\n");
    reporter.stop();
    EXPECT_EQ(manager.next(milliseconds(0)), "");
}

TEST_F(ServiceStatus, IsSentOnceInALook) {
    std::atomic<int> looks{0};
    StatusReporter reporter(
        notifier, [&looks] { return std::to_string(++looks); }, std::chrono::hours(1));
    EXPECT_EQ(manager.next(), "STATUS=1\n");
    reporter.changed();
    reporter.stop();
    EXPECT_EQ(looks, 1) << "however often it changes";
}

TEST_F(ServiceStatus, StaysAsItIsWhenItCannotBeFound) {
    std::atomic<int> looks{0};
    const StatusReporter reporter(
        notifier,
        [&looks] {
            if (++looks < 3) throw std::runtime_error("the journal hangs");
            return std::string("idle");
        },
        milliseconds(1));
    EXPECT_EQ(manager.next(), "STATUS=idle\n");
}

TEST_F(ServiceStatus, IsSentAgainWhenTheManagerHadNoRoomForIt) {
    while (notifier.tell("STATUS=before\n"))
        continue;
    std::atomic<int> looks{0};
    const StatusReporter reporter(
        notifier,
        [&looks] {
            ++looks;
            return std::string("idle");
        },
        milliseconds(1));
    ASSERT_TRUE(eventually([&looks] { return looks > 1; }));
    EXPECT_EQ(manager.await("STATUS=idle"), "STATUS=idle\n");
}

TEST_F(ServiceStatus, IsNotLookedForWhenNobodyWantsIt) {
    const Notifier nobody("");
    std::atomic<int> looks{0};
    StatusReporter reporter(
        nobody, [&looks] { return std::to_string(++looks); }, milliseconds(1));
    reporter.changed();
    reporter.stop();
    EXPECT_EQ(looks, 0);
}

}  // namespace
