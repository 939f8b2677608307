// ctest-label: threaded
#include "ctl/client/resumed_events.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ctl/client/canned_host.h"
#include "ctl/client/failure.h"

namespace {

using ctl::EventStream;
using ctl::ResumedEvents;
using ctl::ServerEvent;
using ctl_test::CannedHost;
using ctl_test::Peer;
using testing::ElementsAre;

ctl::Deadline soon() {
    return ctl::deadlineIn(std::chrono::seconds(20));
}

/// The target of the request.
std::string targetOf(const std::string& request) {
    return request.substr(4, request.find(" HTTP/1.1") - 4);
}

/// A host that streams each of these texts to one connection and then closes it.
class HostOfStreams {
public:
    HostOfStreams(std::vector<std::string> streams, std::string begin)
        : host_([this, streams = std::move(streams), begin](const CannedHost& self) {
              for (const std::string& text : streams) {
                  const Peer peer = self.accept();
                  targets.push_back(targetOf(peer.request()));
                  peer.send("HTTP/1.1 200 OK\r\n" + begin + "\r\n");
                  peer.send(text);
              }
          }) {}

    ResumedEvents::Wish wish(const std::string& after = "") const {
        return {host_.path(), {{"TRANSID", "T"}}, after, std::chrono::seconds(20)};
    }
    void join() { host_.join(); }

    std::vector<std::string> targets;

private:
    CannedHost host_;
};

constexpr const char* kTarget = "/v1/events?table=KAGDYST&TRANSID=T";

TEST(ResumedEvents, ContinueBehindTheLastOneThatCame) {
    HostOfStreams host({"id: j-4\ndata: one\n\nid: j-9\ndata: two\n\nid: j-10\ndata: cut off",
                        "id: j-10\ndata: three\n\n"},
                       "Last-Event-ID: j-3\r\n");
    int losses = 0;
    ResumedEvents events(host.wish(), soon());
    events.onLoss = [&losses] { ++losses; };
    std::vector<std::string> seen;
    for (int i = 0; i < 3; ++i) {
        ServerEvent event;
        ASSERT_EQ(events.next(soon(), event), EventStream::Result::Event);
        seen.push_back(event.data);
    }
    host.join();
    EXPECT_THAT(seen, ElementsAre("one", "two", "three"));
    EXPECT_THAT(host.targets, ElementsAre(kTarget, std::string(kTarget) + "&after=j-9"));
    EXPECT_EQ(losses, 1);
}

TEST(ResumedEvents, ContinueFromTheBeginningWhenNoneCame) {
    HostOfStreams host({"", "id: j-4\ndata: one\n\n"}, "Last-Event-ID: j-3\r\n");
    ResumedEvents events(host.wish("j-1"), soon());
    ServerEvent event;
    EXPECT_EQ(events.next(soon(), event), EventStream::Result::Event);
    host.join();
    EXPECT_THAT(host.targets, ElementsAre(std::string(kTarget) + "&after=j-1",
                                          std::string(kTarget) + "&after=j-3"));
}

TEST(ResumedEvents, OfAHostWithoutIdentifiersEndWithTheConnection) {
    HostOfStreams host({"data: one\n\n"}, "");
    ResumedEvents events(host.wish(), soon());
    ServerEvent event;
    EXPECT_EQ(events.next(soon(), event), EventStream::Result::Event);
    EXPECT_EQ(events.next(soon(), event), EventStream::Result::Ended);
}

TEST(ResumedEvents, EndWhenTheHostIsNotFoundAgainInTime) {
    auto host =
        std::make_unique<HostOfStreams>(std::vector<std::string>{""}, "Last-Event-ID: j-3\r\n");
    ResumedEvents::Wish wish = host->wish();
    wish.patience = std::chrono::milliseconds(300);
    ResumedEvents events(wish, soon());
    host.reset();
    ServerEvent event;
    EXPECT_EQ(events.next(soon(), event), EventStream::Result::Ended);
}

TEST(ResumedEvents, AreRefusedByAHostThatDoesNotTakeThem) {
    CannedHost host([](const CannedHost& self) {
        {
            const Peer peer = self.accept();
            peer.request();
            peer.send("HTTP/1.1 200 OK\r\nLast-Event-ID: j-3\r\n\r\n");
        }
        const Peer peer = self.accept();
        peer.request();
        peer.answer(403, R"({"error": "not you"})");
    });
    ResumedEvents events({host.path(), {}, "", std::chrono::seconds(20)}, soon());
    ServerEvent event;
    try {
        events.next(soon(), event);
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kHostReportedFailure);
    }
}

}  // namespace
