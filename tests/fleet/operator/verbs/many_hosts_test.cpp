#include "fleet/operator/verbs/many_hosts.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "ctl/command_line.h"
#include "fleet/bus/messages/document.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/fake_centre.h"

namespace {

using ctl::Format;
using nlohmann::json;
using operator_test::failureOf;
using operator_test::kHour;
using operator_test::kNow;
using operator_test::newUser;

const std::string kId(32, 'a');

class ManyHosts : public testing::Test {
protected:
    ManyHosts() {
        centre_.answer("POST /v1/batches", json{{"batch", "b1"}});
        centre_.answer("POST /v1/batches/b1/orders", json{{"orders", 2}});
    }
    static fleet::ChosenHost host(const std::string& name) {
        return {newUser().publicKey(), name, "here"};
    }
    json begin() {
        return fleet::beginRollout(centre_, choice_, work_, {{"waves", "1,100%"}}, maker_, kId);
    }

    const fleet::OperatorIdentity identity_ = operator_test::Root().certified({"START"}, {"ux"});
    const fleet::OrderMaker maker_{identity_, kId, kNow, 24 * kHour};
    const fleet::Choice choice_{"env=test", {host("web-1"), host("web-2")}};
    const fleet::Work work_{"START", {{"product", "ux"}}, ""};
    operator_test::FakeCentre centre_;
};

TEST_F(ManyHosts, GetASignedOrderEachAndThePlan) {
    centre_.answer("POST /v1/rollouts", json{{"id", kId}});
    EXPECT_EQ(begin(), (json{{"id", kId}}));
    ASSERT_EQ(centre_.asked().size(), 3U);
    EXPECT_EQ(centre_.asked()[2].body, (json{{"waves", "1,100%"}, {"id", kId}, {"batch", "b1"}}));
    const json orders = centre_.asked()[1].body["orders"];
    ASSERT_EQ(orders.size(), 2U);
    for (std::size_t i = 0; i < 2; ++i) {
        const std::string bytes = fleet::bytesOfBase64(orders[i].get<std::string>());
        const fleet::SignedOrder read = fleet::readOrder(bytes);
        EXPECT_TRUE(isSignedByOperator(read, identity_.key.publicKey()));
        EXPECT_EQ(read.order.host, choice_.hosts[i].key);
        EXPECT_EQ(read.order.selector, "env=test");
    }
}

TEST_F(ManyHosts, AreFollowedWhenTheAnswerWasLostButTheCentreHasTheRollout) {
    centre_.answer("POST /v1/rollouts", ctl::Failure(ctl::kNoHost, "the connection broke"));
    centre_.answer("GET /v1/rollouts/" + kId, json{{"id", kId}, {"state", "running"}});
    EXPECT_EQ(begin()["state"], "running");
}

TEST_F(ManyHosts, AreNotBelievedToHaveBegunWhenNobodyCanTell) {
    centre_.answer("POST /v1/rollouts", ctl::Failure(ctl::kNoOutcome, "no answer"));
    const ctl::Failure failure = failureOf([&] { begin(); });
    EXPECT_EQ(failure.status(), ctl::kNoOutcome);
    EXPECT_EQ(failure.hint(),
              "zavctl rollout show " + kId + " tells whether the roll-out has begun.");
}

TEST_F(ManyHosts, GetNothingThatTheCentreRefuses) {
    centre_.answer("POST /v1/rollouts", ctl::Failure(ctl::kWrongUsage, "waves must rise"));
    EXPECT_EQ(failureOf([&] { begin(); }).status(), ctl::kWrongUsage);
    EXPECT_EQ(centre_.questions().back(), "POST /v1/rollouts");
}

TEST_F(ManyHosts, AreShownBeforeAnythingIsSent) {
    const fleet::Choice choice{"env=test", {{"UA", "web-1", "here"}, {"UB", "web-2", "away"}}};
    EXPECT_EQ(fleet::showDryRun(choice, work_, json::object(), 24 * kHour, Format::Text).out,
              "HOST   STATE  KEY\n"
              "web-1  here   UA\n"
              "web-2  away   UB\n"
              "\n"
              "Each of these 2 hosts would get START {\"product\":\"ux\"},\n"
              "good for 1 day. Nothing was sent.\n");
    const fleet::Work hidden{"SETCONFIG", {{"product", "ux"}}, R"({"context":"geheim"})"};
    const std::string document =
        fleet::showDryRun(choice, hidden, {{"parallel", 5}}, kHour, Format::Json).out;
    EXPECT_EQ(document.find("geheim"), std::string::npos);
    EXPECT_EQ(json::parse(document)["plan"], (json{{"parallel", 5}}));
    EXPECT_EQ(json::parse(document)["order"]["seconds"], 3600);
}

TEST_F(ManyHosts, HaveThePlanThatTheOptionsGive) {
    const auto planIn = [](const std::vector<std::string>& words) {
        return fleet::planOf(ctl::parseCommandLine(words, fleet::fleetVocabulary()).given);
    };
    EXPECT_EQ(planIn({"--on", "*", "start", "ux"}), json::object());
    EXPECT_EQ(planIn({"--on", "*", "--waves", "1,50%", "--max-failures", "2%", "--pause", "60s",
                      "--wait", "10m", "--parallel", "7", "start", "ux"}),
              (json{{"waves", "1,50%"},
                    {"maxFailures", "2%"},
                    {"pause", 60},
                    {"wait", 600},
                    {"parallel", 7}}));
}

}  // namespace
