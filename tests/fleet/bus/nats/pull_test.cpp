#include "fleet/bus/nats/pull.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <thread>

#include "fleet/bus/nats/connecting.h"
#include "fleet/bus/nats/store.h"
#include "fleet/bus/nats/streams.h"

using connecting::connectedTo;
using connecting::kPatience;
using fleet::Pull;
using namespace std::chrono_literals;

namespace {

class PullFromOut : public testing::Test {
protected:
    PullFromOut() {
        const auto made = ensureStream(*bus_, fleet::outStream({1 << 20, 1}), kPatience);
        if (!made.status.done()) throw std::runtime_error(made.status.text);
        open();
    }
    void open() {
        pull_.reset();
        auto opened = Pull::open(*bus_, settings_, kPatience);
        if (!opened.pull) throw std::runtime_error(opened.status.text);
        pull_ = std::move(opened.pull);
    }
    /// From a consumer whose messages come again soon.
    void openImpatient() {
        settings_.name = "impatient";
        settings_.acknowledgeWithin = 100ms;
        open();
    }
    void send(const std::string& host, const std::string& text) {
        const auto stored = store(*bus_, "out." + host, text, kPatience);
        ASSERT_EQ(stored.kind, fleet::StoreResult::Kind::Stored) << stored.text;
    }

    fleet::PullSettings settings_{"OUT", "centre", std::chrono::hours(1), 10};
    NatsServer server_;
    std::unique_ptr<fleet::Connection> bus_ = connectedTo(server_);
    std::unique_ptr<Pull> pull_;
};

}  // namespace

TEST_F(PullFromOut, GivesWhatIsThereInItsOrder) {
    send("a", "1");
    send("b", "2");
    send("a", "3");
    const auto batch = pull_->fetch(10, 0ms, kPatience);
    ASSERT_TRUE(batch.status.done()) << batch.status.text;
    ASSERT_EQ(batch.messages.size(), 3U);
    EXPECT_EQ(batch.messages[0].bytes, "1");
    EXPECT_EQ(batch.messages[1].subject, "out.b");
    EXPECT_EQ(batch.messages[2].bytes, "3");
}

TEST_F(PullFromOut, GivesNoMoreThanIsAskedFor) {
    for (const char* text : {"1", "2", "3"})
        send("a", text);
    EXPECT_EQ(pull_->fetch(2, 0ms, kPatience).messages.size(), 2U);
    EXPECT_EQ(pull_->fetch(2, 0ms, kPatience).messages.size(), 1U);
}

TEST_F(PullFromOut, SaysAtOnceThatThereIsNothing) {
    const auto batch = pull_->fetch(10, 0ms, kPatience);
    EXPECT_TRUE(batch.status.done()) << batch.status.text;
    EXPECT_TRUE(batch.messages.empty());
}

TEST_F(PullFromOut, IsDoneWithNothingWhenNothingComesWithinTheWait) {
    const auto batch = pull_->fetch(10, 50ms, kPatience);
    EXPECT_TRUE(batch.status.done()) << batch.status.text;
    EXPECT_TRUE(batch.messages.empty());
}

TEST_F(PullFromOut, WaitsForTheFirstMessage) {
    Pull::Batch batch;
    std::thread waits([&] { batch = pull_->fetch(10, kPatience, kPatience); });
    send("a", "1");
    waits.join();
    ASSERT_EQ(batch.messages.size(), 1U);
    EXPECT_EQ(batch.messages[0].bytes, "1");
}

TEST_F(PullFromOut, GivesAgainWhatIsNotAcknowledged) {
    openImpatient();
    send("a", "1");
    ASSERT_EQ(pull_->fetch(1, 0ms, kPatience).messages.size(), 1U);
    const auto again = pull_->fetch(1, kPatience, kPatience);
    ASSERT_EQ(again.messages.size(), 1U);
    EXPECT_EQ(again.messages[0].bytes, "1");
}

TEST_F(PullFromOut, GivesAgainAtOnceWhatIsRefused) {
    send("a", "1");
    const auto first = pull_->fetch(1, 0ms, kPatience);
    ASSERT_EQ(first.messages.size(), 1U);
    ASSERT_TRUE(pull_->refuse(first.messages[0]).done());
    EXPECT_EQ(pull_->fetch(1, kPatience, kPatience).messages.size(), 1U);
}

TEST_F(PullFromOut, NeverGivesAgainWhatIsAcknowledgedEvenAfterARestart) {
    openImpatient();
    send("a", "1");
    const auto first = pull_->fetch(1, 0ms, kPatience);
    ASSERT_EQ(first.messages.size(), 1U);
    ASSERT_TRUE(pull_->acknowledge(first.messages[0]).done());
    ASSERT_TRUE(bus_->flush(kPatience).done());
    pull_.reset();
    server_.stop();
    server_.start();
    bus_ = connectedTo(server_);
    open();
    // The second message comes again and again, so the first one would have, too.
    send("a", "2");
    std::set<std::string> texts;
    for (int i = 0; i < 3; ++i) {
        for (const auto& message : pull_->fetch(1, kPatience, kPatience).messages)
            texts.insert(message.bytes);
    }
    EXPECT_EQ(texts, std::set<std::string>{"2"});
}

TEST_F(PullFromOut, IsNotDeceivedByHeadersOfTheSender) {
    bus_->publish("out.a", "1", {{"Status", "404"}, {"Description", "No Messages"}});
    ASSERT_TRUE(bus_->flush(kPatience).done());
    const auto batch = pull_->fetch(1, 0ms, kPatience);
    ASSERT_EQ(batch.messages.size(), 1U);
    EXPECT_EQ(batch.messages[0].bytes, "1");
}

TEST_F(PullFromOut, SaysThatTheServerIsAway) {
    server_.kill();
    ASSERT_TRUE(eventually([&] { return !bus_->connected(); }));
    EXPECT_EQ(pull_->fetch(1, 0ms, kPatience).status.kind, fleet::BusStatus::Kind::NoAnswer);
}

TEST_F(PullFromOut, GoesOnWhenTheServerIsBack) {
    openImpatient();
    send("a", "1");
    server_.stop();
    server_.start();
    ASSERT_TRUE(eventually([&] { return bus_->connected(); }));
    Pull::Batch batch;
    ASSERT_TRUE(eventually([&] {
        batch = pull_->fetch(1, 0ms, 100ms);
        return !batch.messages.empty();
    }));
    EXPECT_EQ(batch.messages[0].bytes, "1");
}

TEST(PullOpen, SaysThatThereIsNoStream) {
    const NatsServer server;
    const auto bus = connectedTo(server);
    const auto opened = Pull::open(*bus, {"OUT", "centre"}, kPatience);
    EXPECT_FALSE(opened.pull);
    EXPECT_EQ(opened.status.kind, fleet::BusStatus::Kind::Refused);
    EXPECT_EQ(opened.status.code, 10059);
}
