#include "fleet/operator/verbs/rollout_renewal.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/fake_centre.h"

namespace {

using fleet::Renewal;
using nlohmann::json;
using operator_test::failureOf;
using operator_test::kHour;
using operator_test::kNow;
using operator_test::newUser;

const std::string kId(32, 'a');

class RolloutRenewal : public testing::Test {
protected:
    RolloutRenewal() {
        centre_.answer("GET " + at_, rollout("running"));
        centre_.answer("POST /v1/batches", json{{"batch", "b1"}});
    }
    static json rollout(const std::string& state) {
        return {{"state", state}, {"kind", "START"}, {"product", "ux"}, {"selector", "*"}};
    }
    /// The centre has so many orders in its batch.
    void keepOrders(unsigned orders) {
        centre_.answer("POST /v1/batches/b1/orders", json{{"orders", orders}});
    }
    json listed() const {
        const fleet::ChosenHost host{newUser().publicKey(), "web-1", "here"};
        const fleet::OrderMaker before(identity_, kId, kNow - kHour, kHour);
        const std::string bytes = before.orderFor(host, {"START", {{"product", "ux"}}, ""}, "*");
        return {{"host", host.key},
                {"order", fleet::readOrder(bytes).order.id},
                {"signed", fleet::base64Of(bytes)}};
    }
    fleet::RenewalResult renew(Renewal renewal, bool isForced = false) {
        return fleet::renewRollout(centre_, kId, renewal, isForced, identity_, maker_);
    }

    const std::string at_ = "/v1/rollouts/" + kId;
    const fleet::OperatorIdentity identity_ =
        operator_test::Root().certified({"START", "CANCEL"}, {"ux"});
    const fleet::OrderMaker maker_{identity_, kId, kNow, kHour};
    operator_test::FakeCentre centre_;
};

TEST_F(RolloutRenewal, ResumesWithWhatHasExpired) {
    keepOrders(1);
    centre_.answer("GET " + at_ + "/to-sign?for=resume&from=0", json{{"hosts", {listed()}}});
    centre_.answer("POST " + at_ + "/resume", json{{"state", "running"}});
    const fleet::RenewalResult result = renew(Renewal::Resume);
    EXPECT_EQ(result.orders, 1U);
    EXPECT_EQ(result.rollout["state"], "running");
    EXPECT_EQ(centre_.asked().back().body, (json{{"batch", "b1"}}));
}

TEST_F(RolloutRenewal, SignsWhatStandsOnSeveralPages) {
    const json first = listed();
    const json second = listed();
    centre_.answer("GET " + at_ + "/to-sign?for=resume&from=0",
                   json{{"total", 3}, {"hosts", {first, second}}});
    // One more host has told meanwhile, so the second one has moved.
    centre_.answer("GET " + at_ + "/to-sign?for=resume&from=2",
                   json{{"total", 3}, {"hosts", {second}}});
    centre_.answer("POST " + at_ + "/resume", json{{"state", "running"}});
    keepOrders(2);
    EXPECT_EQ(renew(Renewal::Resume).orders, 2U);
}

TEST_F(RolloutRenewal, ResumesWithoutOrdersWhenNoneHasExpired) {
    centre_.answer("GET " + at_ + "/to-sign?for=resume&from=0", json{{"hosts", json::array()}});
    centre_.answer("POST " + at_ + "/resume", json{{"state", "running"}});
    EXPECT_EQ(renew(Renewal::Resume).orders, 0U);
    EXPECT_EQ(centre_.asked().back().body, (json{{"orders", json::array()}}));
}

TEST_F(RolloutRenewal, TriesAgainWhereNobodyKnowsOnlyIfThatIsForced) {
    keepOrders(1);
    centre_.answer("GET " + at_ + "/to-sign?for=retry-failed&from=0",
                   json{{"hosts", json::array()}});
    centre_.answer("GET " + at_ + "/to-sign?for=retry-failed&force=1&from=0",
                   json{{"hosts", {listed()}}});
    centre_.answer("POST " + at_ + "/retry-failed", json{{"state", "running"}});
    EXPECT_EQ(failureOf([&] { renew(Renewal::RetryFailed); }).status(), ctl::kHostReportedFailure);
    EXPECT_EQ(renew(Renewal::RetryFailed, true).orders, 1U);
    EXPECT_EQ(centre_.asked().back().body, (json{{"batch", "b1"}, {"force", true}}));
}

TEST_F(RolloutRenewal, StopsTheReleaseOfOrdersBeforeItCancelsOthers) {
    keepOrders(1);
    centre_.answer("POST " + at_ + "/abort", json{{"state", "aborted"}});
    centre_.answer("GET " + at_ + "/to-sign?for=abort&from=0", json{{"hosts", {listed()}}});
    const fleet::RenewalResult result = renew(Renewal::Abort);
    EXPECT_EQ(result.orders, 1U);
    EXPECT_EQ(result.note, "");
    const std::vector<std::string> asked = centre_.questions();
    EXPECT_EQ(asked.at(1), "POST " + at_ + "/abort");
    EXPECT_EQ(centre_.asked().at(1).body, (json{{"orders", json::array()}}));
    EXPECT_EQ(asked.at(asked.size() - 2), "POST " + at_ + "/abort");
    EXPECT_EQ(centre_.asked().at(asked.size() - 2).body, (json{{"batch", "b1"}}));
    EXPECT_EQ(asked.back(), "GET " + at_ + "/to-sign?for=abort&from=0")
        << "the list may have moved while it was read";
}

TEST_F(RolloutRenewal, CancelsWhatAnEarlierAbortLeft) {
    keepOrders(1);
    centre_.answer("GET " + at_, rollout("aborted"));
    centre_.get(at_);  // the answer before
    centre_.answer("GET " + at_ + "/to-sign?for=abort&from=0", json{{"hosts", {listed()}}});
    centre_.answer("POST " + at_ + "/abort", json{{"state", "aborted"}});
    EXPECT_EQ(renew(Renewal::Abort).orders, 1U);
    for (const auto& question : centre_.asked())
        EXPECT_NE(question.body, (json{{"orders", json::array()}})) << "it is aborted already";
}

TEST_F(RolloutRenewal, AbortsAlsoWhenNothingCanBeCancelled) {
    centre_.answer("POST " + at_ + "/abort", json{{"state", "aborted"}});
    centre_.answer("GET " + at_ + "/to-sign?for=abort&from=0",
                   json{{"hosts", {{{"signed", "no"}}}}});
    const fleet::RenewalResult result = renew(Renewal::Abort);
    EXPECT_EQ(result.rollout["state"], "aborted");
    EXPECT_NE(result.note, "");
    const ctl::Page page = fleet::showRenewal(result, Renewal::Abort, ctl::Format::Text);
    EXPECT_EQ(page.status, ctl::kHostReportedFailure);
    EXPECT_NE(page.err, "");
}

TEST_F(RolloutRenewal, ShowsWhatWasSigned) {
    const json rollout = {{"state", "running"}, {"hosts", 4}, {"counts", {{"waiting", 4}}}};
    EXPECT_EQ(fleet::showRenewal({rollout, 2, ""}, Renewal::Resume, ctl::Format::Text).out,
              "2 orders were signed anew.\nThe roll-out is running.\n0 of 4 over; 4 waiting\n");
    EXPECT_EQ(
        json::parse(fleet::showRenewal({rollout, 2, ""}, Renewal::Resume, ctl::Format::Json).out),
        rollout);
}

}  // namespace
