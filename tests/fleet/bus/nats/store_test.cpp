#include "fleet/bus/nats/store.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "fleet/bus/nats/connecting.h"
#include "fleet/bus/nats/streams.h"

using connecting::connectedTo;
using connecting::kPatience;
using fleet::LastResult;
using fleet::StoreResult;

namespace {

class Store : public testing::Test {
protected:
    Store() {
        for (const auto& settings : {fleet::tasksStream(limits_), fleet::outStream(limits_),
                                     fleet::hostsStream(limits_)}) {
            const auto made = fleet::ensureStream(*bus_, settings, kPatience);
            if (!made.status.done()) throw std::runtime_error(made.status.text);
        }
    }

    const fleet::StreamLimits limits_{1 << 20, 1};
    NatsServer server_;
    std::unique_ptr<fleet::Connection> bus_ = connectedTo(server_);
};

}  // namespace

TEST_F(Store, TakesTheFirstMessageOnASubjectAndNoOther) {
    const auto first = storeFirst(*bus_, "task.h.1", "one", kPatience);
    EXPECT_EQ(first.kind, StoreResult::Kind::Stored) << first.text;
    EXPECT_EQ(first.sequence, 1U);
    const auto second = storeFirst(*bus_, "task.h.1", "another", kPatience);
    EXPECT_EQ(second.kind, StoreResult::Kind::Occupied);
    const auto last = lastOn(*bus_, "TASKS", "task.h.1", kPatience);
    EXPECT_EQ(last.bytes, "one");
}

TEST_F(Store, TakesTheSubjectAgainOnceItsMessageIsErased) {
    const auto first = storeFirst(*bus_, "task.h.1", "one", kPatience);
    ASSERT_TRUE(erase(*bus_, "TASKS", first.sequence, kPatience).done());
    EXPECT_EQ(lastOn(*bus_, "TASKS", "task.h.1", kPatience).kind, LastResult::Kind::Missing);
    EXPECT_EQ(storeFirst(*bus_, "task.h.1", "two", kPatience).kind, StoreResult::Kind::Stored);
}

TEST_F(Store, SaysThatAMessageToEraseIsNotThere) {
    const auto status = fleet::erase(*bus_, "TASKS", 99, kPatience);
    EXPECT_EQ(status.kind, fleet::BusStatus::Kind::Refused);
    EXPECT_EQ(status.code, 10057);
}

TEST_F(Store, ReplacesOnlyTheMessageThatIsExpected) {
    const auto one = store(*bus_, "$KV.HOSTS.h", "one", kPatience);
    const auto two = storeAfter(*bus_, "$KV.HOSTS.h", "two", one.sequence, kPatience);
    EXPECT_EQ(two.kind, StoreResult::Kind::Stored);
    const auto late = storeAfter(*bus_, "$KV.HOSTS.h", "late", one.sequence, kPatience);
    EXPECT_EQ(late.kind, StoreResult::Kind::Occupied);
    const auto last = lastOn(*bus_, "KV_HOSTS", "$KV.HOSTS.h", kPatience);
    EXPECT_EQ(last.bytes, "two");
    EXPECT_EQ(last.sequence, two.sequence);
    EXPECT_NE(last.storedAt, "");
}

TEST_F(Store, TellsAMissingMessageFromAMissingStream) {
    EXPECT_EQ(lastOn(*bus_, "TASKS", "task.h.7", kPatience).kind, LastResult::Kind::Missing);
    EXPECT_EQ(lastOn(*bus_, "NONE", "task.h.7", std::chrono::milliseconds(50)).kind,
              LastResult::Kind::NoAnswer);
}

TEST_F(Store, RefusesWhatIsTooLong) {
    const auto result = store(*bus_, "$KV.HOSTS.h", std::string(65 << 10, 'x'), kPatience);
    EXPECT_EQ(result.kind, StoreResult::Kind::Refused);
    EXPECT_EQ(result.code, 10054);
}

TEST_F(Store, RefusesMoreThanThereIsRoomForAndKeepsWhatItHas) {
    const std::string big(300 << 10, 'x');
    StoreResult result;
    int stored = 0;
    for (; result.kind == StoreResult::Kind::Stored && stored < 10; ++stored) {
        result = storeFirst(*bus_, "task.h." + std::to_string(stored), big, kPatience);
    }
    EXPECT_EQ(result.kind, StoreResult::Kind::Refused) << result.text;
    EXPECT_EQ(lastOn(*bus_, "TASKS", "task.h.0", kPatience).bytes, big);
}

TEST_F(Store, SaysThatNoStreamListens) {
    EXPECT_EQ(store(*bus_, "elsewhere", "x", kPatience).kind, StoreResult::Kind::NoAnswer);
}

TEST_F(Store, DoesNotTakeAnybodysAnswerForAnAcknowledgement) {
    const auto other = bus_->subscribe(
        "elsewhere",
        [&](const fleet::BusMessage& message) { bus_->publish(message.reply, message.data); },
        kPatience);
    for (const char* answer : {"", "no json", "[]", "{}", R"({"seq": -1})", R"({"error": 5})"}) {
        EXPECT_EQ(store(*bus_, "elsewhere", answer, kPatience).kind, StoreResult::Kind::Refused)
            << answer;
    }
}

