// ctest-label: threaded
#include "metrics/histogram.h"

#include <gtest/gtest.h>

#include <thread>

namespace {

using metrics::Histogram;
using std::chrono::milliseconds;
using std::chrono::seconds;

TEST(AHistogram, CountsEachDurationInEveryBucketThatHoldsIt) {
    metrics::Histogram histogram({seconds(1), seconds(2)});
    for (const int time : {500, 1'000, 1'001, 2'000, 2'001})
        histogram.observe(milliseconds(time));
    const metrics::Histogram::Snapshot taken = histogram.snapshot();
    ASSERT_EQ(taken.buckets.size(), 2U);
    EXPECT_EQ(taken.buckets[0].bound, seconds(1));
    EXPECT_EQ(taken.buckets[0].count, 2U) << "a bound belongs to its bucket";
    EXPECT_EQ(taken.buckets[1].count, 4U);
    EXPECT_EQ(taken.count, 5U);
    EXPECT_EQ(taken.sum, milliseconds(6'502));
}

TEST(AHistogram, TakesANegativeDurationForNone) {
    metrics::Histogram histogram({seconds(1)});
    histogram.observe(seconds(-5));
    EXPECT_EQ(histogram.snapshot().count, 1U);
    EXPECT_EQ(histogram.snapshot().sum, seconds(0));
}

TEST(AHistogram, LosesNothingWhenManyThreadsObserve) {
    constexpr unsigned kEach = 10'000;
    metrics::Histogram histogram({milliseconds(1)});
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            for (unsigned j = 0; j < kEach; ++j)
                histogram.observe(milliseconds(j % 2 == 0 ? 1 : 3));
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    const metrics::Histogram::Snapshot taken = histogram.snapshot();
    EXPECT_EQ(taken.buckets.at(0).count, 2 * kEach);
    EXPECT_EQ(taken.count, 4 * kEach);
    EXPECT_EQ(taken.sum, milliseconds(2 * kEach + 6 * kEach));
}

}  // namespace
