// ctest-label: threaded
// A centre whose bus goes away, with a lease that is shorter than usual.
#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <memory>
#include <string>

#include "fleet/bus/nats/store.h"
#include "fleet/server/program/centre_program.h"
#include "support/fleet/nats_server.h"
#include "support/scratch_dir.h"
#include "tests/fleet/server/keys/running_fleet.h"

namespace {

using fleet::CentreProgram;
using fleet::KeyKind;
using fleet::KeyPair;
using namespace std::chrono_literals;
using Steady = std::chrono::steady_clock;

constexpr auto kTerm = 6s;

class CentreOnABus : public testing::Test {
protected:
    /// Most tests need a term in which a server can start on a busy machine.
    explicit CentreOnABus(std::chrono::seconds term = 20s) {
        fleet::CentreSettings settings{scratch_.path("orders"),
                                       bus(),
                                       KeyPair::make(KeyKind::User),
                                       {1 << 20, 1},
                                       "this centre"};
        settings.leaseTerm = term;
        centre_ = std::make_unique<CentreProgram>(std::move(settings));
        running_ = std::async(std::launch::async, [this] { return centre_->run(); });
        if (!eventually([this] { return centre_->isWorking(); }, made_fleet::kWorksWithin)) {
            throw std::runtime_error("the centre does not work");
        }
    }
    ~CentreOnABus() override {
        centre_->end();
        running_.wait();
    }
    fleet::ConnectionOptions bus() const {
        fleet::ConnectionOptions options;
        options.urls = {server_.url()};
        options.reconnectWait = 50ms;
        options.reconnectJitter = 10ms;
        return options;
    }
    std::uint64_t renewals() const { return centre_->counts().renewals.value(); }
    std::uint64_t repeated() const { return centre_->counts().repeatedRenewals.value(); }
    /// How the centre ended; it has to.
    CentreProgram::End ended() {
        if (running_.wait_for(60s) != std::future_status::ready) {
            ADD_FAILURE() << "the centre does not end";
            centre_->end();
        }
        const CentreProgram::End end = running_.get();
        running_ = std::async(std::launch::deferred, [end] { return end; });
        return end;
    }

    ScratchDir scratch_;
    NatsServer server_;
    std::unique_ptr<CentreProgram> centre_;
    std::future<CentreProgram::End> running_;
};

TEST_F(CentreOnABus, GoesOnWhenTheBusWasAwayForAMoment) {
    ASSERT_TRUE(eventually([this] { return renewals() > 0; }));
    server_.kill();
    ASSERT_TRUE(eventually([this] { return repeated() > 0 && !centre_->isConnected(); }));
    server_.start();
    const std::uint64_t before = renewals();
    ASSERT_TRUE(eventually([&] { return renewals() > before; }));
    EXPECT_TRUE(centre_->isWorking());
    EXPECT_TRUE(centre_->isConnected());
    centre_->end();
    EXPECT_EQ(ended(), CentreProgram::End::Asked);
}

TEST_F(CentreOnABus, GoesOnWhenTheBusHasStoredARenewalAndNotSaidSo) {
    ASSERT_TRUE(eventually([this] { return renewals() > 0; }));
    server_.pause();
    ASSERT_TRUE(eventually([this] { return repeated() > 0; }));
    server_.goOn();
    const std::uint64_t before = renewals();
    ASSERT_TRUE(eventually([&] { return renewals() > before; }));
    EXPECT_TRUE(centre_->isWorking());
}

class CentreWithAShortLease : public CentreOnABus {
protected:
    CentreWithAShortLease() : CentreOnABus(kTerm) {}
};

TEST_F(CentreWithAShortLease, StopsBeforeItIsFreeWhenTheBusStaysAway) {
    ASSERT_TRUE(eventually([this] { return renewals() > 0; }));
    server_.kill();
    const auto killed = Steady::now();
    EXPECT_EQ(ended(), CentreProgram::End::LeaseLost);
    // The last renewal was asked for before the server was killed. The rest is for the farewell on
    // a busy machine.
    EXPECT_LT(Steady::now() - killed, kTerm + 60s);
    EXPECT_GT(repeated(), 0U);
}

TEST_F(CentreOnABus, StopsAtOnceWhenAnotherHasTheLease) {
    ASSERT_TRUE(eventually([this] { return renewals() > 0; }));
    const auto other = fleet::Connection::connect(bus());
    ASSERT_TRUE(other.connection) << other.text;
    ASSERT_EQ(fleet::store(*other.connection, "$KV.CENTRE.lease", "another centre\nmark", 5s).kind,
              fleet::StoreResult::Kind::Stored);
    EXPECT_EQ(ended(), CentreProgram::End::LeaseLost);
}

}  // namespace
