// ctest-label: threaded
#include "host/service/on_change.h"

#include <gtest/gtest.h>

#include <atomic>

#include "support/gate.h"
#include "support/host/program.h"

namespace {

using host::OnChange;
using std::chrono::milliseconds;

TEST(ActOnChange, IsDoneAtOnceAndAfterEachChange) {
    std::atomic<int> times{0};
    OnChange onChange(milliseconds(0), [&times] { return ++times > 0; });
    for (const int expected : {1, 2, 3}) {
        EXPECT_TRUE(eventually([&] { return times == expected; })) << expected;
        onChange.changed();
    }
}

TEST(ActOnChange, IsDoneOnceForChangesMeanwhile) {
    Gate gate;
    std::atomic<int> times{0};
    OnChange onChange(milliseconds(0), [&] {
        if (++times == 1) gate.pass();
        return true;
    });
    ASSERT_TRUE(gate.awaitArrival());
    for (int i = 0; i < 10; ++i)
        onChange.changed();
    gate.open();
    ASSERT_TRUE(eventually([&] { return times == 2; }));
    onChange.stop();
    EXPECT_EQ(times, 2);
}

TEST(ActOnChange, IsTriedAgainUntilItSucceeds) {
    std::atomic<int> times{0};
    OnChange onChange(milliseconds(0), [&times] { return ++times == 5; });
    EXPECT_TRUE(eventually([&] { return times == 5; }));
    onChange.stop();
    EXPECT_EQ(times, 5);
}

TEST(ActOnChange, IsNotDoneOnceItHasBeenStopped) {
    Gate gate;
    std::atomic<int> times{0};
    OnChange onChange(std::chrono::hours(1), [&] {
        ++times;
        gate.pass();
        return true;
    });
    ASSERT_TRUE(gate.awaitArrival());
    onChange.changed();
    gate.open();
    onChange.stop();
    EXPECT_EQ(times, 1) << "the pause is cut short";
    onChange.changed();
    onChange.stop();
}

}  // namespace
