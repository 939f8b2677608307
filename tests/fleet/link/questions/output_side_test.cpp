/// What a link says to who asks for output that it does not show.
// ctest-label: threaded
#include "fleet/link/questions/output_side.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "ctl/client/failure.h"
#include "fleet/bus/messages/question.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::KeyPair;
using nlohmann::json;
using operator_test::newUser;

class RefusedOutput : public testing::Test {
protected:
    fleet::AskedQuestion question(const json& body) const {
        fleet::AskedQuestion asked;
        asked.id = "q2";
        asked.kind = "OUTPUT";
        asked.body = body.dump();
        asked.answerTo = reader_.publicKey();
        return asked;
    }
    /// What is told, once it has been asked.
    fleet::OutputNews told(const fleet::AskedQuestion& asked) {
        fleet::OutputSide side(host_, signing_, "/no/such/socket",
                               [this](std::string piece) { pieces_.push_back(std::move(piece)); });
        side.ask(asked);
        if (pieces_.size() != 1) return {};
        const fleet::AnswerPiece piece =
            fleet::readAnswer(pieces_.front(), host_, signing_.publicKey());
        EXPECT_EQ(piece.question, "q2");
        return fleet::readNews(reader_.unseal(piece.sealed).value_or(""));
    }

    const KeyPair signing_ = newUser();
    const KeyPair reader_ = newUser();
    const std::string host_ = newUser().publicKey();
    std::vector<std::string> pieces_;
};

TEST_F(RefusedOutput, IsToldWhy) {
    fleet::AskedQuestion asked = question({{"task", "t"}, {"follow", true}});
    asked.refusal = "not for you";
    const fleet::OutputNews news = told(asked);
    EXPECT_EQ(news.error, "not for you");
    EXPECT_EQ(news.status, static_cast<fleet::Number>(ctl::kHostReportedFailure));
    EXPECT_EQ(news.after, "");
}

TEST_F(RefusedOutput, NamesThePlaceWhereAnEarlierStreamWasToGoOn) {
    fleet::AskedQuestion asked =
        question({{"task", "t"}, {"follow", true}, {"stream", "q1"}, {"after", "1-2-0"}});
    asked.refusal = "not for you";
    EXPECT_EQ(told(asked).after, "1-2-0") << "else the reader takes it for another stream's";
}

TEST_F(RefusedOutput, IsToldOfAQuestionThatMakesNoSense) {
    EXPECT_EQ(told(question({{"task", 5}, {"after", 5}})).status,
              static_cast<fleet::Number>(ctl::kWrongUsage));
    pieces_.clear();
    fleet::AskedQuestion asked = question({});
    asked.body = "{";
    EXPECT_EQ(told(asked).status, static_cast<fleet::Number>(ctl::kWrongUsage));
}

}  // namespace
