#include "secrets/masked.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using secrets::masked;
using secrets::Masker;

TEST(Masked, HasNoSecretValues) {
    EXPECT_EQ(masked("./install.sh --password=hunter2 -q"), "./install.sh --password=*** -q");
    EXPECT_EQ(masked("DB_KEY: 'a b'\nPORT=5"), "DB_KEY: ***\nPORT=5");
    EXPECT_EQ(masked("token=a token=b"), "token=*** token=***");
    EXPECT_EQ(masked(""), "");
    EXPECT_EQ(masked("nothing = secret"), "nothing = secret");
}

struct Row {
    const char* text;
    const char* shown;
};

/// Texts whose values are found only by who reads the whole separator and every backslash.
const Row kRows[] = {
    {"password => hunter2 b", "password => *** b"},
    {"password=>hunter2 b", "password=>*** b"},
    {"password := hunter2 b", "password := *** b"},
    {"password == hunter2 b", "password == *** b"},
    {"password : = hunter2 b", "password : = *** b"},
    {R"('password' => 'a b' c)", R"('password' => *** c)"},
    {R"({\"password\":\"hunter2\"} b)", R"({\"password\":*** b)"},
    {R"({\"password\" : \"a b\" } c)", R"({\"password\" : *** } c)"},
    {R"({\\\"password\\\": \\\"a b\\\" } c)", R"({\\\"password\\\": *** } c)"},
    {R"("{\"key\": \"a \\\" b\" }" c)", R"("{\"key\": *** }" c)"},
    {R"("{\"key\": \"a b" c)", R"("{\"key\": *** c)"},
    {R"(password="a\" b" c)", "password=*** c"},
    {R"(password="a\\" c)", "password=*** c"},
    {R"(password="a\\\" b" c)", "password=*** c"},
    {R"(password='a\' b' c)", "password=*** c"},
    {R"(password=a\ b c)", "password=*** c"},
    {R"(password=a\\ b c)", "password=*** b c"},
};

TEST(Masked, KnowsEverySeparatorAndBackslash) {
    for (const Row& row : kRows) {
        EXPECT_EQ(masked(row.text), row.shown);
        EXPECT_EQ(masked(row.shown), row.shown);
    }
}

TEST(Masker, KnowsEverySeparatorAndBackslashWhereverTheTextIsCut) {
    for (const Row& row : kRows) {
        const std::string text = row.text;
        for (std::size_t piece = 1; piece <= text.size(); ++piece) {
            Masker masker;
            std::string shown;
            for (std::size_t at = 0; at < text.size(); at += piece)
                shown += masker.feed(text.substr(at, piece));
            EXPECT_EQ(shown, row.shown) << piece;
        }
    }
}

TEST(Masked, IsTheSameWhenItIsMaskedAgain) {
    const std::string once = masked("pwd=x; \"secret\": \"y\" rest");
    EXPECT_EQ(masked(once), once);
}

TEST(Masker, FindsANameBeforeManyBlanksWhereverTheTextIsCut) {
    for (const std::string& blanks :
         {std::string(40, ' '), std::string(23, '\t'), std::string(1, ' ')}) {
        for (const std::string name : {"password", "\"api_secret\""}) {
            const std::string text = "a " + name + blanks + "=hunter2 b";
            for (std::size_t piece = 1; piece <= text.size(); ++piece) {
                Masker masker;
                std::string shown;
                for (std::size_t at = 0; at < text.size(); at += piece)
                    shown += masker.feed(text.substr(at, piece));
                EXPECT_EQ(shown, "a " + name + blanks + "=*** b") << piece;
            }
        }
    }
}

TEST(Masker, MasksAValueOnceWhereverTheTextIsCut) {
    const std::string text = "a password=hunter2 b\nkey: 'x y' c secret=z";
    const std::string whole = masked(text);
    for (std::size_t cut = 0; cut <= text.size(); ++cut) {
        Masker masker;
        const std::string first = masker.feed(text.substr(0, cut));
        EXPECT_EQ(first + masker.feed(text.substr(cut)), whole) << cut;
    }
    Masker masker;
    std::string pieces;
    for (const char byte : text)
        pieces += masker.feed({&byte, 1});
    EXPECT_EQ(pieces, whole);
}

}  // namespace
