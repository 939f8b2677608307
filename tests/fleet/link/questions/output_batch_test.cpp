/// The host's events of a task's output, as pieces.
#include "fleet/link/questions/output_batch.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "fleet/bus/messages/question.h"

namespace {

using ctl::ServerEvent;
using fleet::kMostOutputText;
using fleet::OutputBatch;
using fleet::OutputNews;
using nlohmann::json;

ServerEvent written(const std::string& text, const std::string& id,
                    const std::string& stream = "stdout") {
    return {"message", json{{"stream", stream}, {"text", text}}.dump(), id};
}

TEST(PiecesOfOutput, HoldWhatHasComeAndThePositionBehindIt) {
    OutputBatch batch("1-0-0");
    EXPECT_TRUE(batch.isEmpty());
    batch.add(written("one\n", "1-4-0"));
    batch.add(written("two\n", "1-4-4", "stderr"));
    const OutputNews news = batch.take();
    ASSERT_EQ(news.texts.size(), 2U);
    EXPECT_EQ(news.texts[0].text, "one\n");
    EXPECT_FALSE(news.texts[0].isError);
    EXPECT_TRUE(news.texts[1].isError);
    EXPECT_EQ(news.at, "1-4-4");
    EXPECT_FALSE(news.isOver);
    EXPECT_TRUE(batch.isEmpty());
}

TEST(PiecesOfOutput, TellTheEndOnceAndBehindAllTexts) {
    OutputBatch batch("");
    batch.add(written(std::string(kMostOutputText + 1, 'x'), "1-9-0"));
    batch.add({"end", R"({"state":"done"})", ""});
    EXPECT_TRUE(batch.isFull());
    const OutputNews first = batch.take();
    EXPECT_FALSE(first.isOver);
    EXPECT_EQ(first.at, "") << "the event is not whole yet";
    const OutputNews second = batch.take();
    EXPECT_TRUE(second.isOver);
    EXPECT_EQ(second.at, "1-9-0");
    EXPECT_TRUE(batch.isEmpty());
}

TEST(PiecesOfOutput, TellWhatTheHostHasLost) {
    OutputBatch batch("");
    batch.add({"overflow", R"({"lost":1000})", ""});
    batch.add({"overflow", R"({"lost":24})", ""});
    batch.add({"overflow", R"({"lost":-7})", ""});
    batch.add({"overflow", "nonsense", ""});
    EXPECT_FALSE(batch.isEmpty());
    EXPECT_EQ(batch.take().lost, 1024U);
}

TEST(PiecesOfOutput, FitIntoAMessageWhateverTheyHold) {
    OutputBatch batch("");
    batch.add(written(std::string(5 * kMostOutputText, '\x1b'), "a"));
    for (int i = 0; i < 2000; ++i)
        batch.add(written("\x01", "b", i % 2 == 0 ? "stdout" : "stderr"));
    std::size_t bytes = 0;
    while (!batch.isEmpty()) {
        const OutputNews news = batch.take();
        for (const fleet::OutputText& text : news.texts)
            bytes += text.text.size();
        EXPECT_LE(textOfNews(news).size(), fleet::kMostPieceBytes);
    }
    EXPECT_EQ(bytes, 5 * kMostOutputText + 2000);
}

TEST(PiecesOfOutput, DoNotKnowEveryEventOfANewerHost) {
    OutputBatch batch("");
    batch.add({"weather", R"({"stream":"stdout","text":"rain"})", "c"});
    batch.add({"message", "nonsense", "d"});
    batch.add(written("", "e"));
    EXPECT_TRUE(batch.isEmpty());
}

}  // namespace
