// ctest-label: threaded
#include <gtest/gtest.h>

#include <atomic>
#include <filesystem>
#include <future>
#include <iterator>
#include <memory>
#include <vector>

#include "fleet/loop/mailbox.h"
#include "fleet/loop/worker.h"
#include "support/gate.h"

namespace {

using fleet::Mailbox;
using fleet::Worker;

const auto kSoon = [] { return Mailbox::Clock::now() + std::chrono::seconds(60); };

TEST(Mailbox, LettersAreReadInTheirOrder) {
    Mailbox mailbox;
    std::vector<int> read;
    for (int i = 0; i < 3; ++i)
        mailbox.put([&read, i] { read.push_back(i); });
    for (int i = 0; i < 3; ++i)
        (*mailbox.take(kSoon()))();
    EXPECT_EQ(read, (std::vector<int>{0, 1, 2}));
}

TEST(Mailbox, NothingComesWhenTheTimeIsOver) {
    Mailbox mailbox;
    EXPECT_FALSE(mailbox.take(Mailbox::Clock::now()).has_value());
}

TEST(Mailbox, ALetterFromAnotherThreadWakesTheReader) {
    Mailbox mailbox;
    auto sender = std::async(std::launch::async, [&mailbox] { mailbox.put([] {}); });
    EXPECT_TRUE(mailbox.take(kSoon()).has_value());
}

TEST(Mailbox, AClosedOneDropsWhatIsInItAndWhatComes) {
    Mailbox mailbox;
    const auto content = std::make_shared<int>(1);
    mailbox.put([content] {});
    mailbox.close();
    mailbox.put([content] {});
    EXPECT_EQ(content.use_count(), 1);
    EXPECT_FALSE(mailbox.take(Mailbox::Clock::now()).has_value());
}

TEST(Mailbox, TellsWhoeverEmptiesManyOfThemOfEachLetter) {
    int told = 0;
    Mailbox mailbox([&told] { ++told; });
    mailbox.put([] {});
    mailbox.put([] {});
    EXPECT_EQ(told, 2);
    mailbox.close();
    mailbox.put([] {});
    EXPECT_EQ(told, 2);
}

std::ptrdiff_t threadsNow() {
    const std::filesystem::directory_iterator threads("/proc/self/task");
    return std::distance(begin(threads), end(threads));
}

TEST(Worker, HasAThreadFromItsFirstJobOn) {
    const std::ptrdiff_t before = threadsNow();
    Worker worker;
    EXPECT_EQ(threadsNow(), before);
    worker.add([] {});
    EXPECT_EQ(threadsNow(), before + 1);
}

TEST(Worker, ThatNeverHadAJobEndsAndCutsPausesShort) {
    Worker worker;
    worker.end();
    EXPECT_FALSE(worker.pause(std::chrono::hours(1)));
    worker.await();
}

TEST(Worker, JobsRunOneAfterTheOther) {
    std::vector<int> done;
    std::promise<void> last;
    Worker worker;
    for (int i = 0; i < 100; ++i)
        worker.add([&done, i] { done.push_back(i); });
    worker.add([&last] { last.set_value(); });
    last.get_future().get();
    ASSERT_EQ(done.size(), 100U);
    for (int i = 0; i < 100; ++i)
        EXPECT_EQ(done[static_cast<std::size_t>(i)], i);
}

TEST(Worker, TheEndWaitsForTheJobThatRunsAndDropsTheOthers) {
    std::atomic<int> done{0};
    Gate gate;
    {
        Worker worker;
        worker.add([&] {
            gate.pass();
            ++done;
        });
        worker.add([&done] { ++done; });
        ASSERT_TRUE(gate.awaitArrival());
        worker.end();
        gate.open();
    }
    EXPECT_EQ(done, 1);
}

TEST(Worker, AnEndCutsAPauseShort) {
    std::atomic<bool> goesOn{true};
    Gate gate;
    Worker worker;
    worker.add([&] {
        gate.pass();
        goesOn = worker.pause(std::chrono::hours(1));
    });
    ASSERT_TRUE(gate.awaitArrival());
    gate.open();
    worker.await();
    EXPECT_FALSE(goesOn);
}

TEST(Worker, WhatIsAddedAfterTheEndIsDropped) {
    Worker worker;
    worker.await();
    const auto content = std::make_shared<int>(1);
    worker.add([content] {});
    EXPECT_EQ(content.use_count(), 1);
}

}  // namespace
