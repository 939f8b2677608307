/// A stream of output, from pieces that come, get lost, come twice, or are somebody else's.
#include "fleet/operator/questions/output_reader.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "fleet/bus/messages/question.h"
#include "fleet/bus/trust/sealed.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::KeyPair;
using fleet::Number;
using fleet::OutputNews;
using fleet::OutputReader;
using operator_test::newUser;

class ReadingOutput : public testing::Test {
protected:
    ReadingOutput() { reader_.asked("q1"); }

    std::string piece(Number place, OutputNews news, const std::string& question = "q1") {
        if (news.stream.empty()) news.stream = "q1";
        return signAnswer({host_, question, place, news.isOver,
                           fleet::sealFor(reader_.answerTo(), textOfNews(news))},
                          signing_);
    }
    static OutputNews text(const std::string& text, const std::string& at = "") {
        OutputNews news;
        news.texts = {{false, text}};
        news.at = at;
        return news;
    }

    const KeyPair signing_ = newUser();
    const std::string host_ = newUser().publicKey();
    OutputReader reader_{host_, signing_.publicKey()};
};

TEST_F(ReadingOutput, TakesPiecesInTheirOrderOnce) {
    const std::string first = piece(0, text("a", "1-1-0"));
    const auto heard = reader_.take(first);
    ASSERT_TRUE(heard.has_value());
    EXPECT_FALSE(heard->hasGap);
    EXPECT_EQ(heard->news.texts.at(0).text, "a");
    EXPECT_EQ(reader_.position(), "1-1-0");
    EXPECT_EQ(reader_.stream(), "q1");
    EXPECT_FALSE(reader_.take(first).has_value()) << "it came twice";
    EXPECT_FALSE(reader_.take(piece(1, text("b")))->hasGap);
    EXPECT_EQ(reader_.position(), "1-1-0") << "the host has told no other";
}

TEST_F(ReadingOutput, SeesThatPiecesWereLost) {
    EXPECT_TRUE(reader_.take(piece(1, text("b")))->hasGap);
    EXPECT_FALSE(reader_.take(piece(2, text("c")))->hasGap);
    EXPECT_TRUE(reader_.take(piece(5, text("f")))->hasGap);
    EXPECT_FALSE(reader_.take(piece(4, text("e"))).has_value()) << "it is too late";
}

TEST_F(ReadingOutput, GoesOnUnderLaterQuestions) {
    ASSERT_TRUE(reader_.take(piece(0, text("a"))));
    EXPECT_FALSE(reader_.take(piece(1, text("b"), "q2")).has_value()) << "nobody has asked that";
    reader_.asked("q2");
    const auto heard = reader_.take(piece(1, text("b"), "q2"));
    ASSERT_TRUE(heard.has_value());
    EXPECT_FALSE(heard->hasGap);
    for (int i = 0; i < 20; ++i)
        reader_.asked("q" + std::to_string(100 + i));
    EXPECT_FALSE(reader_.take(piece(2, text("c"), "q1")).has_value()) << "long ago";
}

TEST_F(ReadingOutput, GoesOnWithALinkThatWasStartedAnew) {
    ASSERT_TRUE(reader_.take(piece(0, text("a", "1-1-0"))));
    ASSERT_TRUE(reader_.take(piece(1, text("b", "1-2-0"))));
    reader_.asked("q2");
    OutputNews again = text("b", "1-2-0");
    again.stream = "q2";
    again.after = "1-1-0";
    EXPECT_FALSE(reader_.take(piece(0, again, "q2")).has_value()) << "that came already";
    EXPECT_EQ(reader_.stream(), "q1");
    reader_.asked("q3");
    OutputNews on = text("c", "1-3-0");
    on.stream = "q3";
    on.after = "1-2-0";
    const auto heard = reader_.take(piece(0, on, "q3"));
    ASSERT_TRUE(heard.has_value());
    EXPECT_FALSE(heard->hasGap);
    EXPECT_EQ(reader_.stream(), "q3");
    EXPECT_FALSE(reader_.take(piece(2, text("x"), "q1")).has_value()) << "the stream before it";
}

TEST_F(ReadingOutput, BelievesTheHostOnly) {
    const KeyPair forger = newUser();
    const std::string sealed = fleet::sealFor(reader_.answerTo(), textOfNews(text("lies")));
    EXPECT_FALSE(reader_.take(signAnswer({host_, "q1", 0, false, sealed}, forger)).has_value());
    EXPECT_FALSE(reader_.take(signAnswer({newUser().publicKey(), "q1", 0, false, sealed}, signing_))
                     .has_value());
    const std::string others = fleet::sealFor(newUser().publicKey(), textOfNews(text("lies")));
    EXPECT_FALSE(reader_.take(signAnswer({host_, "q1", 0, false, others}, signing_)).has_value());
    const std::string nonsense = fleet::sealFor(reader_.answerTo(), "nonsense");
    EXPECT_FALSE(reader_.take(signAnswer({host_, "q1", 0, false, nonsense}, signing_)).has_value());
    EXPECT_FALSE(reader_.take("nothing of the kind").has_value());
    EXPECT_TRUE(reader_.take(piece(0, text("a"))).has_value());
}

}  // namespace
