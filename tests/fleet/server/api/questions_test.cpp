// ctest-label: threaded
// Questions to hosts through the centre's interface.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "fleet/bus/messages/question.h"
#include "tests/fleet/server/api/centre_interface.h"

namespace {

using centre_interface::Answered;
using centre_interface::CentreInterface;
using centre_interface::LoggedIn;
using fleet::Role;
using made_fleet::kPatience;
using made_fleet::today;
using nlohmann::json;

class CentresQuestions : public CentreInterface {
protected:
    static fleet::Order question(const std::string& host) {
        fleet::Order asked;
        asked.fleet = "demo";
        asked.id = fleet::makeOrderId();
        asked.host = host;
        asked.selector = "*";
        asked.kind = fleet::kAsksTasks;
        asked.body = "{}";
        asked.issued = today();
        asked.expires = today() + fleet::kLongestQuestion;
        return asked;
    }
    static std::string signedBy(const LoggedIn& who, const fleet::Order& asked) {
        return fleet::base64Of(signQuestion(asked, who.key, who.certificate));
    }
    Answered give(const LoggedIn& who, const std::string& text) {
        return post("/v1/questions", who, {{"questions", {text}}});
    }
    Answered giveAgain(const LoggedIn& who, const std::string& text, const json& round) {
        return post("/v1/questions", who, {{"questions", {text}}, {"round", round}});
    }
};

TEST_F(CentresQuestions, GoToTheHostAndItsAnswerToWhoAsked) {
    const LoggedIn ada = admin();
    const LoggedIn eve = login({"eve", Role::Admin, {}, {}, "*", made_fleet::kDay});
    const std::string key = join("web-1");
    const fleet::KeyPair& bus = buses_.at("web-1");
    const auto host = fleet_->connect(bus, fleet_->hostToken(bus));
    ASSERT_TRUE(host.connection) << host.text;
    const auto subscribed = host.connection->subscribe(
        "rp.ask." + key,
        [&](const fleet::BusMessage& message) {
            const std::string id = fleet::readOrder(message.data).order.id;
            static_cast<void>(host.connection->publish(
                "ans." + key, signAnswer({key, id, 0, true, "sealed"}, signers_.at("web-1"))));
        },
        kPatience);
    ASSERT_TRUE(subscribed.status.done()) << subscribed.status.text;
    const Answered given = give(ada, signedBy(ada, question(key)));
    ASSERT_EQ(given.status, 201U) << given.document;
    const std::string path = "/v1/questions/" + given.document.at("round").get<std::string>();
    EXPECT_EQ(get(path, eve).status, 404U);
    json answers;
    ASSERT_TRUE(eventually([&] {
        answers = get(path, ada).document.at("answers");
        return !answers.empty();
    }));
    EXPECT_EQ(answers.at(0).at("host"), key);
    const std::string piece = fleet::bytesOfBase64(answers.at(0).at("signed").get<std::string>());
    EXPECT_EQ(fleet::readAnswer(piece, key, signers_.at("web-1").publicKey()).sealed, "sealed");
    EXPECT_EQ(get(path, ada).document.at("answers").size(), 0U);

    const json round = given.document.at("round");
    const Answered again = giveAgain(ada, signedBy(ada, question(key)), round);
    EXPECT_EQ(again.status, 201U) << again.document;
    EXPECT_EQ(again.document.at("round"), round);
    EXPECT_TRUE(eventually([&] { return !get(path, ada).document.at("answers").empty(); }))
        << "answers to it come in the same round";
    EXPECT_EQ(giveAgain(eve, signedBy(eve, question(key)), round).status, 404U);
    EXPECT_EQ(giveAgain(ada, signedBy(ada, question(key)), "none").status, 404U);
    EXPECT_EQ(giveAgain(ada, signedBy(ada, question(key)), 7).status, 400U);
}

TEST_F(CentresQuestions, AreTheVisitorsOwnForHostsThatTheyMaySee) {
    const LoggedIn ada = admin();
    const LoggedIn otto =
        login({"otto", Role::Operator, {"TASKS"}, {"*"}, "env=test", made_fleet::kDay});
    const LoggedIn vera = login({"vera", Role::Viewer, {}, {}, "*", made_fleet::kDay});
    const std::string key = join("web-1");
    EXPECT_EQ(give(otto, signedBy(ada, question(key))).status, 400U);
    EXPECT_EQ(give(otto, signedBy(otto, question(key))).status, 404U);
    EXPECT_EQ(give(vera, signedBy(vera, question(key))).status, 403U);
    EXPECT_EQ(give(ada, orderFor(key, ada)).status, 400U) << "an order is no question";
    EXPECT_EQ(give(ada, "AAAA").status, 400U);
    EXPECT_EQ(give(ada, "@").status, 400U);
    fleet::Order late = question(key);
    late.expires += std::chrono::minutes(10);
    EXPECT_EQ(give(ada, signedBy(ada, late)).status, 400U);
    EXPECT_EQ(post("/v1/questions", ada, {{"questions", json::array()}}).status, 400U);
    EXPECT_EQ(get("/v1/questions/none", ada).status, 404U);
}

}  // namespace
