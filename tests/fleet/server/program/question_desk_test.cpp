#include "fleet/server/program/question_desk.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "fleet/bus/messages/question.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Moment;
using fleet::QuestionDesk;

class AskingThroughTheCentre : public testing::Test {
protected:
    AskingThroughTheCentre() {
        desk_.open([this](const std::string& host, const std::string& bytes) {
            published_.push_back(host + ":" + bytes);
        });
    }
    static std::string answer(const std::string& question, const std::string& text) {
        static const KeyPair key = KeyPair::make(KeyKind::User);
        return signAnswer({"h", question, 0, true, text}, key);
    }
    std::size_t waiting(const std::string& round, Moment now = Moment(1)) {
        const auto answers = desk_.fetch("op", round, now);
        return answers ? answers->size() : 1'000'000;
    }

    QuestionDesk desk_;
    std::vector<std::string> published_;
};

TEST_F(AskingThroughTheCentre, BringsAnswersToWhoAskedOnce) {
    const auto round = desk_.ask("op", {{"h1", "q1", "b1"}, {"h2", "q2", "b2"}}, Moment(1));
    ASSERT_TRUE(round.has_value());
    EXPECT_EQ(published_, (std::vector<std::string>{"h1:b1", "h2:b2"}));
    desk_.hear("h1", answer("q1", "x"), Moment(2));
    EXPECT_FALSE(desk_.fetch("somebody else", *round, Moment(2)).has_value());
    const auto answers = desk_.fetch("op", *round, Moment(2));
    ASSERT_EQ(answers->size(), 1U);
    EXPECT_EQ(answers->front().host, "h1");
    EXPECT_EQ(answers->front().bytes, answer("q1", "x"));
    EXPECT_EQ(waiting(*round), 0U) << "nothing is kept";
}

