#include "fleet/bus/messages/output_news.h"

#include <gtest/gtest.h>

#include <string>

#include "fleet/bus/messages/document.h"

namespace {

using fleet::kMostOutputText;
using fleet::MessageError;
using fleet::OutputNews;

TEST(NewsOfOutput, ReadAsTheyWereWritten) {
    OutputNews news;
    news.stream = "s";
    news.after = "1-2-3";
    news.at = "1-4-3";
    news.texts = {{false, "out"}, {true, "err\x1b"}};
    news.lost = 7;
    news.isOver = true;
    news.error = "e";
    news.status = 3;
    const OutputNews read = fleet::readNews(textOfNews(news));
    EXPECT_EQ(textOfNews(read), textOfNews(news));
    ASSERT_EQ(read.texts.size(), 2U);
    EXPECT_TRUE(read.texts[1].isError);
    EXPECT_EQ(read.texts[1].text, "err\x1b");
    EXPECT_EQ(read.lost, 7U);
    EXPECT_EQ(read.status, 3U);
}

TEST(NewsOfOutput, AreNothingElse) {
    EXPECT_THROW(fleet::readNews(""), MessageError);
    EXPECT_THROW(fleet::readNews("{}"), MessageError);
    const std::string text = textOfNews(OutputNews{});
    EXPECT_NO_THROW(fleet::readNews(text));
    const std::string list = R"("output":[])";
    const std::size_t at = text.find(list);
    ASSERT_NE(at, std::string::npos);
    for (const char* const other :
         {R"("output":7)", R"("output":[7])", R"("output":[{"stream":"stdin","text":""}])",
          R"("output":[{"stream":"stdout"}])"}) {
        std::string wrong = text;
        wrong.replace(at, list.size(), other);
        EXPECT_THROW(fleet::readNews(wrong), MessageError) << other;
    }
}

TEST(NewsOfOutput, AreCutBetweenCharacters) {
    EXPECT_TRUE(fleet::outputParts("").empty());
    EXPECT_EQ(fleet::outputParts(std::string(kMostOutputText, 'x')).size(), 1U);
    const std::string euro = "\xe2\x82\xac";
    const std::string text = std::string(kMostOutputText - 1, 'x') + euro + "y";
    const auto parts = fleet::outputParts(text);
    ASSERT_EQ(parts.size(), 2U);
    EXPECT_EQ(parts[0], std::string(kMostOutputText - 1, 'x'));
    EXPECT_EQ(parts[1], euro + "y");
    const std::string odd(2 * kMostOutputText, '\x80');
    std::string whole;
    for (const std::string& part : fleet::outputParts(odd))
        whole += part;
    EXPECT_EQ(whole, odd) << "what is no UTF-8 is cut anywhere";
}

}  // namespace
