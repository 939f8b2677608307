#include "fleet/server/api/sessions/sessions.h"

#include <gtest/gtest.h>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/messages/session.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::MessageError;
using fleet::Moment;
using fleet::SessionRequest;
using fleet::Sessions;

constexpr Moment kNow{1'800'000'000'000};

SessionRequest requestOf(const std::string& key, Moment time = kNow) {
    return {"demo", key, "https://centre:8443", time, fleet::makeOrderId()};
}

TEST(SessionRequests, AreReadAsTheyWereSigned) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const SessionRequest request = requestOf(key.publicKey());
    const SessionRequest read = fleet::readSessionRequest(signSessionRequest(request, key));
    EXPECT_EQ(read.fleet, "demo");
    EXPECT_EQ(read.key, key.publicKey());
    EXPECT_EQ(read.url, "https://centre:8443");
    EXPECT_EQ(read.time, kNow);
    EXPECT_EQ(read.nonce, request.nonce);
}

TEST(SessionRequests, CountForNothingIfAByteIsAnother) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const std::string bytes = signSessionRequest(requestOf(key.publicKey()), key);
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        std::string changed = bytes;
        changed[i] = static_cast<char>(changed[i] ^ 1);
        EXPECT_THROW(fleet::readSessionRequest(changed), MessageError) << i;
        EXPECT_THROW(fleet::readSessionRequest(bytes.substr(0, i)), MessageError) << i;
    }
}

TEST(SessionRequests, AreSignedByTheirOwnKey) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    const KeyPair other = KeyPair::make(KeyKind::User);
    EXPECT_THROW(signSessionRequest(requestOf(other.publicKey()), key), std::invalid_argument);
}

TEST(SessionList, KnowsWhoHasOpenedASession) {
    Sessions sessions;
    const auto one = sessions.open(requestOf("one"), kNow);
    const auto other = sessions.open(requestOf("other"), kNow);
    ASSERT_TRUE(one && other);
    EXPECT_EQ(sessions.keyOf(one->token, kNow), "one");
    EXPECT_EQ(sessions.keyOf(other->token, kNow), "other");
    EXPECT_EQ(sessions.keyOf(one->token + "x", kNow), std::nullopt);
    EXPECT_EQ(sessions.keyOf("", kNow), std::nullopt);
}

TEST(SessionList, EndsSessionsAfterSomeHours) {
    Sessions sessions;
    const auto opened = sessions.open(requestOf("one"), kNow);
    EXPECT_EQ(opened->expires, kNow + Sessions::kLifetime);
    EXPECT_EQ(sessions.keyOf(opened->token, opened->expires - Moment(1)), "one");
    EXPECT_EQ(sessions.keyOf(opened->token, opened->expires), std::nullopt);
}

TEST(SessionList, TakesARequestOnce) {
    Sessions sessions;
    const SessionRequest request = requestOf("one");
    EXPECT_TRUE(sessions.open(request, kNow));
    EXPECT_FALSE(sessions.open(request, kNow));
    EXPECT_FALSE(sessions.open(request, kNow + Sessions::kClockError));
    EXPECT_FALSE(sessions.open(request, kNow + Sessions::kClockError + Moment(1)))
        << "out of date by now";
}

TEST(SessionList, TakesNoRequestWhoseTimeIsFarOff) {
    Sessions sessions;
    const Moment most = Sessions::kClockError;
    EXPECT_TRUE(sessions.open(requestOf("one", kNow + most), kNow));
    EXPECT_TRUE(sessions.open(requestOf("one", kNow - most), kNow));
    EXPECT_FALSE(sessions.open(requestOf("one", kNow + most + Moment(1)), kNow));
    EXPECT_FALSE(sessions.open(requestOf("one", kNow - most - Moment(1)), kNow));
}

TEST(SessionList, TakesNoRequestThatMayHaveComeBeforeARestart) {
    Sessions sessions(kNow);
    EXPECT_FALSE(sessions.open(requestOf("one", kNow - Moment(1)), kNow));
    EXPECT_TRUE(sessions.open(requestOf("one", kNow), kNow));
}

TEST(SessionList, EndsTheOldestOfAKeyThatHasTooMany) {
    Sessions sessions;
    const auto first = sessions.open(requestOf("one"), kNow);
    const auto second = sessions.open(requestOf("one"), kNow);
    const auto other = sessions.open(requestOf("other"), kNow);
    for (std::size_t i = 2; i <= Sessions::kMostOfKey; ++i)
        ASSERT_TRUE(sessions.open(requestOf("one"), kNow));
    EXPECT_EQ(sessions.keyOf(first->token, kNow), std::nullopt);
    EXPECT_EQ(sessions.keyOf(second->token, kNow), "one");
    EXPECT_EQ(sessions.keyOf(other->token, kNow), "other");
}

TEST(SessionList, RemembersNoMoreOfAKeyThanItShould) {
    Sessions sessions;
    for (std::size_t i = 0; i < Sessions::kMostNonces; ++i)
        ASSERT_TRUE(sessions.open(requestOf("one"), kNow));
    EXPECT_FALSE(sessions.open(requestOf("one"), kNow));
    EXPECT_TRUE(sessions.open(requestOf("other"), kNow));
    const Moment later = kNow + 2 * Sessions::kClockError + Moment(1);
    EXPECT_TRUE(sessions.open(requestOf("one", later), later));
}

}  // namespace
