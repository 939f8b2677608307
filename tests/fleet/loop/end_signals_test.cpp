// ctest-label: threaded
#include "fleet/loop/end_signals.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <future>

namespace {

using fleet::EndSignals;
using fleet::EndWaiter;

TEST(EndSignals, HaveTheServiceAskedToEnd) {
    for (const int signal : {SIGTERM, SIGINT}) {
        const EndSignals signals;
        std::promise<void> asked;
        const EndWaiter waiter(signals, [&asked] { asked.set_value(); });
        ASSERT_EQ(::kill(::getpid(), signal), 0);
        EXPECT_EQ(asked.get_future().wait_for(std::chrono::seconds(60)), std::future_status::ready);
    }
}

TEST(EndSignals, AreKeptUntilSomebodyWaits) {
    const EndSignals signals;
    ASSERT_EQ(::kill(::getpid(), SIGTERM), 0);
    std::promise<void> asked;
    const EndWaiter waiter(signals, [&asked] { asked.set_value(); });
    EXPECT_EQ(asked.get_future().wait_for(std::chrono::seconds(60)), std::future_status::ready);
}

TEST(EndSignals, AreNotWaitedForAnyMoreThanTheServiceLasts) {
    const EndSignals signals;
    std::atomic<int> calls{0};
    { const EndWaiter waiter(signals, [&calls] { ++calls; }); }
    EXPECT_EQ(calls, 1);
}

}  // namespace
