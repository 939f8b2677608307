#include "ctl/client/http/event_parser.h"

#include <gtest/gtest.h>

namespace {

using ctl::EventParser;
using ctl::ServerEvent;

std::vector<ServerEvent> parse(const std::string& bytes) {
    EventParser parser;
    return parser.feed(bytes.data(), bytes.size());
}

TEST(EventParser, ReturnsAnEventWhenItsEmptyLineHasCome) {
    EXPECT_TRUE(parse("data: {\"A\": 1}\n").empty());
    const auto events = parse("data: {\"A\": 1}\n\n");
    ASSERT_EQ(events.size(), 1U);
    EXPECT_EQ(events[0].type, "message");
    EXPECT_EQ(events[0].data, "{\"A\": 1}");
    EXPECT_EQ(events[0].id, "");
}

TEST(EventParser, GivesTheSameEventsForEverySplitOfTheBytes) {
    const std::string bytes =
        ": hello\r\n\r\ndata: one\r\n\r\nevent: overflow\ndata: 3 lost\n\ndata:x\ndata: y\n\n";
    for (std::size_t split = 0; split <= bytes.size(); ++split) {
        EventParser parser;
        auto events = parser.feed(bytes.data(), split);
        for (auto& event : parser.feed(bytes.data() + split, bytes.size() - split)) {
            events.push_back(event);
        }
        ASSERT_EQ(events.size(), 3U) << "split at " << split;
        EXPECT_EQ(events[0].data, "one");
        EXPECT_EQ(events[1].type, "overflow");
        EXPECT_EQ(events[1].data, "3 lost");
        EXPECT_EQ(events[2].type, "message");
        EXPECT_EQ(events[2].data, "x\ny");
    }
}

TEST(EventParser, IgnoresCommentsUnknownFieldsAndEventsWithoutData) {
    EXPECT_TRUE(parse(": comment\n\nid: 4\n\nevent: message\n\ndatabase: no\n\n").empty());
}

}  // namespace
