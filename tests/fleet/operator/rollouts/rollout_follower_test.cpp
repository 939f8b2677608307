#include "fleet/operator/rollouts/rollout_follower.h"

#include <gtest/gtest.h>

#include <chrono>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/fake_centre.h"
#include "tests/fleet/operator/rollouts/rollout_documents.h"

namespace {

using nlohmann::json;
using operator_test::failedPart;
using operator_test::failureOf;
using operator_test::kRolloutId;
using operator_test::rolloutIn;

class RolloutFollower : public testing::Test {
protected:
    RolloutFollower() {
        events_.onLook = [this](const json&) { ++looks_; };
        events_.onFailure = [this](const json& part) { failed_.push_back(part["name"]); };
        events_.onNote = [this](const std::string& text) { notes_.push_back(text); };
        events_.pause = [this](std::chrono::milliseconds time) { pauses_.push_back(time); };
    }
    fleet::RolloutEnd follow(ctl::Deadline deadline = ctl::deadlineIn(std::chrono::hours(1))) {
        return followRollout(centre_, kRolloutId, deadline, events_);
    }

    const std::string rollout_ = std::string("GET /v1/rollouts/") + kRolloutId;
    const std::string failures_ = rollout_ + "/failures?limit=1000";
    operator_test::FakeCentre centre_;
    fleet::RolloutEvents events_;
    int looks_ = 0;
    std::vector<std::string> failed_;
    std::vector<std::string> notes_;
    std::vector<std::chrono::milliseconds> pauses_;
};

TEST_F(RolloutFollower, LooksUntilNothingGoesOn) {
    centre_.answer(rollout_, rolloutIn("running", json::object(), 0, 4));
    centre_.answer(rollout_, rolloutIn("running", {{"done", 1}}, 3, 0));
    centre_.answer(rollout_, rolloutIn("finished", {{"done", 4}}, 0, 0));
    EXPECT_EQ(follow().rollout["state"], "finished");
    EXPECT_EQ(looks_, 3);
    EXPECT_EQ(pauses_.size(), 2U);
    EXPECT_EQ(centre_.asked().size(), 3U);
}

TEST_F(RolloutFollower, TellsEachFailureOnce) {
    centre_.answer(rollout_, rolloutIn("running", {{"failed", 1}}, 3, 0));
    centre_.answer(rollout_, rolloutIn("running", {{"failed", 1}}, 3, 0));
    centre_.answer(rollout_, rolloutIn("paused", {{"failed", 2}}, 2, 0));
    centre_.answer(failures_, json{{"hosts", {failedPart("web-1", "1")}}});
    centre_.answer(failures_,
                   json{{"hosts", {failedPart("web-1", "1"), failedPart("web-2", "2")}}});
    const fleet::RolloutEnd end = follow();
    EXPECT_EQ(failed_, (std::vector<std::string>{"web-1", "web-2"}));
    EXPECT_EQ(end.failures.size(), 2U);
    EXPECT_EQ(end.rollout["state"], "paused");
}

TEST_F(RolloutFollower, TellsAHostThatFailsAgainWithAnotherOrder) {
    centre_.answer(rollout_, rolloutIn("running", {{"failed", 1}}, 3, 0));
    centre_.answer(rollout_, rolloutIn("running", json::object(), 4, 0));
    centre_.answer(rollout_, rolloutIn("paused", {{"failed", 1}}, 3, 0));
    centre_.answer(failures_, json{{"hosts", {failedPart("web-1", "1")}}});
    centre_.answer(failures_, json{{"hosts", json::array()}});
    centre_.answer(failures_, json{{"hosts", {failedPart("web-1", "2")}}});
    follow();
    EXPECT_EQ(failed_, (std::vector<std::string>{"web-1", "web-1"}));
}

TEST_F(RolloutFollower, WaitsForACentreThatGoesAway) {
    const ctl::Failure away(ctl::kNoHost, "the centre is away");
    centre_.answer(rollout_, rolloutIn("running", json::object(), 0, 4));
    centre_.answer(rollout_, away);
    centre_.answer(rollout_, away);
    centre_.answer(rollout_, rolloutIn("finished", {{"done", 4}}, 0, 0));
    EXPECT_EQ(follow().rollout["state"], "finished");
    EXPECT_EQ(notes_, std::vector<std::string>{"the centre is away; asking again and again"});
}

TEST_F(RolloutFollower, DoesNotWaitForACentreThatWasNeverThere) {
    centre_.answer(rollout_, ctl::Failure(ctl::kNoHost, "the centre is away"));
    EXPECT_EQ(failureOf([&] { follow(); }).status(), ctl::kNoHost);
}

TEST_F(RolloutFollower, EndsWhenTheCentreRefuses) {
    centre_.answer(rollout_, rolloutIn("running", json::object(), 0, 4));
    centre_.answer(rollout_, ctl::Failure(ctl::kHostReportedFailure, "the key is revoked"));
    EXPECT_EQ(failureOf([&] { follow(); }).status(), ctl::kHostReportedFailure);
}

TEST_F(RolloutFollower, GivesUpAtTheDeadlineAndSaysHowToGoOn) {
    centre_.answer(rollout_, rolloutIn("running", json::object(), 0, 4));
    const ctl::Failure failure =
        failureOf([&] { follow(ctl::deadlineIn(std::chrono::milliseconds(0))); });
    EXPECT_EQ(failure.status(), ctl::kNoOutcome);
    EXPECT_EQ(failure.hint(),
              std::string("zavctl rollout watch ") + kRolloutId + " takes it up again");
}

TEST_F(RolloutFollower, DoesNotBelieveWhatIsNoRollout) {
    centre_.answer(rollout_, json::object());
    EXPECT_EQ(failureOf([&] { follow(); }).status(), ctl::kNoHost);
}

}  // namespace
