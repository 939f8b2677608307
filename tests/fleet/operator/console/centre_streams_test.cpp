// ctest-label: threaded
// The centre's events on their way through the console, with a centre whose every word is written
// by the test.
#include "fleet/operator/console/reads/centre_streams.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <utility>

#include "ctl/console/served_console.h"
#include "fleet/operator/console/fleet_backend.h"
#include "support/host/program.h"
#include "tests/fleet/https/tls_server.h"
#include "tests/fleet/operator/certified.h"

namespace {

using console_test::ServedConsole;
using fleet_test::TlsPeer;
using fleet_test::TlsServer;
using operator_test::kHour;

constexpr const char* kStreamHead =
    "HTTP/1.1 200 OK\r\nContent-Type: text/event-stream\r\nLast-Event-ID: r-16\r\n"
    "Connection: close\r\n\r\n";

class EventsOfAFleet : public testing::Test {
protected:
    /// A centre that opens a session and then plays its part on the connection of the events.
    void begin(const std::function<void(TlsPeer& peer)>& part) {
        centre_ = std::make_unique<TlsServer>(certificate_, [part](TlsServer& self) {
            TlsPeer opening = self.accept();
            opening.request();
            opening.answer(200, R"({"session":"s1"})");
            TlsPeer events = self.accept();
            part(events);
        });
        fleet::FleetBackend::Settings settings{
            root_.certified({"START"}, {"ux"}, "*", now_ + kHour)};
        settings.identity.url = centre_->url();
        settings.identity.authority = authority_.certificate();
        served_.emplace(std::make_unique<fleet::FleetBackend>(std::move(settings)));
        served_->open();
    }
    RawClient ask(const std::string& lines = "") const {
        RawClient client = served_->connect();
        client.send(served_->get("/v1/events", served_->cookie() + lines));
        return client;
    }

    const operator_test::Root root_;
    const fleet::Moment now_ = fleet_test::wallTime();
    const fleet::CertificateAuthority authority_ =
        fleet::CertificateAuthority::make("demo", now_, now_ + kHour);
    const fleet::ServerCertificate certificate_ =
        authority_.issue({"centre.example", "127.0.0.1"}, now_, now_ + kHour);
    std::unique_ptr<TlsServer> centre_;
    std::optional<ServedConsole> served_;
};

TEST_F(EventsOfAFleet, ArePassedOnAsTheyCome) {
    std::string seen;
    std::atomic<bool> hasFirst{false};
    begin([&](TlsPeer& peer) {
        seen = peer.request();
        peer.send(kStreamHead);
        peer.send("id: r-17\nevent: host\ndata: {}\n\nid: r-18\nda");
        while (!hasFirst)
            sleepBriefly();
        peer.send("ta: {}\n");
        peer.send("\n");
    });
    RawClient client = ask("Last-Event-ID: r-15\r\n");
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_NE(head.find("Content-Type: text/event-stream\r\n"), std::string::npos) << head;
    EXPECT_NE(head.find("Last-Event-ID: r-16\r\n"), std::string::npos) << head;
    EXPECT_EQ(client.readUntil("\n\n"), "id: r-17\nevent: host\ndata: {}\n\n");
    hasFirst = true;
    EXPECT_EQ(client.readUntil("\n\n"), "id: r-18\ndata: {}\n\n");
    EXPECT_TRUE(client.isClosed()) << "the centre has gone";
    centre_->join();
    EXPECT_NE(seen.find("Last-Event-ID: r-15\r\n"), std::string::npos) << seen;
    EXPECT_NE(seen.find("Authorization: Bearer s1\r\n"), std::string::npos) << seen;
}

TEST_F(EventsOfAFleet, BeginBeforeTheFirstOneComes) {
    std::atomic<bool> isOver{false};
    begin([&](TlsPeer& peer) {
        peer.request();
        peer.send(kStreamHead);
        while (!isOver)
            sleepBriefly();
    });
    RawClient client = ask();
    EXPECT_EQ(client.readUntil("\r\n\r\n").substr(0, 12), "HTTP/1.1 200");
    isOver = true;
    centre_->join();
}

TEST_F(EventsOfAFleet, EndAtTheCentreWhenTheirBrowserGoes) {
    std::atomic<bool> hasEnded{false};
    begin([&](TlsPeer& peer) {
        peer.request();
        peer.send(kStreamHead);
        peer.send("data: one\n\n");
        hasEnded = peer.request().empty();  // returns when the other side closes
    });
    {
        RawClient client = ask();
        client.readUntil("data: one\n\n");
    }
    EXPECT_TRUE(eventually([&] { return hasEnded.load(); }));
    centre_->join();
}

TEST_F(EventsOfAFleet, ThatAreRefusedAreAnAnswer) {
    begin([](TlsPeer& peer) {
        peer.request();
        peer.answer(503, R"({"error":"there are too many readers"})");
    });
    RawClient client = ask();
    const auto answer = client.readAnswer();
    EXPECT_EQ(answer.status, 503);
    EXPECT_EQ(answer.body, R"({"error":"there are too many readers"})");
}

TEST_F(EventsOfAFleet, OfASlowBrowserHoldBackTheCentre) {
    constexpr std::size_t kMuch = std::size_t{64} * 1024 * 1024;
    std::atomic<std::size_t> sent{0};
    begin([&](TlsPeer& peer) {
        peer.request();
        peer.send(kStreamHead);
        const std::string event = "data: " + std::string(10'000, 'x') + "\n\n";
        while (sent < kMuch && peer.send(event))
            sent += event.size();
    });
    RawClient client = ask();
    client.readUntil("data: ");
    // Once the sender stands still, all that may be held is held.
    std::size_t before = 0;
    EXPECT_TRUE(eventually([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(300));
        return std::exchange(before, sent) == sent;
    }));
    EXPECT_LT(sent, kMuch);
    client.close();
    centre_->join();
}

}  // namespace
