#include "fleet/link/program/host_answers.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

namespace {

using fleet::Absent;
using fleet::CancelAnswer;
using fleet::HandOverAnswer;
using fleet::HostAnswer;
using fleet::LookUpAnswer;
using fleet::NotCancelled;
using fleet::NotNow;
using fleet::OtherJournal;
using fleet::Outcome;
using fleet::Recorded;
using fleet::StillOpen;
using fleet::Unacceptable;
using fleet::WasCancelled;
using nlohmann::json;

const std::string kOrder(32, 'a');

fleet::Directive directive(const std::string& request) {
    fleet::Directive made;
    made.number = 7;
    made.order = kOrder;
    made.expires = fleet::Moment(1'700'000'000'999);
    made.request = request;
    return made;
}

std::string task(const std::string& state) {
    return json({{"id", "12"}, {"transid", kOrder}, {"state", state}}).dump();
}

template <typename Kind, typename Variant>
bool is(const Variant& answer) {
    return std::holds_alternative<Kind>(answer);
}

TEST(HandingOver, TheBodyIsTheOrdersWithWhatTheLinkAdds) {
    const json body = json::parse(
        bodyOf(fleet::HandOver{directive(R"({"command":"START","product":"ux"})"), "journal"}));
    EXPECT_EQ(body, json({{"command", "START"},
                          {"product", "ux"},
                          {"transid", kOrder},
                          {"once", true},
                          {"journal", "journal"},
                          {"expires", "2023-11-14T22:13:20Z"}}));
}

TEST(HandingOver, AnExpiryFarAwayStaysFarAway) {
    fleet::Directive made = directive("");
    const auto expiresAt = [&made](fleet::Moment moment) {
        made.expires = moment;
        return json::parse(bodyOf(fleet::HandOver{made, "journal"})).at("expires");
    };
    EXPECT_EQ(expiresAt(fleet::Moment(2'208'988'800'000)), "2040-01-01T00:00:00Z");
    EXPECT_EQ(expiresAt(fleet::Moment(9'467'107'200'000)), "2270-01-01T00:00:00Z");
    EXPECT_EQ(expiresAt(fleet::Moment(fleet::kHighestNumber)), "9999-12-31T23:59:59Z");
}

TEST(HandingOver, AnEndIsOneMoreMember) {
    const fleet::EnterEnd end{directive(R"({"command":"START"})"), "refused", "not here", "j"};
    EXPECT_EQ(json::parse(bodyOf(end)), json({{"command", "START"},
                                              {"transid", kOrder},
                                              {"once", true},
                                              {"journal", "j"},
                                              {"refused", "not here"}}));
}

TEST(HandingOver, AnEndTellsNothingThatTheHostMightNotRead) {
    const std::string odd = R"({"command":"START","product":"much too long","colour":"red"})";
    const fleet::EnterEnd end{directive(odd), "refused", std::string(10'000, 'x'), "j"};
    const json body = json::parse(bodyOf(end));
    EXPECT_EQ(body.count("colour"), 0U);
    EXPECT_EQ(body.at("product"), "much too long");
    EXPECT_EQ(body.at("refused").get<std::string>().size(), 4096U);
    const json bare = json::parse(bareBodyOf(end));
    EXPECT_EQ(bare.count("product"), 0U);
    EXPECT_EQ(bare.count("command"), 0U);
    EXPECT_EQ(bare.at("transid"), kOrder);
}

TEST(HandingOver, AnOrderThatCouldNotBeReadIsRecordedWithoutItsRequest) {
    const fleet::EnterEnd end{directive(""), "refused", "nobody has signed it", "j"};
    EXPECT_EQ(json::parse(bodyOf(end)).count("command"), 0U);
}

TEST(HandingOver, WhatTheHostAcceptsIsRecorded) {
    for (const unsigned status : {200U, 202U}) {
        const auto open = fleet::recordedBy({status, task("queued")});
        ASSERT_TRUE(open && is<Recorded>(*open));
        EXPECT_FALSE(std::get<Recorded>(*open).isOver);
        const auto over = fleet::recordedBy({status, task("refused")});
        ASSERT_TRUE(over && is<Recorded>(*over));
        EXPECT_TRUE(std::get<Recorded>(*over).isOver);
    }
}

TEST(HandingOver, AGuardsRefusalIsRecordedAndOver) {
    const auto answer = fleet::recordedBy({409, R"({"error":"no","guard":"inventory"})"});
    ASSERT_TRUE(answer && is<Recorded>(*answer));
    EXPECT_TRUE(std::get<Recorded>(*answer).isOver);
}

TEST(HandingOver, WhetherANameIsTakenTheTaskItselfTells) {
    const HostAnswer refusal{409, R"({"error":"another request has this transid"})"};
    EXPECT_FALSE(fleet::recordedBy(refusal).has_value());
    const HandOverAnswer over = recordOf({200, task("done")}, refusal);
    ASSERT_TRUE(is<Recorded>(over));
    EXPECT_TRUE(std::get<Recorded>(over).isOver);
    const HandOverAnswer none = recordOf({404, "{}"}, refusal);
    ASSERT_TRUE(is<Unacceptable>(none));
    EXPECT_EQ(std::get<Unacceptable>(none).words, "another request has this transid");
    EXPECT_TRUE(is<NotNow>(recordOf({503, ""}, refusal)));
}

TEST(HandingOver, WhatCanNeverBeAcceptedIsToldInTheHostsWords) {
    for (const unsigned status : {400U, 413U, 501U}) {
        const auto answer = fleet::recordedBy({status, R"({"error":"no such product"})"});
        ASSERT_TRUE(answer && is<Unacceptable>(*answer)) << status;
        EXPECT_EQ(std::get<Unacceptable>(*answer).words, "no such product");
    }
}

TEST(HandingOver, AnotherJournalIsTold) {
    const auto answer = fleet::recordedBy({412, "{}"});
    EXPECT_TRUE(answer && is<OtherJournal>(*answer));
}

TEST(HandingOver, EverythingElseIsTriedAgain) {
    for (const unsigned status : {403U, 404U, 429U, 500U, 503U, 302U}) {
        const auto answer = fleet::recordedBy({status, "no JSON"});
        ASSERT_TRUE(answer && is<NotNow>(*answer)) << status;
        EXPECT_EQ(std::get<NotNow>(*answer).why,
                  "the host answers with status " + std::to_string(status));
    }
}

TEST(Cancelling, TheHostsAnswerCounts) {
    EXPECT_TRUE(is<WasCancelled>(*fleet::cancelledBy({200, task("cancelled")})));
    EXPECT_TRUE(is<NotNow>(*fleet::cancelledBy({202, task("running")})));
    EXPECT_TRUE(is<NotCancelled>(*fleet::cancelledBy({404, R"({"error":"there is no task"})"})));
    EXPECT_TRUE(is<NotNow>(*fleet::cancelledBy({412, "{}"})));
    EXPECT_TRUE(is<NotNow>(*fleet::cancelledBy({503, "{}"})));
    EXPECT_FALSE(fleet::cancelledBy({409, "{}"}).has_value());
}

TEST(Cancelling, OneThatIsOverMayHaveBeenCancelledBefore) {
    const HostAnswer refusal{409, R"({"error":"it is over"})"};
    EXPECT_TRUE(is<WasCancelled>(cancelledOf({200, task("cancelled")}, refusal)));
    const CancelAnswer late = cancelledOf({200, task("done")}, refusal);
    ASSERT_TRUE(is<NotCancelled>(late));
    EXPECT_EQ(std::get<NotCancelled>(late).words, "it is over");
    EXPECT_TRUE(is<NotNow>(cancelledOf({200, task("running")}, refusal)));
    EXPECT_TRUE(is<NotNow>(cancelledOf({500, ""}, refusal)));
}

TEST(LookingUp, TheJournalTellsHowItEnded) {
    const LookUpAnswer over = fleet::lookUpOf({200, task("failed")}, kOrder, "journal");
    ASSERT_TRUE(is<Outcome>(over));
    const auto& outcome = std::get<Outcome>(over);
    EXPECT_EQ(outcome.order, kOrder);
    EXPECT_EQ(outcome.state, "failed");
    EXPECT_EQ(outcome.journal, "journal");
    EXPECT_EQ(outcome.task, task("failed"));
}

TEST(LookingUp, WhatIsNotOverOrNotThereIsTold) {
    EXPECT_TRUE(is<StillOpen>(fleet::lookUpOf({200, task("running")}, kOrder, "j")));
    EXPECT_TRUE(is<Absent>(fleet::lookUpOf({404, "{}"}, kOrder, "j")));
    EXPECT_TRUE(is<NotNow>(fleet::lookUpOf({412, "{}"}, kOrder, "j")));
    EXPECT_TRUE(is<NotNow>(fleet::lookUpOf({200, "nonsense"}, kOrder, "j")));
    EXPECT_TRUE(is<NotNow>(fleet::lookUpOf({200, task("done")}, std::string(32, 'b'), "j")));
}

TEST(Outcomes, TasksThatNobodyOfTheFleetWantedAreNone) {
    EXPECT_FALSE(fleet::outcomeOf(R"({"transid":"page-1","state":"done"})", "j").has_value());
    EXPECT_FALSE(fleet::outcomeOf(task("queued"), "j").has_value());
    EXPECT_FALSE(fleet::outcomeOf(R"({"transid":7})", "j").has_value());
    EXPECT_FALSE(fleet::outcomeOf("[]", "j").has_value());
}

}  // namespace
