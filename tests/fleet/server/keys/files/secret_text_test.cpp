#include "fleet/server/keys/files/secret_text.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <utility>

namespace {

using fleet::SecretText;
using fleet::wipe;

/// Too long to stand in the object itself.
const std::string kLong(200, 's');

TEST(SecretText, LeavesNothingWhereAWipedTextStood) {
    std::string secret = kLong;
    const char* const bytes = secret.data();
    wipe(secret);
    EXPECT_TRUE(secret.empty());
    EXPECT_TRUE(std::all_of(bytes, bytes + kLong.size(), [](char c) { return c == '\0'; }));
}

TEST(SecretText, TakesATextOverAndWipesTheOneThatWasGiven) {
    std::string given = kLong;
    const char* const bytes = given.data();
    const SecretText taken(std::move(given));
    EXPECT_EQ(taken.view(), kLong);
    EXPECT_TRUE(std::all_of(bytes, bytes + kLong.size(), [](char c) { return c == '\0'; }));
}

TEST(SecretText, MovesWithoutLeavingAShortTextBehind) {
    SecretText from;
    from.append("short");
    const char* const bytes = from.view().data();
    SecretText to;
    to.append("older");
    to = std::move(from);
    EXPECT_EQ(to.view(), "short");
    EXPECT_TRUE(std::all_of(bytes, bytes + 5, [](char c) { return c == '\0'; }));
}

TEST(SecretText, GrowsToWhatIsAppended) {
    SecretText text;
    std::string all;
    for (int i = 0; i < 1000; ++i) {
        text.append("piece ").append(std::to_string(i));
        all += "piece " + std::to_string(i);
    }
    EXPECT_EQ(text.view(), all);
}

}  // namespace
