/// Which questions a host answers.
#include "fleet/link/questions/question_judge.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <optional>
#include <string>

#include "fleet/bus/messages/certificate.h"

namespace {

using fleet::AskedQuestion;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Moment;
using fleet::QuestionBook;
using nlohmann::json;

constexpr Moment kAsked{1'700'000'000'000};

class AskingAHost : public testing::Test {
protected:
    AskingAHost() {
        trust_.fleet = "north";
        trust_.host = bus_.publicKey();
        trust_.name = "web-7";
        trust_.labels = {{"env", "test"}};
        trust_.root = root_.publicKey();
        certificate_.fleet = "north";
        certificate_.key = operator_.publicKey();
        certificate_.until = kAsked + Moment(1'000'000);
        certificate_.commands = {"GETCONFIG"};
        certificate_.products = {"ux"};
        certificate_.selector = "env=test";
        question_.fleet = "north";
        question_.id = fleet::makeOrderId();
        question_.host = bus_.publicKey();
        question_.selector = "web-*";
        question_.kind = "GETCONFIG";
        question_.body = json{{"product", "ux"}, {"answerTo", reader_.publicKey()}}.dump();
        question_.issued = kAsked;
        question_.expires = kAsked + fleet::kLongestQuestion;
    }

    std::string bytes() const {
        return signQuestion(question_, operator_, signCertificate(certificate_, root_));
    }
    std::optional<AskedQuestion> judged(const std::string& message, Moment now = kAsked) const {
        return judgeQuestion(message, trust_, now,
                             [this](const std::string& key) { return key == revoked_; });
    }
    std::optional<AskedQuestion> judged() const { return judged(bytes()); }
    std::string refusal() const {
        const auto asked = judged();
        return asked ? asked->refusal : "no answer at all";
    }

    const KeyPair root_ = KeyPair::make(KeyKind::Operator);
    const KeyPair operator_ = KeyPair::make(KeyKind::User);
    const KeyPair bus_ = KeyPair::make(KeyKind::User);
    const KeyPair reader_ = KeyPair::make(KeyKind::User);
    std::string revoked_;
    fleet::Trust trust_;
    fleet::Certificate certificate_;
    fleet::Order question_;
};

TEST_F(AskingAHost, IsForCertifiedOperators) {
    const auto asked = judged();
    ASSERT_TRUE(asked.has_value());
    EXPECT_EQ(asked->refusal, "");
    EXPECT_EQ(asked->id, question_.id);
    EXPECT_EQ(asked->answerTo, reader_.publicKey());
    revoked_ = operator_.publicKey();
    EXPECT_FALSE(judged().has_value());
    revoked_.clear();
    const KeyPair other = KeyPair::make(KeyKind::User);
    EXPECT_FALSE(
        judged(signQuestion(question_, other, signCertificate(certificate_, root_))).has_value());
    EXPECT_FALSE(
        judged(signQuestion(question_, operator_,
                            signCertificate(certificate_, KeyPair::make(KeyKind::Operator))))
            .has_value());
    EXPECT_FALSE(
        judged(signOrder(question_, operator_, signCertificate(certificate_, root_))).has_value());
    EXPECT_FALSE(judged("nothing of the kind").has_value());
    certificate_.holder = fleet::Certificate::Holder::Centre;
    EXPECT_FALSE(judged().has_value());
}

TEST_F(AskingAHost, MeansThisHostOfThisFleet) {
    question_.host = reader_.publicKey();
    EXPECT_FALSE(judged().has_value());
    question_.host = bus_.publicKey();
    question_.fleet = "south";
    EXPECT_FALSE(judged().has_value());
}

TEST_F(AskingAHost, IsGoodForAMinute) {
    EXPECT_TRUE(judged(bytes(), question_.expires - Moment(1)).has_value());
    EXPECT_FALSE(judged(bytes(), question_.expires).has_value());
    EXPECT_FALSE(judged(bytes(), kAsked - Moment(5 * 60 * 1000 + 1)).has_value());
    question_.expires += Moment(1);
    EXPECT_FALSE(judged().has_value());
    question_.expires = kAsked + Moment(1);
    certificate_.until = kAsked;
    EXPECT_FALSE(judged().has_value()) << "the certificate has ended";
}

TEST_F(AskingAHost, IsWithinTheCertificateAndTheHostsOwnLabels) {
    EXPECT_EQ(refusal(), "");
    question_.kind = "TASKS";
    EXPECT_NE(refusal().find("does not allow"), std::string::npos) << refusal();
    question_.kind = "GETCONFIG";
    question_.body = json{{"product", "db"}, {"answerTo", reader_.publicKey()}}.dump();
    EXPECT_NE(refusal().find("does not allow"), std::string::npos) << refusal();
    question_.body = json{{"product", "ux"}, {"answerTo", reader_.publicKey()}}.dump();
    question_.selector = "env=production";
    EXPECT_NE(refusal().find("not for hosts with these labels"), std::string::npos) << refusal();
    question_.selector = "a in (";
    EXPECT_NE(refusal(), "");
    question_.selector = "*";
    certificate_.selector = "env=production";
    EXPECT_NE(refusal().find("not for hosts with these labels"), std::string::npos) << refusal();
}

TEST_F(AskingAHost, NamesAKeyForTheAnswer) {
    for (const json& body :
         {json{{"product", "ux"}}, json{{"product", "ux"}, {"answerTo", "U"}},
          json{{"product", "ux"}, {"answerTo", root_.publicKey()}}, json{{"answerTo", 7}},
          // A key by its check sum, for which nothing can be sealed.
          json{{"answerTo", "UAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAABET7"}}}) {
        question_.body = body.dump();
        EXPECT_FALSE(judged().has_value()) << body;
    }
}

TEST(RememberedQuestions, AreAnsweredOnceUntilTheyExpire) {
    QuestionBook book;
    EXPECT_TRUE(book.enter("a", kAsked + Moment(10), kAsked));
    EXPECT_FALSE(book.enter("a", kAsked + Moment(10), kAsked + Moment(9)));
    EXPECT_TRUE(book.enter("b", kAsked + Moment(20), kAsked + Moment(9)));
    EXPECT_TRUE(book.enter("a", kAsked + Moment(20), kAsked + Moment(10)));
}

TEST(RememberedQuestions, AreNotForgottenForOthers) {
    QuestionBook book;
    for (std::size_t i = 0; i < QuestionBook::kMost; ++i)
        ASSERT_TRUE(book.enter(std::to_string(i), kAsked + Moment(10), kAsked));
    EXPECT_FALSE(book.enter("another", kAsked + Moment(10), kAsked));
    EXPECT_FALSE(book.enter("0", kAsked + Moment(10), kAsked));
    EXPECT_TRUE(book.enter("another", kAsked + Moment(20), kAsked + Moment(10)));
}

}  // namespace
