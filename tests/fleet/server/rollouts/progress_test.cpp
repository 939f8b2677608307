/// What an operator sees of a roll-out.
#include "tests/fleet/server/rollouts/rollout_fixture.h"

namespace {

using namespace rollout_test;

class RolloutProgressTest : public RolloutTest {};

TEST_F(RolloutProgressTest, CountsHostsByStateAndWave) {
    plan_.waves = "2,5";
    plan_.wait = kMinute;
    plan_.maxFailures = "1";
    create(7);
    tick();
    end("h00", "done");
    tickAfter(kMinute);
    end("h02", "failed");
    end("h03", "done");
    tick();
    const fleet::RolloutProgress progress = view().progress;
    EXPECT_EQ(progress.all.waiting, 2U);
    EXPECT_EQ(progress.all.released, 2U);
    EXPECT_EQ(progress.all.over, (std::map<std::string, std::size_t>{{"done", 2}, {"failed", 1}}));
    ASSERT_EQ(progress.waves.size(), 3U);
    EXPECT_EQ(progress.waves[0].released, 1U);
    EXPECT_EQ(progress.waves[0].over.at("done"), 1U);
    EXPECT_EQ(progress.waves[1].released, 1U);
    EXPECT_EQ(progress.waves[1].over.at("failed"), 1U);
    EXPECT_EQ(progress.waves[2].waiting, 2U);
    EXPECT_EQ(progress.failures, 1U);
}

TEST_F(RolloutProgressTest, SaysWhoFailedAndWhy) {
    create(3);
    tick();
    end("h01", "failed", R"({"reason":"no such product"})");
    end("h02", "refused");
    tick();
    const std::vector<Part> failures = rollouts_->failures(id_, 10);
    ASSERT_EQ(failures.size(), 2U);
    EXPECT_EQ(failures[0].host, "h01");
    EXPECT_EQ(failures[0].end, "failed");
    EXPECT_EQ(failures[0].reason, "no such product");
    EXPECT_EQ(failures[1].end, "refused");
    EXPECT_EQ(rollouts_->failures(id_, 1).size(), 1U);
}

TEST_F(RolloutProgressTest, SaysForHowManyItWaitsAndWhoIsAway) {
    plan_.waves = "3";
    create(4);
    tick();
    end("h00", "done");
    now_ += fleet::kAwayAfter;
    hear("h01");
    tick();
    EXPECT_EQ(view().progress.all.released, 2U);
    EXPECT_EQ(view().progress.away, 0U);
    now_ += Moment{1};
    EXPECT_EQ(view().progress.away, 1U);
    const std::vector<fleet::PartView> parts = rollouts_->parts(id_, 0, 10, now_);
    ASSERT_EQ(parts.size(), 4U);
    EXPECT_FALSE(parts[0].isAway) << "it is over";
    EXPECT_FALSE(parts[1].isAway);
    EXPECT_TRUE(parts[2].isAway);
    EXPECT_EQ(parts[2].sight.heard, now_ - fleet::kAwayAfter - Moment{1});
    EXPECT_FALSE(parts[3].isAway) << "it waits for its turn";
}

TEST_F(RolloutProgressTest, SaysWhatHasExpiredWithoutAWordOfTheHost) {
    plan_.waves = "1";
    create(2);
    tick();
    now_ += 24 * kHour - Moment{1};
    EXPECT_EQ(view().progress.unconfirmed, 0U);
    EXPECT_EQ(view().progress.expired, 0U);
    now_ += Moment{1};
    EXPECT_EQ(view().progress.unconfirmed, 1U);
    EXPECT_EQ(view().progress.expired, 1U);
    EXPECT_TRUE(rollouts_->parts(id_, 0, 1, now_).front().isUnconfirmed);
    EXPECT_FALSE(rollouts_->parts(id_, 1, 1, now_).front().isUnconfirmed);
}

TEST_F(RolloutProgressTest, ShowsHostsPageByPage) {
    create(5);
    Names hosts;
    for (const fleet::PartView& one : rollouts_->parts(id_, 2, 2, now_))
        hosts.push_back(one.sight.part.host);
    EXPECT_EQ(hosts, (Names{"h02", "h03"}));
    EXPECT_TRUE(rollouts_->parts(id_, 5, 2, now_).empty());
}

TEST_F(RolloutProgressTest, HasAWordForEachState) {
    EXPECT_STREQ(nameOf(RolloutState::Running), "running");
    EXPECT_STREQ(nameOf(RolloutState::Paused), "paused");
    EXPECT_STREQ(nameOf(RolloutState::Aborted), "aborted");
    EXPECT_STREQ(nameOf(RolloutState::Finished), "finished");
    EXPECT_STREQ(nameOf(PauseCause::None), "");
    EXPECT_STREQ(nameOf(PauseCause::Operator), "operator");
    EXPECT_STREQ(nameOf(PauseCause::Failures), "failures");
    EXPECT_STREQ(nameOf(PauseCause::Expiry), "expiry");
    EXPECT_STREQ(nameOf(PauseCause::Restore), "restore");
}

}  // namespace
