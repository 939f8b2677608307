#include "fleet/bus/messages/question.h"

#include <gtest/gtest.h>

#include <string>

#include "fleet/bus/messages/document.h"

namespace {

using fleet::AnswerPiece;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::MessageError;
using fleet::Order;

Order someQuestion() {
    Order question;
    question.fleet = "demo";
    question.id = fleet::makeOrderId();
    question.host = "UHOST";
    question.selector = "*";
    question.kind = fleet::kAsksTasks;
    question.body = R"({"answerTo":"U"})";
    return question;
}

TEST(Questions, AreNoOrdersAndOrdersAreNoQuestions) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string question = signQuestion(someQuestion(), key, "certificate");
    const fleet::SignedOrder read = fleet::readOrder(question);
    EXPECT_EQ(read.order.kind, fleet::kAsksTasks);
    EXPECT_EQ(read.certificate, "certificate");
    EXPECT_TRUE(isQuestionSignedBy(read, key.publicKey()));
    EXPECT_FALSE(isSignedByOperator(read, key.publicKey()));
    const std::string order = signOrder(someQuestion(), key, "certificate");
    EXPECT_FALSE(isQuestionSignedBy(fleet::readOrder(order), key.publicKey()));
    EXPECT_FALSE(isQuestionSignedBy(read, KeyPair::make(KeyKind::User).publicKey()));
}

TEST(AnswersOfHosts, ComeBackAsTheyWereSigned) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string bytes =
        signAnswer({"UHOST", "id", 7, true, std::string("sealed\0text", 11)}, key);
    const AnswerPiece piece = fleet::readAnswer(bytes, "UHOST", key.publicKey());
    EXPECT_EQ(piece.host, "UHOST");
    EXPECT_EQ(piece.question, "id");
    EXPECT_EQ(piece.place, 7U);
    EXPECT_TRUE(piece.isLast);
    EXPECT_EQ(piece.sealed, std::string("sealed\0text", 11));
    EXPECT_EQ(fleet::questionAnsweredBy(bytes), "id");
}

TEST(AnswersOfHosts, OfAnotherHostOrSignerDoNotCount) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string bytes = signAnswer({"UHOST", "id", 0, true, "x"}, key);
    EXPECT_THROW(fleet::readAnswer(bytes, "UOTHER", key.publicKey()), MessageError);
    EXPECT_THROW(fleet::readAnswer(bytes, "UHOST", KeyPair::make(KeyKind::User).publicKey()),
                 MessageError);
    std::string changed = bytes;
    changed.back() = 'y';
    EXPECT_THROW(fleet::readAnswer(changed, "UHOST", key.publicKey()), MessageError);
    EXPECT_FALSE(fleet::questionAnsweredBy("nothing of the kind").has_value());
}

}  // namespace
