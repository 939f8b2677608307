#include "fleet/link/questions/answer_pieces.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "fleet/bus/messages/question.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;

class PiecesOfAnAnswer : public testing::Test {
protected:
    std::vector<fleet::AnswerPiece> pieces(const std::string& answer) {
        fleet::AskedQuestion question;
        question.id = "id";
        question.answerTo = reader_.publicKey();
        std::vector<fleet::AnswerPiece> read;
        for (const std::string& bytes : answerPieces("UHOST", question, answer, signing_))
            read.push_back(fleet::readAnswer(bytes, "UHOST", signing_.publicKey()));
        return read;
    }
    std::string textOf(const std::vector<fleet::AnswerPiece>& pieces) {
        std::string text;
        for (const fleet::AnswerPiece& piece : pieces)
            text += reader_.unseal(piece.sealed).value();
        return text;
    }

    const KeyPair signing_ = KeyPair::make(KeyKind::User);
    const KeyPair reader_ = KeyPair::make(KeyKind::User);
};

TEST_F(PiecesOfAnAnswer, AreSealedForTheQuestionsKey) {
    const auto one = pieces("a secret");
    ASSERT_EQ(one.size(), 1U);
    EXPECT_TRUE(one[0].isLast);
    EXPECT_EQ(one[0].sealed.find("secret"), std::string::npos);
    EXPECT_EQ(textOf(one), "a secret");
    EXPECT_FALSE(KeyPair::make(KeyKind::User).unseal(one[0].sealed).has_value());
}

TEST_F(PiecesOfAnAnswer, AreCountedAndTheLastOneSaysSo) {
    const std::string answer(2 * fleet::kMostPieceBytes + 1, 'x');
    const auto three = pieces(answer);
    ASSERT_EQ(three.size(), 3U);
    for (std::size_t i = 0; i < 3; ++i) {
        EXPECT_EQ(three[i].place, i);
        EXPECT_EQ(three[i].isLast, i == 2);
    }
    EXPECT_EQ(textOf(three), answer);
    EXPECT_EQ(pieces(std::string(fleet::kMostPieceBytes, 'x')).size(), 1U);
    EXPECT_EQ(pieces("").size(), 1U);
}

TEST_F(PiecesOfAnAnswer, SayThatTheAnswerWasTooLong) {
    EXPECT_EQ(textOf(pieces(std::string(fleet::kMostAnswerBytes + 1, 'x'))),
              R"({"error":"the answer is too long; ask for less"})");
}

}  // namespace
