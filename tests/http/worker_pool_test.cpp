// ctest-label: threaded
#include "http/worker_pool.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <memory>
#include <stdexcept>

#include "support/host/program.h"

namespace {

using http::WorkerPool;

/// Holds jobs until it is opened.
struct Gate {
    std::promise<void> promise;
    std::shared_future<void> opened{promise.get_future()};
    void open() { promise.set_value(); }
};

TEST(WorkerPool, RunsAsManyJobsAtOnceAsItHasThreads) {
    Gate gate;
    std::atomic<int> running{0};
    http::WorkerPool pool(3, 10);
    for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(pool.submit([&] {
            ++running;
            gate.opened.wait();
        }));
    }
    EXPECT_TRUE(eventually([&] { return running == 3; }));
    gate.open();
}

TEST(WorkerPool, TakesExactlyWhatItsThreadsAndItsQueueHold) {
    Gate gate;
    std::atomic<int> done{0};
    http::WorkerPool pool(2, 3);
    const auto job = [&] {
        gate.opened.wait();
        ++done;
    };
    for (int i = 0; i < 5; ++i)
        EXPECT_TRUE(pool.submit(job)) << i;
    EXPECT_FALSE(pool.submit(job));
    gate.open();
    EXPECT_TRUE(eventually([&] { return done == 5; }));
    EXPECT_TRUE(eventually([&] { return pool.submit([] {}); }));
}

TEST(WorkerPool, AJobThatThrowsCostsNoThread) {
    std::atomic<int> done{0};
    http::WorkerPool pool(1, 10);
    EXPECT_TRUE(pool.submit([] { throw std::runtime_error("x"); }));
    EXPECT_TRUE(pool.submit([] { throw 1; }));
    EXPECT_TRUE(pool.submit([&] { ++done; }));
    EXPECT_TRUE(eventually([&] { return done == 1; }));
}

TEST(WorkerPool, ReleasesWhatAJobHeld) {
    const auto held = std::make_shared<int>(1);
    http::WorkerPool pool(1, 10);
    EXPECT_TRUE(pool.submit([held] {}));
    EXPECT_TRUE(eventually([&] { return held.use_count() == 1; }));
}

TEST(WorkerPool, ItsEndWaitsForRunningJobsAndDropsTheOthers) {
    std::atomic<bool> started{false};
    std::atomic<int> done{0};
    const auto held = std::make_shared<int>(1);
    {
        http::WorkerPool pool(1, 1'000'000);
        EXPECT_TRUE(pool.submit([&] {
            started = true;
            // A pool with that much room refuses a job only once its end has begun.
            EXPECT_TRUE(eventually([&] { return !pool.submit([] {}); }));
            ++done;
        }));
        EXPECT_TRUE(eventually([&] { return started.load(); }));
        EXPECT_TRUE(pool.submit([&done, held] { ++done; }));
    }
    EXPECT_EQ(done, 1);
    EXPECT_EQ(held.use_count(), 1);
}

}  // namespace
