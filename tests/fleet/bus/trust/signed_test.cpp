#include "fleet/bus/trust/signed.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "fleet/bus/trust/sealed.h"

namespace {

using fleet::isSigned;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::partsOf;
using fleet::Purpose;
using fleet::sealFor;
using fleet::SignedParts;
using fleet::signMessage;

constexpr std::size_t kHead = 64 + 4;

TEST(SignedMessage, GivesBackWhatWasSigned) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string bytes =
        signMessage(Purpose::Ordering, key, "{\"a\":1}", std::string("\0x", 2));
    const std::optional<SignedParts> parts = partsOf(bytes);
    ASSERT_TRUE(parts.has_value());
    EXPECT_EQ(parts->text, "{\"a\":1}");
    EXPECT_EQ(parts->carried, std::string_view("\0x", 2));
    EXPECT_TRUE(isSigned(*parts, Purpose::Ordering, key.publicKey()));
}

TEST(SignedMessage, HasItsLengthInFourBytesBehindTheSignature) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string bytes = signMessage(Purpose::Ordering, key, std::string(258, 'x'), "yz");
    EXPECT_EQ(bytes.size(), kHead + 258 + 2);
    EXPECT_EQ(bytes.substr(64, 4), std::string("\0\0\1\2", 4));
}

TEST(SignedMessage, IsWorthNothingForAnotherPurposeOrAsAnothers) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string bytes = signMessage(Purpose::Greeting, key, "{}");
    EXPECT_FALSE(isSigned(*partsOf(bytes), Purpose::Reporting, key.publicKey()));
    const KeyPair other = KeyPair::make(KeyKind::User);
    EXPECT_FALSE(isSigned(*partsOf(bytes), Purpose::Greeting, other.publicKey()));
    EXPECT_FALSE(isSigned(*partsOf(bytes), Purpose::Greeting, "no key"));
}

TEST(SignedMessage, OfEachPurposeCountsForThatOneOnly) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const Purpose purposes[] = {Purpose::Certifying, Purpose::Ordering,  Purpose::Numbering,
                                Purpose::Greeting,   Purpose::Replying,  Purpose::Reporting,
                                Purpose::Asking,     Purpose::Answering, Purpose::Enrolling,
                                Purpose::LoggingIn};
    for (const Purpose made : purposes) {
        const std::string bytes = signMessage(made, key, "{}");
        for (const Purpose asked : purposes)
            EXPECT_EQ(isSigned(*partsOf(bytes), asked, key.publicKey()), made == asked);
    }
}

TEST(SignedMessage, IsWorthNothingWhenAnyByteIsAnotherOne) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string bytes = signMessage(Purpose::Greeting, key, "{}", "more");
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        std::string changed = bytes;
        changed[i] = static_cast<char>(changed[i] ^ 1);
        const std::optional<SignedParts> parts = partsOf(changed);
        EXPECT_FALSE(parts && isSigned(*parts, Purpose::Greeting, key.publicKey())) << i;
    }
}

TEST(SignedMessage, TheLineBetweenTextAndTheRestIsSigned) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    std::string bytes = signMessage(Purpose::Greeting, key, "ab", "cd");
    bytes[67] = 3;
    EXPECT_EQ(partsOf(bytes)->text, "abc");
    EXPECT_FALSE(isSigned(*partsOf(bytes), Purpose::Greeting, key.publicKey()));
}

TEST(SignedMessage, WhatIsCutOffOrTooLongIsNone) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string bytes = signMessage(Purpose::Greeting, key, "text");
    for (std::size_t length = 0; length < bytes.size(); ++length) {
        EXPECT_FALSE(partsOf(std::string_view(bytes).substr(0, length)).has_value()) << length;
    }
    EXPECT_FALSE(partsOf(bytes + std::string(fleet::kMostSignedBytes, 'x')).has_value());
}

TEST(Sealing, OnlyTheHolderOfTheKeyReads) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string sealed = sealFor(key.publicKey(), "password=secret");
    EXPECT_EQ(sealed.find("secret"), std::string::npos);
    EXPECT_EQ(key.unseal(sealed), "password=secret");
    EXPECT_EQ(KeyPair::make(KeyKind::User).unseal(sealed), std::nullopt);
    EXPECT_EQ(key.unseal(sealFor(key.publicKey(), "")), "");
}

TEST(Sealing, EachTimeTheBytesAreOthers) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    EXPECT_NE(sealFor(key.publicKey(), "x"), sealFor(key.publicKey(), "x"));
}

TEST(Sealing, WhatWasChangedOrCutIsNotOpened) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string sealed = sealFor(key.publicKey(), "text");
    for (std::size_t i = 0; i < sealed.size(); ++i) {
        std::string changed = sealed;
        changed[i] = static_cast<char>(changed[i] ^ 1);
        EXPECT_EQ(key.unseal(changed), std::nullopt) << i;
        EXPECT_EQ(key.unseal(std::string_view(sealed).substr(0, i)), std::nullopt) << i;
    }
}

TEST(Sealing, NothingIsSealedForWhatIsNoKey) {
    EXPECT_THROW(sealFor("Unknown", "text"), std::invalid_argument);
    // 32 zero bytes with the right check sum: of these anybody has the secret half.
    const std::string zeros = "UAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAABET7";
    ASSERT_TRUE(fleet::isPublicKey(zeros, KeyKind::User));
    EXPECT_THROW(sealFor(zeros, "text"), std::invalid_argument);
    EXPECT_FALSE(fleet::canSealFor(zeros));
    EXPECT_FALSE(fleet::canSealFor("Unknown"));
    EXPECT_TRUE(fleet::canSealFor(KeyPair::make(KeyKind::User).publicKey()));
}

}  // namespace
