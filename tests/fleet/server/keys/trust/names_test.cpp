#include "fleet/server/keys/trust/names.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "fleet/server/keys/files/keys_error.h"

namespace {

using fleet::KeysError;
using fleet::Labels;
using fleet::labelsOf;
using fleet::patternsOf;
using Texts = std::vector<std::string>;

TEST(GivenLabels, AreNamesWithValues) {
    EXPECT_EQ(labelsOf(""), Labels{});
    EXPECT_EQ(labelsOf("env=test,site=a.b/c"), (Labels{{"env", "test"}, {"site", "a.b/c"}}));
    for (const char* const text :
         {"env", "env=", "=test", "env=a b", "env=*", ",", "a=b,", "a=b,a=c"})
        EXPECT_THROW(labelsOf(text), KeysError) << text;
}

TEST(GivenLabels, AreAHundredAtMost) {
    std::string text = "k0=v";
    for (int i = 1; i < 100; ++i)
        text += ",k" + std::to_string(i) + "=v";
    EXPECT_EQ(labelsOf(text).size(), 100U);
    EXPECT_THROW(labelsOf(text + ",more=v"), KeysError);
}

TEST(GivenLabels, AreReadAsTheyWereKept) {
    const Labels labels = {{"env", "test"}, {"site", "a"}};
    EXPECT_EQ(fleet::labelsKept(fleet::keptLabels(labels)), labels);
    EXPECT_EQ(fleet::labelsKept(fleet::keptLabels({})), Labels{});
    const Texts texts = {"START", "*"};
    EXPECT_EQ(fleet::textsKept(fleet::keptTexts(texts)), texts);
    EXPECT_EQ(fleet::textsKept(fleet::keptTexts({})), Texts{});
}

TEST(GivenPatterns, AreNamesWithStars) {
    EXPECT_EQ(patternsOf(""), Texts{});
    EXPECT_EQ(patternsOf("START,k*"), (Texts{"START", "k*"}));
    for (const char* const text : {",", "START,", "a b", "a;b"})
        EXPECT_THROW(patternsOf(text), KeysError) << text;
}

}  // namespace
