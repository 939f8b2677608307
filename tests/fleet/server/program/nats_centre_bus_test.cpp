#include "fleet/server/program/nats_centre_bus.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <variant>
#include <vector>

#include "fleet/bus/nats/streams.h"
#include "tests/fleet/bus/nats/connecting.h"

namespace {

using connecting::connectedTo;
using connecting::kPatience;
using fleet::OrderPlace;
using fleet::PlacedOrder;
using fleet::StoreAnswer;

constexpr int kStreamBytes = 1 << 20;

/// The tasks' stream of a real server, and the centre's way to it.
class CentreOnItsBus : public testing::Test {
protected:
    CentreOnItsBus() {
        const auto made =
            fleet::ensureStream(*bus_, fleet::tasksStream({kStreamBytes, 1}), kPatience);
        if (!made.status.done()) throw std::runtime_error(made.status.text);
    }

    StoreAnswer store(const OrderPlace& place, const std::string& bytes) {
        return centre_.store({{place, bytes}}).front();
    }

    NatsServer server_;
    std::unique_ptr<fleet::Connection> bus_ = connectedTo(server_);
    bool mayChange_ = true;
    fleet::NatsCentreBus centre_{*bus_, [this] { return mayChange_; }};
};

TEST_F(CentreOnItsBus, StoresFetchesAndErasesOrders) {
    const std::vector<StoreAnswer> answers =
        centre_.store({{{"h", 1}, "one"}, {{"h", 2}, "two"}, {{"h", 1}, "another"}});
    ASSERT_EQ(answers.size(), 3U);
    EXPECT_TRUE(std::holds_alternative<fleet::Stored>(answers[0]));
    EXPECT_TRUE(std::holds_alternative<fleet::Stored>(answers[1]));
    EXPECT_TRUE(std::holds_alternative<fleet::Occupied>(answers[2]));

    const auto found = centre_.fetch({{"h", 1}, {"h", 3}});
    ASSERT_EQ(found.size(), 2U);
    const auto* const one = std::get_if<fleet::StoredOrder>(&found[0]);
    ASSERT_NE(one, nullptr);
    EXPECT_EQ(one->bytes, "one");
    EXPECT_TRUE(std::holds_alternative<fleet::NotThere>(found[1]));

    centre_.erase({one->sequence});
    EXPECT_TRUE(std::holds_alternative<fleet::NotThere>(centre_.fetch({{"h", 1}}).front()));
}

TEST_F(CentreOnItsBus, SaysWhichOrdersFindNoRoomThere) {
    const std::string large(400'000, 'x');
    EXPECT_TRUE(std::holds_alternative<fleet::Stored>(store({"h", 1}, large)));
    EXPECT_TRUE(std::holds_alternative<fleet::Stored>(store({"h", 2}, large)));
    EXPECT_TRUE(std::holds_alternative<fleet::NoRoom>(store({"h", 3}, large)));
    EXPECT_TRUE(std::holds_alternative<fleet::Stored>(store({"h", 3}, "short")));
}

TEST_F(CentreOnItsBus, ChangesNothingWhenAnotherCentreWorks) {
    EXPECT_TRUE(std::holds_alternative<fleet::Stored>(store({"h", 1}, "one")));
    const auto one = centre_.fetch({{"h", 1}}).front();
    mayChange_ = false;
    EXPECT_TRUE(std::holds_alternative<fleet::Unanswered>(store({"h", 2}, "two")));
    centre_.erase({std::get<fleet::StoredOrder>(one).sequence});
    EXPECT_TRUE(std::holds_alternative<fleet::StoredOrder>(centre_.fetch({{"h", 1}}).front()));
    EXPECT_TRUE(std::holds_alternative<fleet::NotThere>(centre_.fetch({{"h", 2}}).front()));
}

}  // namespace
