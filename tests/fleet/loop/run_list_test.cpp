// ctest-label: threaded
#include "fleet/loop/run_list.h"

#include <gtest/gtest.h>

#include <condition_variable>
#include <memory>
#include <mutex>
#include <thread>

namespace {

/// Works until it is stopped.
class Work {
public:
    void run() {
        std::unique_lock lock(mutex_);
        changed_.wait(lock, [this] { return isStopped_; });
    }
    void stop() {
        const std::lock_guard lock(mutex_);
        isStopped_ = true;
        changed_.notify_all();
    }

private:
    std::mutex mutex_;
    std::condition_variable changed_;
    bool isStopped_ = false;
};

using Works = fleet::RunList<Work>;

std::shared_ptr<Work> startIn(Works& works) {
    auto work = std::make_shared<Work>();
    works.start(work, [](Work& started) { started.run(); });
    return work;
}

void awaitAllEnds(const Works& works) {
    while (!works.haveAllEnded())
        std::this_thread::yield();
}

TEST(RunList, KeepsWhatRunsAndLetsGoOfWhatHasEnded) {
    Works works;
    EXPECT_TRUE(works.haveAllEnded());
    const auto one = startIn(works);
    EXPECT_FALSE(works.haveAllEnded());
    one->stop();
    awaitAllEnds(works);
    const auto another = startIn(works);
    EXPECT_EQ(works.size(), 2U);
    const auto ended = works.removeEnded();
    ASSERT_EQ(ended.size(), 1U);
    EXPECT_EQ(ended.front(), one);
    EXPECT_EQ(works.size(), 1U);
    EXPECT_TRUE(works.removeEnded().empty());
}

TEST(RunList, StopsAll) {
    Works works;
    startIn(works);
    startIn(works);
    works.stopAll();
    awaitAllEnds(works);
    EXPECT_EQ(works.removeEnded().size(), 2U);
}

TEST(RunList, StopsAndWaitsForAllAtItsEnd) {
    std::weak_ptr<Work> left;
    {
        Works works;
        left = startIn(works);
    }
    EXPECT_TRUE(left.expired());
}

TEST(RunList, IsLetGoOfByWhoMayStopARun) {
    Works works;
    auto work = startIn(works);
    const auto stop = fleet::stopperOf(work);
    stop();
    awaitAllEnds(works);
    works.removeEnded();
    const std::weak_ptr<Work> left = work;
    work.reset();
    EXPECT_TRUE(left.expired());
    stop();
}

}  // namespace