TEST_F(AskingThroughTheCentre, TakesAnswersOnlyFromThoseWhoWereAsked) {
    const auto round = desk_.ask("op", {{"h1", "q1", "b1"}}, Moment(1));
    desk_.hear("h2", answer("q1", "x"), Moment(2));
    desk_.hear("h1", answer("q2", "x"), Moment(2));
    desk_.hear("h1", "nothing of the kind", Moment(2));
    desk_.hear("h1", answer("q1", std::string(300'000, 'x')), Moment(2));
    EXPECT_EQ(waiting(*round), 0U);
}

TEST_F(AskingThroughTheCentre, EndsWithItsTime) {
    const auto round = desk_.ask("op", {{"h1", "q1", "b1"}}, Moment(1));
    const Moment end = Moment(1) + QuestionDesk::kRoundTime;
    desk_.hear("h1", answer("q1", "x"), end - Moment(1));
    EXPECT_FALSE(desk_.fetch("op", *round, end).has_value());
}

TEST_F(AskingThroughTheCentre, GoesOnInARoundForAsLongAsItIsAskedAgain) {
    const auto round = desk_.ask("op", {{"h1", "q1", "b1"}}, Moment(1));
    const Moment half = Moment(1) + QuestionDesk::kRoundTime / 2;
    ASSERT_TRUE(desk_.askAgain("op", *round, {{"h1", "q2", "b2"}}, half));
    EXPECT_EQ(published_.back(), "h1:b2");
    const Moment end = Moment(1) + QuestionDesk::kRoundTime;
    desk_.hear("h1", answer("q1", "x"), end - Moment(1));
    desk_.hear("h1", answer("q2", "x"), end);
    EXPECT_EQ(waiting(*round, end), 2U);
    ASSERT_TRUE(desk_.askAgain("op", *round, {{"h1", "q3", "b3"}}, end));
    desk_.hear("h1", answer("q1", "x"), end);
    EXPECT_EQ(waiting(*round, end), 0U) << "the first question is over";
    EXPECT_FALSE(desk_.askAgain("thief", *round, {{"h1", "q4", "b4"}}, end));
    EXPECT_FALSE(desk_.askAgain("op", "none", {{"h1", "q4", "b4"}}, end));
    EXPECT_FALSE(
        desk_.askAgain("op", *round, {{"h1", "q4", "b4"}}, end + QuestionDesk::kRoundTime));
    EXPECT_EQ(published_.size(), 3U);
}

TEST_F(AskingThroughTheCentre, HasALimitForTheQuestionsOfARound) {
    const auto round = desk_.ask("op", {{"h1", "q1", "b1"}}, Moment(1));
    std::vector<QuestionDesk::Asked> more;
    for (std::size_t i = 0; i < QuestionDesk::kMostHosts; ++i)
        more.push_back({"h", std::to_string(i), "b"});
    EXPECT_FALSE(desk_.askAgain("op", *round, more, Moment(2)));
    more.pop_back();
    EXPECT_TRUE(desk_.askAgain("op", *round, more, Moment(2)));
    EXPECT_FALSE(desk_.askAgain("op", *round, {{"h1", "q2", "b2"}}, Moment(3)));
    EXPECT_TRUE(
        desk_.askAgain("op", *round, {{"h1", "q2", "b2"}}, Moment(1) + QuestionDesk::kRoundTime))
        << "older ones make room";
}

TEST_F(AskingThroughTheCentre, TakesLimitedRoom) {
    const auto round = desk_.ask("op", {{"h1", "q1", "b1"}}, Moment(1));
    const std::string piece = answer("q1", std::string(200'000, 'x'));
    for (int i = 0; i < 200; ++i)
        desk_.hear("h1", piece, Moment(2));
    std::size_t all = 0;
    for (std::size_t some = waiting(*round); some > 0; some = waiting(*round)) {
        EXPECT_LE(some, 6U) << "one reply has a limit, too";
        all += some;
    }
    EXPECT_EQ(all, QuestionDesk::kMostBytesOfRound / piece.size());
    desk_.hear("h1", piece, Moment(3));
    EXPECT_EQ(waiting(*round), 1U) << "what was fetched makes room";
}

TEST_F(AskingThroughTheCentre, EndsTheOldestRoundOfWhoAsksTooMuch) {
    std::vector<std::string> rounds;
    for (std::size_t i = 0; i <= QuestionDesk::kMostOfOperator; ++i) {
        const Moment now(static_cast<Moment::rep>(i) + 1);
        rounds.push_back(*desk_.ask("op", {{"h1", std::to_string(i), "b"}}, now));
    }
    EXPECT_FALSE(desk_.fetch("op", rounds[0], Moment(100)).has_value());
    EXPECT_TRUE(desk_.fetch("op", rounds[1], Moment(100)).has_value());
}

TEST_F(AskingThroughTheCentre, HasLimitsForAllTogether) {
    for (std::size_t i = 0; i < QuestionDesk::kMostRounds; ++i)
        ASSERT_TRUE(desk_.ask(std::to_string(i), {{"h", std::to_string(i), "b"}}, Moment(1)));
    EXPECT_FALSE(desk_.ask("another", {{"h", "q", "b"}}, Moment(1)).has_value());
    EXPECT_TRUE(
        desk_.ask("another", {{"h", "q", "b"}}, Moment(1) + QuestionDesk::kRoundTime).has_value());
    const std::vector<QuestionDesk::Asked> many(QuestionDesk::kMostHosts + 1);
    EXPECT_FALSE(desk_.ask("op", many, Moment(1) + QuestionDesk::kRoundTime).has_value());
}

TEST_F(AskingThroughTheCentre, IsForACentreThatWorks) {
    desk_.close();
    EXPECT_FALSE(desk_.ask("op", {{"h1", "q1", "b1"}}, Moment(1)).has_value());
    EXPECT_TRUE(published_.empty());
}

TEST_F(AskingThroughTheCentre, PublishesAQuestionOnce) {
    const auto first = desk_.ask("op", {{"h1", "q1", "b1"}}, Moment(1));
    const auto second = desk_.ask("thief", {{"h1", "q1", "b1"}}, Moment(1));
    EXPECT_EQ(published_.size(), 1U);
    desk_.hear("h1", answer("q1", "x"), Moment(2));
    EXPECT_EQ(waiting(*first), 1U);
    EXPECT_EQ(desk_.fetch("thief", *second, Moment(2))->size(), 0U);
}

}  // namespace
