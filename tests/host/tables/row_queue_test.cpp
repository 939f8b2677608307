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
    EXPECT_EQ(OXA_OK, queue.push(rows("a")));
    EXPECT_EQ(OXA_OK, queue.push(rows("bc")));
    EXPECT_EQ(1, woken.times);
    EXPECT_FALSE(queue.empty());
    const RowQueue::Batch batch = queue.take();
    EXPECT_EQ("abc", batch.rows.bytes);
    EXPECT_EQ(3U, batch.rows.count());
    EXPECT_EQ(0U, batch.lost);
    EXPECT_TRUE(queue.take().empty());
    EXPECT_EQ(OXA_OK, queue.push(rows("d")));
    EXPECT_EQ(2, woken.times);
}

TEST(RowQueue, ADispatchWithoutRowsIsNothing) {
    Woken woken;
    RowQueue queue({});
    queue.onContent(woken.counter());
    EXPECT_EQ(OXA_OK, queue.push(rows("")));
    EXPECT_EQ(OXA_OK, queue.push(oxa::Rows{}));
    EXPECT_EQ(0, woken.times);
    EXPECT_TRUE(queue.empty());
}

TEST(RowQueue, WakesAReaderThatComesLaterThanItsRows) {
    Woken woken;
    RowQueue queue({});
    queue.push(rows("a"));
    queue.onContent(woken.counter());
    EXPECT_EQ(1, woken.times);
    queue.push(rows("b"));
    EXPECT_EQ(1, woken.times) << "the reader knows already";
    EXPECT_EQ("ab", queue.take().rows.bytes);
}

TEST(RowQueue, MayBeReadFromItsWake) {
    RowQueue queue({});
    std::string seen;
    queue.onContent([&] { seen += queue.take().rows.bytes; });
    queue.push(rows("a"));
    queue.push(rows("b"));
    EXPECT_EQ("ab", seen);
}

TEST(RowQueue, CountsWhatDoesNotFit) {
    RowQueue queue({4, 1000});
    EXPECT_EQ(OXA_OK, queue.push(rows("abc")));
    EXPECT_EQ(OXA_OVERFLOW, queue.push(rows("def")));
    EXPECT_EQ(OXA_OVERFLOW, queue.push(rows("gh")));
    const RowQueue::Batch batch = queue.take();
    EXPECT_EQ("abcd", batch.rows.bytes);
    EXPECT_EQ(4U, batch.lost);
    EXPECT_EQ(OXA_OK, queue.push(rows("xyz"))) << "the reader has caught up";
    EXPECT_EQ("xyz", queue.take().rows.bytes);
}

TEST(RowQueue, RowsAfterALossAreLostTooSoThatTheOrderHolds) {
    RowQueue queue({100, 10});
    EXPECT_EQ(OXA_OK, queue.push(rows("12345678", 4)));
    EXPECT_EQ(OXA_OVERFLOW, queue.push(rows("abcd", 4))) << "two bytes are left";
    const RowQueue::Batch batch = queue.take();
    EXPECT_EQ("12345678", batch.rows.bytes);
    EXPECT_EQ(1U, batch.lost);
}

TEST(RowQueue, ARowWiderThanTheQueuePassesAlone) {
    RowQueue queue({100, 10});
    const std::string wide(50, 'w');
    EXPECT_EQ(OXA_OK, queue.push(rows(wide, 50)));
    EXPECT_EQ(OXA_OVERFLOW, queue.push(rows(wide, 50)));
    EXPECT_EQ(wide, queue.take().rows.bytes);
    EXPECT_EQ(OXA_OVERFLOW, queue.push(rows(wide + wide, 50)));
    const RowQueue::Batch batch = queue.take();
    EXPECT_EQ(1U, batch.rows.count());
    EXPECT_EQ(1U, batch.lost);
}

TEST(RowQueue, AWakeThatFailsLeavesTheQueueUsable) {
    bool fail = true;
    RowQueue queue({});
    queue.onContent([&] {
        if (fail) throw std::bad_alloc();
    });
    EXPECT_EQ(OXA_OVERFLOW, queue.push(rows("a")));
    fail = false;
    EXPECT_EQ(OXA_OK, queue.push(rows("b")));
    EXPECT_EQ("b", queue.take().rows.bytes);
}

}  // namespace
