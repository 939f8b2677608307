// ctest-label: threaded
#include "host/journal/event_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

namespace {

using host::EventKind;
using host::EventLog;
using host::JournalEvent;
using testing::ElementsAre;
using testing::IsEmpty;

JournalEvent event(std::int64_t number, const std::string& row = "row") {
    return {number, EventKind::Row, 0, row};
}

std::vector<std::int64_t> numbersAfter(const EventLog& log, std::int64_t position,
                                       std::size_t most = 100) {
    std::vector<std::int64_t> numbers;
    const auto found = log.after(position, most);
    if (!found) return {-1};
    for (const JournalEvent& each : *found)
        numbers.push_back(each.number);
    return numbers;
}

TEST(EventLog, GivesWhatComesBehindAPosition) {
    EventLog log(7);
    EXPECT_EQ(log.last(), 7);
    log.append({event(8), event(9), event(10)});
    EXPECT_EQ(log.last(), 10);
    EXPECT_THAT(numbersAfter(log, 7), ElementsAre(8, 9, 10));
    EXPECT_THAT(numbersAfter(log, 9), ElementsAre(10));
    EXPECT_THAT(numbersAfter(log, 10), IsEmpty());
    EXPECT_THAT(numbersAfter(log, 7, 2), ElementsAre(8, 9));
}

TEST(EventLog, SaysSoWhenItDoesNotReachBackThatFar) {
    EventLog log(7);
    EXPECT_THAT(numbersAfter(log, 6), ElementsAre(-1)) << "that was before";
    EXPECT_THAT(numbersAfter(log, 7), IsEmpty());
    log.append({event(8)});
    EXPECT_THAT(numbersAfter(log, 6), ElementsAre(-1));
    EXPECT_THAT(numbersAfter(log, 7), ElementsAre(8));
}

TEST(EventLog, KeepsRowsAsTheyAre) {
    EventLog log(0);
    const std::string row = "a" + std::string(200, ' ') + std::string("\0\xFF", 2);
    log.append({{1, EventKind::Row, 5, row}, {2, EventKind::TaskEnd, 5, ""}});
    const auto found = log.after(0, 10);
    ASSERT_TRUE(found.has_value());
    EXPECT_EQ(found->at(0).row, row);
    EXPECT_EQ(found->at(0).task, 5);
    EXPECT_EQ(found->at(1).kind, EventKind::TaskEnd);
}

TEST(EventLog, LetsTheOldestGo) {
    EventLog few(0, {3, 1000});
    for (int i = 1; i <= 5; ++i)
        few.append({event(i)});
    EXPECT_THAT(numbersAfter(few, 1), ElementsAre(-1));
    EXPECT_THAT(numbersAfter(few, 2), ElementsAre(3, 4, 5));
    EventLog small(0, {1000, 100});
    for (int i = 1; i <= 5; ++i)
        small.append({event(i, std::string(40, 'x'))});
    EXPECT_THAT(numbersAfter(small, 2), ElementsAre(-1));
    EXPECT_THAT(numbersAfter(small, 3), ElementsAre(4, 5));
    small.append({event(6, std::string(1000, 'x'))});
    EXPECT_THAT(numbersAfter(small, 5), ElementsAre(6)) << "one of any size has room";
}

TEST(EventLog, CallsWhoeverWaitsAfterItHasTheEvents) {
    EventLog log(0);
    std::vector<std::int64_t> seen;
    log.whenNew([&] { seen.push_back(log.last()); });
    log.append({event(1), event(2)});
    log.append({event(3)});
    log.whenNew({});
    log.append({event(4)});
    EXPECT_THAT(seen, ElementsAre(2, 3));
}

}  // namespace
