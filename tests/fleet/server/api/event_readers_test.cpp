// The latest events of a fleet, and those who read them.
#include "fleet/server/api/events/event_readers.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "fleet/server/api/events/event_log.h"
#include "routes/bad_request.h"

namespace {

using fleet::EventLog;
using fleet::EventPlace;
using fleet::EventReaderRight;
using fleet::EventReaders;
using fleet::FleetEvent;

FleetEvent eventOf(const std::string& data) {
    return {"order", data, FleetEvent::Subject{"web-1", {{"env", "test"}}}};
}

class FleetEvents : public testing::Test {
protected:
    void add(int count) {
        for (int i = 0; i < count; ++i)
            log.add({eventOf("x")});
    }
    std::string idOf(std::uint64_t number) const {
        return eventIdOf(EventPlace{log.run(), number});
    }
    std::unique_ptr<http::EventSource> open(const std::string& after = "",
                                            const std::string& selector = "*") {
        return readers.open({"key", selector, {"session"}}, after);
    }

    EventLog log{EventLog::Limits{4, 1000}};
    EventReaders readers{log};
};

TEST_F(FleetEvents, HaveIdentifiersThatRise) {
    const auto stream = open();
    log.add({eventOf("a"), eventOf("b")});
    EXPECT_EQ(stream->take(), "id: " + idOf(1) + "\nevent: order\ndata: a\n\nid: " + idOf(2) +
                                  "\nevent: order\ndata: b\n\n");
    EXPECT_EQ(stream->take(), "");
    EXPECT_TRUE(stream->empty());
}

TEST_F(FleetEvents, BeginWithTheNextOneUnlessTheReaderNamesOne) {
    add(2);
    EXPECT_EQ(open()->take(), "");
    EXPECT_EQ(open()->position(), idOf(2));
    const std::string text = open(idOf(1))->take();
    EXPECT_EQ(text, "id: " + idOf(2) + "\nevent: order\ndata: x\n\n");
}

TEST_F(FleetEvents, ThatAreNotKeptAnyMoreAreAGap) {
    add(7);
    const auto stream = open(idOf(1));
    std::string text = stream->take();
    text += stream->take();
    EXPECT_EQ(text.find("id: " + idOf(3) + "\nevent: gap\ndata: {\"missing\":2}\n\n"), 0U) << text;
    EXPECT_NE(text.find("id: " + idOf(4)), std::string::npos) << text;
}

TEST_F(FleetEvents, OfAnotherRunOfTheCentreAreAGapOfUnknownLength) {
    add(1);
    const auto stream = open("0123456789abcdef-5");
    std::string text = stream->take();
    text += stream->take();
    EXPECT_EQ(text.find("id: " + idOf(0) + "\nevent: gap\ndata: {\"missing\":null}\n\n"), 0U)
        << text;
    EXPECT_NE(text.find("id: " + idOf(1)), std::string::npos) << text;
}

TEST_F(FleetEvents, AreDroppedWhereTheyNeedTooMuchRoom) {
    log.add({eventOf(std::string(600, 'x')), eventOf(std::string(600, 'y'))});
    EXPECT_EQ(log.first(), 2U);
    EXPECT_EQ(log.after(0, 10).size(), 1U);
}

TEST_F(FleetEvents, NeedAnIdentifierThatIsOne) {
    for (const char* const bad : {"1", "x-1", "0123456789abcdef-", "0123456789abcdef-x",
                                  "0123456789abcdef-1 ", "0123456789ABCDEF-1"}) {
        EXPECT_THROW(open(bad), routes::BadRequest) << bad;
    }
}

TEST_F(FleetEvents, AreShownToThoseWhoMaySeeTheHost) {
    const auto tester = open("", "env=test");
    const auto other = open("", "env=prod");
    log.add({eventOf("secret"), FleetEvent{"rollout", "all", {}}});
    EXPECT_NE(tester->take().find("secret"), std::string::npos);
    const std::string text = other->take();
    EXPECT_EQ(text.find("secret"), std::string::npos) << text;
    EXPECT_NE(text.find("data: all"), std::string::npos) << text;
}

TEST_F(FleetEvents, WakeTheirReaders) {
    const auto stream = open();
    int woken = 0;
    stream->start([&woken] { ++woken; });
    EXPECT_EQ(woken, 0);
    add(1);
    readers.wake();
    EXPECT_EQ(woken, 1);
}

TEST_F(FleetEvents, CutOffAReaderWhoIsTooSlow) {
    const auto slow = open();
    const auto quick = open();
    EXPECT_EQ(slow->take(), "");
    for (int i = 0; i < 9; ++i) {
        add(1);
        EXPECT_NE(quick->take(), "");
    }
    EXPECT_FALSE(quick->over());
    EXPECT_EQ(slow->take(), "");
    EXPECT_TRUE(slow->over());
}

TEST_F(FleetEvents, EndForThoseWhoHaveLostTheirRight) {
    const auto stream = open();
    int woken = 0;
    stream->start([&woken] { ++woken; });
    readers.endUnless(
        [](const EventReaderRight& right) { return right.session.token == "session"; });
    EXPECT_FALSE(stream->over());
    readers.endUnless([](const EventReaderRight&) { return false; });
    EXPECT_TRUE(stream->over());
    EXPECT_EQ(woken, 1);
    add(1);
    EXPECT_EQ(stream->take(), "");
}

TEST_F(FleetEvents, HaveALimitedNumberOfReaders) {
    std::vector<std::unique_ptr<http::EventSource>> streams;
    for (std::size_t i = 0; i < EventReaders::kMostOfKey; ++i)
        streams.push_back(open());
    EXPECT_EQ(open(), nullptr);
    EXPECT_NE(readers.open({"another", "*", "session"}, ""), nullptr);
    streams.pop_back();
    EXPECT_NE(open(), nullptr);
    streams.clear();
    EXPECT_TRUE(readers.isEmpty());
}

}  // namespace
