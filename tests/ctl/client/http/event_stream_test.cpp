// ctest-label: threaded
#include "ctl/client/http/event_stream.h"

#include <gtest/gtest.h>

#include "ctl/client/canned_host.h"
#include "ctl/client/failure.h"

namespace {

using ctl::EventStream;
using ctl::ServerEvent;
using ctl_test::CannedHost;
using ctl_test::Peer;

ctl::Deadline soon() {
    return ctl::deadlineIn(std::chrono::seconds(20));
}

TEST(EventStream, GivesEventsUntilTheHostClosesIt) {
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.beginStream();
        peer.send("data: one\n\ndata: two\n\ndata: unfinished");
    });
    EventStream stream(host.path(), "KAGDYST", {{"TRANSID", "a b&"}}, soon());
    ServerEvent event;
    ASSERT_EQ(stream.next(soon(), event), EventStream::Result::Event);
    EXPECT_EQ(event.data, "one");
    ASSERT_EQ(stream.next(soon(), event), EventStream::Result::Event);
    EXPECT_EQ(event.data, "two");
    EXPECT_EQ(stream.next(soon(), event), EventStream::Result::Ended);
    host.join();
    EXPECT_EQ(request.rfind("GET /v1/events?table=KAGDYST&TRANSID=a%20b%26 HTTP/1.1\r\n", 0), 0U)
        << request;
}

TEST(EventStream, ThatTheHostRefusesSaysWhy) {
    const CannedHost host([](const CannedHost& self) {
        const Peer peer = self.accept();
        peer.request();
        peer.answer(503, R"({"error": "too many streams"})");
    });
    try {
        EventStream stream(host.path(), "KAGDYST", {}, soon());
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kHostReportedFailure);
        EXPECT_STREQ(failure.what(), "the host refused the request: too many streams");
    }
}

TEST(EventStream, TimesOutAtItsDeadline) {
    const CannedHost host([](const CannedHost& self) {
        const Peer peer = self.accept();
        peer.request();
        peer.beginStream();
        peer.request();  // ends when the client has closed the connection
    });
    EventStream stream(host.path(), "KAGDYST", {}, soon());
    ServerEvent event;
    EXPECT_EQ(stream.next(ctl::deadlineIn(std::chrono::milliseconds(1)), event),
              EventStream::Result::TimedOut);
}

}  // namespace
