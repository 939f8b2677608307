/// When which orders of a roll-out are released.
#include "tests/fleet/server/rollouts/rollout_fixture.h"

namespace {

using namespace rollout_test;

class RolloutPaceTest : public RolloutTest {};

TEST_F(RolloutPaceTest, ReleasesOneWaveAfterTheOther) {
    plan_.waves = "1,50%";
    create(4);
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00"}));
    tickAfter(kHour);
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00"}));
    end("h00", "done");
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
    end("h01", "done");
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h02", "h03"}));
    end("h02", "done");
    tick();
    EXPECT_EQ(state(), RolloutState::Running);
    end("h03", "done");
    tick();
    EXPECT_EQ(state(), RolloutState::Finished);
    EXPECT_EQ(hostsThatAre("done").size(), 4U);
}

TEST_F(RolloutPaceTest, GivesReleasedOrdersToTheCentreAndNoOthers) {
    plan_.waves = "1";
    create(2);
    tick();
    while (centre_.work(100)) {
    }
    ASSERT_EQ(disk_.tasks().size(), 1U);
    const Part released = part("h00");
    EXPECT_EQ(released.number, 1U);
    EXPECT_EQ(given("h00"), (Names{released.order}));
    EXPECT_TRUE(given("h01").empty());
    const std::string published = disk_.fetch("h00", 1)->bytes;
    EXPECT_EQ(fleet::readOrder(std::string_view(published).substr(2)).order.id, released.order);
}

TEST_F(RolloutPaceTest, KeepsAnOrdersBytesOnlyWhileItWaits) {
    plan_.waves = "1";
    create(2);
    tick();
    EXPECT_EQ(database_.number("SELECT COUNT(*) FROM rollout_orders"), 1);
    end("h00", "done");
    tick();
    EXPECT_EQ(database_.number("SELECT COUNT(*) FROM rollout_orders"), 0);
}

TEST_F(RolloutPaceTest, OneHostIsOneWave) {
    plan_.waves = "1,10%,50%,100%";
    create(1);
    tick();
    end("h00", "failed");
    tick();
    EXPECT_EQ(state(), RolloutState::Finished);
}

TEST_F(RolloutPaceTest, PausesBetweenWaves) {
    plan_.waves = "1";
    plan_.pause = kMinute;
    create(2);
    tick();
    end("h00", "done");
    tickAfter(kSecond);
    tickAfter(kMinute - Moment{1});
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h01"}));
    tickAfter(Moment{1});
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
}

TEST_F(RolloutPaceTest, AWaveEndsWhenItsTimeHasPassed) {
    plan_.waves = "2";
    plan_.wait = 10 * kMinute;
    create(3);
    tick();
    end("h00", "done");
    tickAfter(10 * kMinute - Moment{1});
    EXPECT_EQ(wave(), 1U);
    tickAfter(Moment{1});
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01", "h02"}));
    tickAfter(10 * kMinute);
    EXPECT_EQ(state(), RolloutState::Finished);
    EXPECT_EQ(view().progress.all.released, 2U);
}

TEST_F(RolloutPaceTest, AHostThatWasAwayMayFailInALaterWave) {
    plan_.waves = "1,2,3";
    plan_.wait = kMinute;
    create(4);
    tick();
    tickAfter(kMinute);
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00", "h01"}));
    EXPECT_EQ(view().progress.failures, 0U);
    end("h00", "failed");
    tick();
    EXPECT_EQ(state(), RolloutState::Paused);
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h02", "h03"}));
}

TEST_F(RolloutPaceTest, AHostMayTellAfterTheEnd) {
    plan_.wait = kMinute;
    create(2);
    tick();
    tickAfter(kMinute);
    ASSERT_EQ(state(), RolloutState::Finished);
    end("h00", "failed");
    tick();
    EXPECT_EQ(state(), RolloutState::Finished);
    EXPECT_EQ(hostsThatAre("failed"), (Names{"h00"}));
}

TEST_F(RolloutPaceTest, GoesOnWithAsManyFailuresAsArePlanned) {
    plan_.waves = "2,3";
    plan_.maxFailures = "50%";
    create(4);
    tick();
    endAll({"h00", "h01"}, "failed");
    tick();
    EXPECT_EQ(state(), RolloutState::Running);
    EXPECT_EQ(hostsThatAre("released"), (Names{"h02"}));
    end("h02", "failed");
    tick();
    EXPECT_EQ(state(), RolloutState::Paused);
    EXPECT_EQ(cause(), PauseCause::Failures);
    EXPECT_EQ(view().rollout.reason, "more than 2 of 4 hosts failed");
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h03"}));
    tickAfter(kHour);
    EXPECT_EQ(view().rollout.since, now_ - kHour);
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h03"}));
}

TEST_F(RolloutPaceTest, ExpiredAndCancelledOrdersAreNoFailures) {
    plan_.waves = "2";
    create(3);
    tick();
    end("h00", "expired");
    end("h01", "cancelled");
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h02"}));
}

TEST_F(RolloutPaceTest, AnOrderOfWhichNobodyKnowsIsAFailureUntilItsHostTells) {
    plan_.waves = "1";
    create(2);
    tick();
    end("h00", "unknown");
    EXPECT_EQ(part("h00").state, PartState::Released);
    tick();
    EXPECT_EQ(state(), RolloutState::Paused);
    EXPECT_EQ(view().progress.failures, 1U);
    end("h00", "done");
    tick();
    EXPECT_EQ(view().progress.failures, 0U);
    EXPECT_EQ(hostsThatAre("done"), (Names{"h00"}));
    EXPECT_EQ(state(), RolloutState::Paused);
    EXPECT_TRUE(rollouts_->failures(id_, 10).empty());
}

TEST_F(RolloutPaceTest, FailuresOfTheLastWavePauseNothing) {
    create(3);
    tick();
    endAll({"h00", "h01", "h02"}, "failed");
    tick();
    EXPECT_EQ(state(), RolloutState::Finished);
}

TEST_F(RolloutPaceTest, ReleasesNoMoreAtATimeThanIsPlanned) {
    plan_.parallel = 2;
    create(5);
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00", "h01"}));
    tickAfter(kSecond);
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00", "h01"}));
    end("h01", "done");
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00", "h02"}));
    endAll({"h00", "h02"}, "done");
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h03", "h04"}));
}

TEST_F(RolloutPaceTest, HostsThatAreAwayDoNotKeepTheirPlacesForEver) {
    plan_.parallel = 2;
    plan_.wait = kMinute;
    create(5);
    tick();
    ASSERT_EQ(hostsThatAre("released"), (Names{"h00", "h01"}));
    tickAfter(kMinute);
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00", "h01", "h02", "h03"}));
    EXPECT_EQ(view().rollout.waves, 2U);
    tickAfter(kMinute);
    EXPECT_EQ(hostsThatAre("released").size(), 5U);
    EXPECT_EQ(state(), RolloutState::Running);
    tickAfter(kMinute);
    EXPECT_EQ(state(), RolloutState::Finished);
}

TEST_F(RolloutPaceTest, WhatAWaveDidNotReleaseComesWithTheNext) {
    plan_.waves = "3";
    plan_.parallel = 2;
    plan_.wait = kMinute;
    create(4);
    tick();
    tickAfter(kMinute);
    EXPECT_EQ(hostsThatAre("released").size(), 4U);
    EXPECT_EQ(part("h02").wave, 2U);
    EXPECT_EQ(view().rollout.waves, 2U);
}

TEST_F(RolloutPaceTest, PausesInsteadOfReleasingAnOrderThatHasExpired) {
    plan_.waves = "1";
    plan_.pause = 25 * kHour;
    create(3);
    tick();
    end("h00", "done");
    tick();
    tickAfter(25 * kHour);
    EXPECT_EQ(state(), RolloutState::Paused);
    EXPECT_EQ(cause(), PauseCause::Expiry);
    EXPECT_TRUE(given("h01").empty());
    EXPECT_EQ(hostsOf(rollouts_->toSignAnew(id_, now_)), (Names{"h01", "h02"}));
    EXPECT_EQ(view().progress.expired, 2U);
}

TEST_F(RolloutPaceTest, AnOrderIsGoodUntilItExpires) {
    create(1);
    now_ += 24 * kHour - Moment{1};
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h00"}));
}

TEST_F(RolloutPaceTest, ReleasesMoreThanFitIntoOneTransaction) {
    const std::size_t hosts = 2 * fleet::RolloutPace::kReleasedAtOnce;
    create(hosts);
    EXPECT_TRUE(rollouts_->tick(now_));
    EXPECT_EQ(view().progress.all.released, hosts / 2);
    tick();
    EXPECT_EQ(view().progress.all.released, hosts);
}

TEST_F(RolloutPaceTest, LearnsAllThatWasToldBeforeItReleasesMore) {
    plan_.waves = "1100";
    plan_.maxFailures = "10";
    create(1'110);
    tick();
    const Names released = hostsThatAre("released");
    ASSERT_EQ(released.size(), 1'100U);
    for (std::size_t i = 0; i < released.size(); ++i)
        end(released[i], i < 1'089 ? "done" : "failed");
    EXPECT_TRUE(rollouts_->tick(now_));
    tick();
    EXPECT_EQ(cause(), PauseCause::Failures);
    EXPECT_EQ(hostsThatAre("waiting").size(), 10U);
}

TEST_F(RolloutPaceTest, SeveralRunBesideEachOther) {
    const std::string first = create(2);
    const std::string second = make(wanted({"h00", "h01"}));
    tick();
    EXPECT_EQ(given("h00").size(), 2U);
    endAll({"h00", "h01"}, "done");
    tick();
    EXPECT_EQ(state(), RolloutState::Finished);
    id_ = second;
    EXPECT_EQ(state(), RolloutState::Running);
}

TEST_F(RolloutPaceTest, AHostThatTheCentreNoLongerHasNeedsNoOrder) {
    const std::string id = make(wanted(enrol(2)));
    id_ = id;
    fleet::Rollouts withoutFirst(store_,
                                 [&](const std::string& host, const std::string& order,
                                     const std::string& bytes) -> std::optional<fleet::Number> {
                                     if (host == "h00") return std::nullopt;
                                     return giver()(host, order, bytes);
                                 });
    withoutFirst.tick(now_);
    EXPECT_EQ(hostsThatAre("cancelled"), (Names{"h00"}));
    EXPECT_EQ(part("h00").reason, "the host is no longer in the fleet");
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
}

TEST_F(RolloutPaceTest, AnOrderThatRanBeforeTheDatabaseWasPutBackIsOver) {
    plan_.waves = "1,2";
    create(3);
    fleet::OrderRecord known;
    known.host = "h00";
    known.order = part("h00").order;
    centreStore_.adopt(known);
    end("h00", "done");
    known.host = "h01";
    known.order = part("h01").order;
    centreStore_.adopt(known);
    tick();
    EXPECT_EQ(hostsThatAre("done"), (Names{"h00"}));
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
    end("h01", "done");
    tick();
    EXPECT_EQ(hostsThatAre("released"), (Names{"h02"}));
}

TEST_F(RolloutPaceTest, AnOutcomeThatIsKnownAtTheReleaseCounts) {
    create(1);
    // The store has forgotten to tell it, as a database does that was put together from two.
    giver()("h00", part("h00").order, store_.bytesOf(part("h00")));
    end("h00", "failed");
    database_.run("DELETE FROM rollout_news");
    tick();
    tick();
    EXPECT_EQ(hostsThatAre("failed"), (Names{"h00"}));
}

TEST_F(RolloutPaceTest, AClockThatGoesBackMakesItWaitLonger) {
    plan_.waves = "1";
    plan_.pause = kMinute;
    create(2);
    tick();
    end("h00", "done");
    tick();
    tickAfter(-kHour);
    EXPECT_EQ(hostsThatAre("waiting"), (Names{"h01"}));
    tickAfter(kHour + kMinute);
    EXPECT_EQ(hostsThatAre("released"), (Names{"h01"}));
}

TEST_F(RolloutPaceTest, ATickWithoutNewsChangesNothing) {
    plan_.waves = "1";
    create(2);
    tick();
    const std::string before = allRows();
    tickAfter(kHour);
    EXPECT_EQ(allRows(), before);
}

}  // namespace
