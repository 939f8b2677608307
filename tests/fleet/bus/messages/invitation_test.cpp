#include "fleet/bus/messages/invitation.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/document.h"

namespace {

using fleet::fingerprintOfToken;
using fleet::Invitation;
using fleet::invitationText;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::makeJoinToken;
using fleet::MessageError;
using fleet::readInvitation;

Invitation anInvitation() {
    return {"https://centre.example:8443", std::string(64, 'a'), "demo",
            KeyPair::make(KeyKind::Operator).publicKey(), makeJoinToken()};
}

std::string mistakeIn(const Invitation& invitation) {
    try {
        readInvitation(invitationText(invitation));
        return "";
    } catch (const MessageError& error) {
        return error.what();
    }
}

TEST(Invitation, IsOneWordThatHoldsAllThatANewcomerNeeds) {
    const Invitation sent = anInvitation();
    const std::string text = invitationText(sent);
    EXPECT_EQ(text.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz"
                                     "0123456789-_"),
              std::string::npos);
    const Invitation read = readInvitation("  " + text + "\r\n");
    EXPECT_EQ(read.url, sent.url);
    EXPECT_EQ(read.authority, sent.authority);
    EXPECT_EQ(read.fleet, sent.fleet);
    EXPECT_EQ(read.root, sent.root);
    EXPECT_EQ(read.token, sent.token);
}

TEST(Invitation, IsNoneWhereverItIsCutOrChangedToNonsense) {
    const std::string text = invitationText(anInvitation());
    for (std::size_t length = 0; length < text.size(); ++length)
        EXPECT_THROW(readInvitation(text.substr(0, length)), MessageError) << length;
    EXPECT_THROW(readInvitation(text + "!"), MessageError);
    EXPECT_THROW(readInvitation(std::string(1 << 20, 'A')), MessageError);
}

TEST(Invitation, IsRefusedUnlessEachPartIsOne) {
    Invitation wrong = anInvitation();
    wrong.url = "http://centre.example";
    EXPECT_EQ(mistakeIn(wrong), "\"url\" is none of HTTPS");
    wrong = anInvitation();
    wrong.authority = std::string(64, 'A');
    EXPECT_EQ(mistakeIn(wrong), "\"authority\" is no fingerprint");
    wrong = anInvitation();
    wrong.root = KeyPair::make(KeyKind::User).publicKey();
    EXPECT_EQ(mistakeIn(wrong), "\"root\" is no key");
    wrong = anInvitation();
    wrong.token += "A";
    EXPECT_EQ(mistakeIn(wrong), "\"token\" is none");
}

TEST(JoinToken, IsAnotherEachTimeAndIsKeptAsSomethingElse) {
    std::set<std::string> tokens;
    for (int i = 0; i < 1000; ++i)
        EXPECT_TRUE(tokens.insert(makeJoinToken()).second);
    const std::string token = *tokens.begin();
    EXPECT_EQ(token.size(), 22U);
    const auto fingerprint = fingerprintOfToken(token);
    ASSERT_TRUE(fingerprint.has_value());
    EXPECT_EQ(fingerprint->size(), 32U);
    EXPECT_EQ(fingerprintOfToken(token), fingerprint);
    EXPECT_NE(fingerprintOfToken(*tokens.rbegin()), fingerprint);
}

TEST(JoinToken, HasOneFormOnly) {
    const std::string token = makeJoinToken();
    EXPECT_EQ(fingerprintOfToken(""), std::nullopt);
    EXPECT_EQ(fingerprintOfToken(token.substr(1)), std::nullopt);
    EXPECT_EQ(fingerprintOfToken(token + "="), std::nullopt);
    EXPECT_EQ(fingerprintOfToken(token.substr(1) + "+"), std::nullopt);
}

}  // namespace