TEST_F(Store, IsNotDeceivedByHeadersOfTheSender) {
    bus_->publish("$KV.HOSTS.h", "x", {{"Status", "404"}});
    ASSERT_TRUE(bus_->flush(kPatience).done());
    EXPECT_EQ(lastOn(*bus_, "KV_HOSTS", "$KV.HOSTS.h", kPatience).kind, LastResult::Kind::Found);
    bus_->publish("$KV.HOSTS.h", "x", {{"Nats-Sequence", "77"}, {"Nats-Subject", "$KV.HOSTS.g"}});
    ASSERT_TRUE(bus_->flush(kPatience).done());
    const auto last = lastOn(*bus_, "KV_HOSTS", "$KV.HOSTS.h", kPatience);
    EXPECT_NE(last.sequence, 77U);
}

TEST_F(Store, RepublishesWhatIsStored) {
    std::string subject;
    std::atomic<bool> heard{false};
    const auto subscribed = bus_->subscribe(
        "rp.task.h.*",
        [&](const fleet::BusMessage& message) {
            subject = message.subject;
            heard = true;
        },
        kPatience);
    ASSERT_EQ(storeFirst(*bus_, "task.h.1", "one", kPatience).kind, StoreResult::Kind::Stored);
    ASSERT_TRUE(eventually([&] { return heard.load(); }));
    EXPECT_EQ(subject, "rp.task.h.1");
}

TEST_F(Store, KeepsWhatItHasOverARestart) {
    ASSERT_EQ(storeFirst(*bus_, "task.h.1", "one", kPatience).kind, StoreResult::Kind::Stored);
    server_.stop();
    server_.start();
    bus_ = connectedTo(server_);
    EXPECT_EQ(lastOn(*bus_, "TASKS", "task.h.1", kPatience).bytes, "one");
}

namespace {

/// Enough that they are under way at the same time.
constexpr int kMany = 200;

std::string subjectOf(int order) {
    return "task.h." + std::to_string(order);
}

}  // namespace

TEST_F(Store, TakesManyTogetherAndTellsOfEachByItself) {
    ASSERT_EQ(storeFirst(*bus_, subjectOf(7), "was there", kPatience).kind,
              StoreResult::Kind::Stored);
    std::vector<std::string> texts;
    for (int i = 0; i < kMany; ++i)
        texts.push_back("order " + std::to_string(i));
    std::vector<fleet::StoreRequest> orders;
    for (int i = 0; i < kMany; ++i)
        orders.push_back({subjectOf(i), texts[static_cast<std::size_t>(i)]});
    const std::vector<StoreResult> results = storeFirst(*bus_, orders, kPatience);
    ASSERT_EQ(results.size(), orders.size());
    for (int i = 0; i < kMany; ++i) {
        EXPECT_EQ(results[static_cast<std::size_t>(i)].kind,
                  i == 7 ? StoreResult::Kind::Occupied : StoreResult::Kind::Stored)
            << i;
    }
    std::vector<std::string> subjects;
    for (int i = 0; i <= kMany; ++i)
        subjects.push_back(subjectOf(i));
    const std::vector<LastResult> found = lastOn(*bus_, "TASKS", subjects, kPatience);
    ASSERT_EQ(found.size(), subjects.size());
    std::vector<std::uint64_t> sequences;
    for (int i = 0; i < kMany; ++i) {
        const LastResult& one = found[static_cast<std::size_t>(i)];
        EXPECT_EQ(one.bytes, i == 7 ? "was there" : texts[static_cast<std::size_t>(i)]);
        sequences.push_back(one.sequence);
    }
    EXPECT_EQ(found.back().kind, LastResult::Kind::Missing);
    for (const fleet::BusStatus& status : erase(*bus_, "TASKS", sequences, kPatience))
        EXPECT_TRUE(status.done()) << status.text;
    for (const LastResult& one : lastOn(*bus_, "TASKS", subjects, kPatience))
        EXPECT_EQ(one.kind, LastResult::Kind::Missing);
}

/// Nothing of a group is still under way when the answer is there: closing the connection loses
/// nothing that was said to be stored.
TEST_F(Store, HasWhatItHasSaidToBeStoredTogetherWhenTheConnectionIsGone) {
    std::vector<fleet::StoreRequest> orders;
    for (int i = 0; i < kMany; ++i)
        orders.push_back({subjectOf(i), "order"});
    const std::vector<StoreResult> results = storeFirst(*bus_, orders, kPatience);
    bus_.reset();
    bus_ = connectedTo(server_);
    for (int i = 0; i < kMany; ++i) {
        ASSERT_EQ(results[static_cast<std::size_t>(i)].kind, StoreResult::Kind::Stored);
        EXPECT_EQ(lastOn(*bus_, "TASKS", subjectOf(i), kPatience).kind, LastResult::Kind::Found);
    }
}

TEST_F(Store, AnswersNoneOfThoseAskedTogetherWhenItIsAway) {
    server_.kill();
    ASSERT_TRUE(eventually([&] { return !bus_->connected(); }));
    const std::vector<fleet::StoreRequest> orders = {{subjectOf(1), "a"}, {subjectOf(2), "b"}};
    for (const StoreResult& result : storeFirst(*bus_, orders, kPatience))
        EXPECT_EQ(result.kind, StoreResult::Kind::NoAnswer);
    EXPECT_TRUE(storeFirst(*bus_, std::vector<fleet::StoreRequest>(), kPatience).empty());
}
