#include "host/commands/tail.h"

#include <gtest/gtest.h>

namespace {

std::string numbered(std::size_t bytes) {
    std::string text;
    for (std::size_t i = 0; text.size() < bytes; ++i)
        text += std::to_string(i) + ' ';
    text.resize(bytes);
    return text;
}

TEST(Tail, KeepsTheLastBytesWhateverThePieces) {
    const std::string whole = numbered(3 * host::Tail::kBytes + 1);
    const std::string end = whole.substr(whole.size() - host::Tail::kBytes);
    for (const std::size_t piece : {std::size_t{1}, std::size_t{7}, host::Tail::kBytes - 1,
                                    host::Tail::kBytes, host::Tail::kBytes + 1, whole.size()}) {
        host::Tail tail;
        for (std::size_t at = 0; at < whole.size(); at += piece)
            tail.append(whole.substr(at, piece));
        EXPECT_EQ(tail.text(), end) << piece;
    }
}

TEST(Tail, KeepsAShortTextWhole) {
    host::Tail tail;
    tail.append("one ");
    tail.append("");
    tail.append("two");
    EXPECT_EQ(tail.text(), "one two");
}

}  // namespace
