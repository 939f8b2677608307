#include "fleet/bus/accounts/nkey.h"

#include <gtest/gtest.h>

#include <string>

#include "fleet/bus/accounts/base32.h"

using fleet::KeyKind;
using fleet::KeyPair;

namespace {

// A pair that the bus's own documentation prints.
const char kSeed[] = "SUACSSL3UAHUDXKFSNVUZRF5UHPMWZ6BFDTJ7M6USDXIEDNPPQYYYCU3VY";
const char kPublic[] = "UDXU4RCSJNZOIQHZNWXHXORDPRTGNJAHAHFRGZNEEJCPQTT2M7NLCNF4";

}  // namespace

TEST(Base32, WritesTheStandardsExamples) {
    EXPECT_EQ(fleet::base32Encoded(""), "");
    EXPECT_EQ(fleet::base32Encoded("f"), "MY");
    EXPECT_EQ(fleet::base32Encoded("fo"), "MZXQ");
    EXPECT_EQ(fleet::base32Encoded("foo"), "MZXW6");
    EXPECT_EQ(fleet::base32Encoded("foob"), "MZXW6YQ");
    EXPECT_EQ(fleet::base32Encoded("foobar"), "MZXW6YTBOI");
}

TEST(Base32, ReadsWhatItWritesAndNothingElse) {
    EXPECT_EQ(fleet::base32Decoded("MZXW6YTBOI"), "foobar");
    EXPECT_EQ(fleet::base32Decoded("MZXW6YTBO"), std::nullopt) << "a digit is missing";
    EXPECT_EQ(fleet::base32Decoded("MZ"), std::nullopt) << "bits that belong to no byte";
    EXPECT_EQ(fleet::base32Decoded("mzxw6"), std::nullopt);
    EXPECT_EQ(fleet::base32Decoded("MY======"), std::nullopt);
}

TEST(KeyPairOfSeed, HasThePublicHalfThatOthersFind) {
    const auto pair = KeyPair::ofSeed(kSeed);
    ASSERT_TRUE(pair);
    EXPECT_EQ(pair->kind(), KeyKind::User);
    EXPECT_EQ(pair->publicKey(), kPublic);
    EXPECT_EQ(pair->seed(), kSeed);
}

TEST(KeyPairOfSeed, IsNoneOfADamagedSeed) {
    for (std::size_t at = 0; at + 1 < sizeof kSeed; ++at) {
        std::string damaged = kSeed;
        damaged[at] = damaged[at] == 'A' ? 'B' : 'A';
        EXPECT_FALSE(KeyPair::ofSeed(damaged)) << at;
    }
    EXPECT_FALSE(KeyPair::ofSeed(kPublic));
    EXPECT_FALSE(KeyPair::ofSeed(""));
}

TEST(KeyPairMade, SaysByItsFirstLettersWhatItIs) {
    const struct {
        KeyKind kind;
        char letter;
    } kinds[] = {{KeyKind::User, 'U'}, {KeyKind::Account, 'A'}, {KeyKind::Operator, 'O'}};
    for (const auto& [kind, letter] : kinds) {
        const KeyPair pair = KeyPair::make(kind);
        EXPECT_EQ(pair.publicKey().front(), letter);
        EXPECT_EQ(pair.seed().substr(0, 2), std::string("S") + letter);
        EXPECT_TRUE(fleet::isPublicKey(pair.publicKey(), kind));
        const auto again = KeyPair::ofSeed(pair.seed());
        ASSERT_TRUE(again);
        EXPECT_EQ(again->publicKey(), pair.publicKey());
    }
}

TEST(KeyPairMade, IsAnotherOneEachTime) {
    EXPECT_NE(KeyPair::make(KeyKind::User).publicKey(), KeyPair::make(KeyKind::User).publicKey());
}

TEST(PublicKey, IsOnlyATextWithTheRightCheckSumAndKind) {
    EXPECT_TRUE(fleet::isPublicKey(kPublic, KeyKind::User));
    EXPECT_FALSE(fleet::isPublicKey(kPublic, KeyKind::Account));
    for (const char* text : {"", "*", ">", "a.b", kSeed}) {
        EXPECT_FALSE(fleet::isPublicKey(text, KeyKind::User)) << text;
    }
    EXPECT_FALSE(fleet::isPublicKey(std::string(kPublic) + ".x", KeyKind::User));
    EXPECT_FALSE(fleet::isPublicKey(std::string(kPublic) + "A", KeyKind::User));
}

TEST(Signature, HoldsForItsBytesAndItsKeyOnly) {
    const KeyPair pair = KeyPair::make(KeyKind::Account);
    const std::string signature = pair.sign("bytes");
    EXPECT_TRUE(fleet::isSignedBy(pair.publicKey(), "bytes", signature));
    EXPECT_FALSE(fleet::isSignedBy(pair.publicKey(), "other", signature));
    EXPECT_FALSE(fleet::isSignedBy(pair.publicKey(), "bytes", signature.substr(1)));
    EXPECT_FALSE(
        fleet::isSignedBy(KeyPair::make(KeyKind::Account).publicKey(), "bytes", signature));
    EXPECT_FALSE(fleet::isSignedBy("nobody", "bytes", signature));
}
