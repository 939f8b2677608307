#include "host/tables/row_queue.h"

#include <gtest/gtest.h>

#include <new>

namespace {

using host::RowQueue;

oxa::Rows rows(const std::string& bytes, unsigned rowSize = 1) {
    return {bytes, rowSize};
}

struct Woken {
    int times = 0;
    std::function<void()> counter() {
        return [this] { ++times; };
    }
};

TEST(RowQueue, HandsRowsOnInOrderAndWakesOnce) {
    Woken woken;
    RowQueue queue({});
    queue.onContent(woken.counter());
    EXPECT_TRUE(queue.empty());
    EXPECT_EQ(queue.push(rows("a")), OXA_OK);
    EXPECT_EQ(queue.push(rows("bc")), OXA_OK);
    EXPECT_EQ(woken.times, 1);
    EXPECT_FALSE(queue.empty());
    const RowQueue::Batch batch = queue.take();
    EXPECT_EQ(batch.rows.bytes, "abc");
    EXPECT_EQ(batch.rows.count(), 3U);
    EXPECT_EQ(batch.lost, 0U);
    EXPECT_TRUE(queue.take().empty());
    EXPECT_EQ(queue.push(rows("d")), OXA_OK);
    EXPECT_EQ(woken.times, 2);
}

TEST(RowQueue, ADispatchWithoutRowsIsNothing) {
    Woken woken;
    RowQueue queue({});
    queue.onContent(woken.counter());
    EXPECT_EQ(queue.push(rows("")), OXA_OK);
    EXPECT_EQ(queue.push(oxa::Rows{}), OXA_OK);
    EXPECT_EQ(woken.times, 0);
    EXPECT_TRUE(queue.empty());
}

TEST(RowQueue, WakesAReaderThatComesLaterThanItsRows) {
    Woken woken;
    RowQueue queue({});
    queue.push(rows("a"));
    queue.onContent(woken.counter());
    EXPECT_EQ(woken.times, 1);
    queue.push(rows("b"));
    EXPECT_EQ(woken.times, 1) << "the reader knows already";
    EXPECT_EQ(queue.take().rows.bytes, "ab");
}

TEST(RowQueue, MayBeReadFromItsWake) {
    RowQueue queue({});
    std::string seen;
    queue.onContent([&] { seen += queue.take().rows.bytes; });
    queue.push(rows("a"));
    queue.push(rows("b"));
    EXPECT_EQ(seen, "ab");
}

TEST(RowQueue, CountsWhatDoesNotFit) {
    RowQueue queue({4, 1000});
    EXPECT_EQ(queue.push(rows("abc")), OXA_OK);
    EXPECT_EQ(queue.push(rows("def")), OXA_OVERFLOW);
    EXPECT_EQ(queue.push(rows("gh")), OXA_OVERFLOW);
    const RowQueue::Batch batch = queue.take();
    EXPECT_EQ(batch.rows.bytes, "abcd");
    EXPECT_EQ(batch.lost, 4U);
    EXPECT_EQ(queue.push(rows("xyz")), OXA_OK) << "the reader has caught up";
    EXPECT_EQ(queue.take().rows.bytes, "xyz");
}

TEST(RowQueue, RowsAfterALossAreLostTooSoThatTheOrderHolds) {
    RowQueue queue({100, 10});
    EXPECT_EQ(queue.push(rows("12345678", 4)), OXA_OK);
    EXPECT_EQ(queue.push(rows("abcd", 4)), OXA_OVERFLOW) << "two bytes are left";
    const RowQueue::Batch batch = queue.take();
    EXPECT_EQ(batch.rows.bytes, "12345678");
    EXPECT_EQ(batch.lost, 1U);
}

TEST(RowQueue, ARowWiderThanTheQueuePassesAlone) {
    RowQueue queue({100, 10});
    const std::string wide(50, 'w');
    EXPECT_EQ(queue.push(rows(wide, 50)), OXA_OK);
    EXPECT_EQ(queue.push(rows(wide, 50)), OXA_OVERFLOW);
    EXPECT_EQ(queue.take().rows.bytes, wide);
    EXPECT_EQ(queue.push(rows(wide + wide, 50)), OXA_OVERFLOW);
    const RowQueue::Batch batch = queue.take();
    EXPECT_EQ(batch.rows.count(), 1U);
    EXPECT_EQ(batch.lost, 1U);
}

TEST(RowQueue, AWakeThatFailsLeavesTheQueueUsable) {
    bool fail = true;
    RowQueue queue({});
    queue.onContent([&] {
        if (fail) throw std::bad_alloc();
    });
    EXPECT_EQ(queue.push(rows("a")), OXA_OVERFLOW);
    fail = false;
    EXPECT_EQ(queue.push(rows("b")), OXA_OK);
    EXPECT_EQ(queue.take().rows.bytes, "b");
}

}  // namespace
