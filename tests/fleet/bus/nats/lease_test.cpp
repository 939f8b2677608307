#include "fleet/bus/nats/lease.h"

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "fleet/bus/nats/connecting.h"
#include "fleet/bus/nats/streams.h"

using connecting::connectedTo;
using connecting::kPatience;
using fleet::Lease;
using Kind = fleet::Lease::State::Kind;
using namespace std::chrono_literals;

namespace {

class LeaseOfCentre : public testing::Test {
protected:
    LeaseOfCentre() {
        const auto made = ensureStream(*bus_, fleet::centreStream({1 << 20, 1}), kPatience);
        if (!made.status.done()) throw std::runtime_error(made.status.text);
    }
    Lease lease(const std::string& holder, fleet::Connection::Milliseconds deadline = kPatience) {
        return Lease(*bus_, {"KV_CENTRE", "$KV.CENTRE.lease", holder, 30s, deadline},
                     [this] { return now_; });
    }

    NatsServer server_;
    std::unique_ptr<fleet::Connection> bus_ = connectedTo(server_);
    Lease::Clock::time_point now_{std::chrono::hours(1000)};
};

}  // namespace

TEST_F(LeaseOfCentre, BelongsToWhoClaimsItFirst) {
    Lease a = lease("a");
    Lease b = lease("b");
    EXPECT_EQ(a.claim().kind, Kind::Ours);
    const auto state = b.claim();
    EXPECT_EQ(state.kind, Kind::Others);
    EXPECT_EQ(state.holder, "a");
    EXPECT_EQ(a.renew().kind, Kind::Ours);
}

TEST_F(LeaseOfCentre, StaysWithWhoRenewsIt) {
    Lease a = lease("a");
    Lease b = lease("b");
    ASSERT_EQ(a.claim().kind, Kind::Ours);
    for (int i = 0; i < 20; ++i) {
        now_ += 10s;
        ASSERT_EQ(a.renew().kind, Kind::Ours);
        ASSERT_EQ(b.claim().kind, Kind::Others);
    }
}

TEST_F(LeaseOfCentre, IsFreeWhenItHasNotBeenRenewedForATerm) {
    Lease a = lease("a");
    Lease b = lease("b");
    ASSERT_EQ(a.claim().kind, Kind::Ours);
    EXPECT_EQ(b.claim().kind, Kind::Others);
    now_ += 30s;
    const auto state = b.claim();
    EXPECT_EQ(state.kind, Kind::Others);
    EXPECT_EQ(state.age, 30s);
    now_ += 1ms;
    EXPECT_EQ(b.claim().kind, Kind::Ours);
    EXPECT_EQ(a.renew().kind, Kind::Others) << "it learns that it has lost it";
    EXPECT_NE(a.renew().kind, Kind::Ours) << "and never takes it back by renewing";
}

TEST_F(LeaseOfCentre, MakesWhoComesNewWaitForATermWhateverItsClockSays) {
    ASSERT_EQ(lease("a").claim().kind, Kind::Ours);
    now_ += std::chrono::hours(100);
    EXPECT_EQ(lease("b").claim().kind, Kind::Others);
}

TEST_F(LeaseOfCentre, IsFreeAtOnceWhenItIsGivenUp) {
    Lease a = lease("a");
    ASSERT_EQ(a.claim().kind, Kind::Ours);
    a.release();
    EXPECT_EQ(lease("b").claim().kind, Kind::Ours);
    EXPECT_NE(a.renew().kind, Kind::Ours);
}

TEST_F(LeaseOfCentre, BelongsToOneOfManyWhoClaimItTogether) {
    constexpr int kClaimants = 8;
    std::vector<std::unique_ptr<fleet::Connection>> buses;
    for (int i = 0; i < kClaimants; ++i)
        buses.push_back(connectedTo(server_));
    std::atomic<int> winners{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < kClaimants; ++i) {
        threads.emplace_back([&, i] {
            Lease claim(*buses[static_cast<std::size_t>(i)],
                        {"KV_CENTRE", "$KV.CENTRE.lease", std::to_string(i), 30s, kPatience});
            if (claim.claim().kind == Kind::Ours) ++winners;
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    EXPECT_EQ(winners, 1);
}

TEST_F(LeaseOfCentre, IsNotSaidToBeOursWhenTheBusIsAway) {
    Lease a = lease("a");
    ASSERT_EQ(a.claim().kind, Kind::Ours);
    server_.kill();
    ASSERT_TRUE(eventually([&] { return !bus_->connected(); }));
    EXPECT_EQ(a.renew().kind, Kind::Unknown);
    EXPECT_EQ(lease("b").claim().kind, Kind::Unknown);
}

TEST_F(LeaseOfCentre, IsRenewedOnceTheBusIsThereAgain) {
    Lease a = lease("a");
    ASSERT_EQ(a.claim().kind, Kind::Ours);
    server_.kill();
    ASSERT_TRUE(eventually([&] { return !bus_->connected(); }));
    EXPECT_EQ(a.renew().kind, Kind::Unknown);
    EXPECT_EQ(a.renew().kind, Kind::Unknown);
    server_.start();
    EXPECT_TRUE(eventually([&] { return a.renew().kind == Kind::Ours; }));
    EXPECT_EQ(lease("b").claim().kind, Kind::Others);
}

TEST_F(LeaseOfCentre, IsRenewedByWhoHeardNoAcknowledgement) {
    Lease a = lease("a", 500ms);
    ASSERT_TRUE(eventually([&] { return a.claim().kind == Kind::Ours; }));
    server_.pause();
    EXPECT_EQ(a.renew().kind, Kind::Unknown);
    server_.goOn();
    // The server has stored that one by now, so what is there is another message than expected.
    EXPECT_TRUE(eventually([&] { return a.renew().kind == Kind::Ours; }));
    EXPECT_TRUE(eventually([&] { return a.renew().kind == Kind::Ours; }));
}

TEST_F(LeaseOfCentre, IsNotTakenBackByRenewingWhileTheBusWasAway) {
    Lease a = lease("a");
    Lease b = lease("b");
    ASSERT_EQ(a.claim().kind, Kind::Ours);
    EXPECT_EQ(b.claim().kind, Kind::Others);
    now_ += 31s;
    ASSERT_EQ(b.claim().kind, Kind::Ours);
    EXPECT_EQ(a.renew().kind, Kind::Others);
    EXPECT_EQ(a.renew().kind, Kind::Others);
    EXPECT_EQ(b.renew().kind, Kind::Ours);
}

TEST_F(LeaseOfCentre, IsClaimedAnewByWhoHeardNoAcknowledgement) {
    Lease a = lease("a", 500ms);
    ASSERT_TRUE(eventually([&] { return a.claim().kind == Kind::Ours; }));
    server_.pause();
    EXPECT_EQ(a.renew().kind, Kind::Unknown);
    server_.goOn();
    // The server stores it now. No term goes by here: it must not wait for itself.
    EXPECT_TRUE(eventually([&] { return a.claim().kind == Kind::Ours; }));
    EXPECT_EQ(lease("a").claim().kind, Kind::Others) << "another one of that name is not it";
}
