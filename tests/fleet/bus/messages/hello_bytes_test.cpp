#include "fleet/bus/messages/hello_bytes.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"

namespace {

using fleet::Hello;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::MessageError;
using fleet::Moment;
using fleet::Number;
using fleet::Outcome;
using fleet::Purpose;
using fleet::Reply;
using nlohmann::json;

const KeyPair kKey = KeyPair::make(KeyKind::User);

TEST(HelloBytes, KeepAllOfAHello) {
    Hello hello;
    hello.session = "s";
    hello.nonce = "n";
    hello.machine = "m";
    hello.time = Moment(1'700'000'000'000);
    hello.taken = fleet::kHighestNumber;
    hello.journal = "j1";
    hello.journalNow = "j2";
    hello.blocked = "the disk is full";
    const std::string order = fleet::makeOrderId();
    hello.have = {{order, 7}};
    const Hello read = fleet::readHello(signHello("H", hello, kKey), "H", kKey.publicKey());
    EXPECT_EQ(read.session, "s");
    EXPECT_EQ(read.nonce, "n");
    EXPECT_EQ(read.machine, "m");
    EXPECT_EQ(read.time, hello.time);
    EXPECT_EQ(read.taken, fleet::kHighestNumber);
    EXPECT_EQ(read.journal, "j1");
    EXPECT_EQ(read.journalNow, "j2");
    EXPECT_EQ(read.blocked, "the disk is full");
    ASSERT_TRUE(read.have.has_value());
    ASSERT_EQ(read.have->size(), 1U);
    EXPECT_EQ(read.have->front().order, order);
    EXPECT_EQ(read.have->front().number, Number{7});
    hello.have.reset();
    EXPECT_FALSE(
        fleet::readHello(signHello("H", hello, kKey), "H", kKey.publicKey()).have.has_value());
}

TEST(HelloBytes, OpenOrdersAreIdentifiersAndNothingElse) {
    Reply reply;
    reply.open = {"0 HTTP/1.1\r\nHost: localhost\r\n\r\nPOST /v1/tasks HTTP/1.1\r\n\r\n"};
    EXPECT_THROW(fleet::readReply(signReply("H", reply, kKey), "H", {kKey.publicKey()}),
                 fleet::MessageError);
}

TEST(HelloBytes, AHelloIsNoLongerThanItMustBe) {
    for (std::string Hello::*const member :
         {&Hello::session, &Hello::machine, &Hello::journal, &Hello::journalNow, &Hello::blocked}) {
        Hello hello;
        hello.*member = std::string(5'000, 'x');
        EXPECT_THROW(fleet::readHello(signHello("H", hello, kKey), "H", kKey.publicKey()),
                     fleet::MessageError);
    }
}

TEST(HelloBytes, KeepAllOfAReply) {
    Reply reply;
    reply.nonce = "n";
    reply.time = Moment(5);
    reply.over = 3;
    reply.last = 9;
    reply.open = {std::string(32, 'a'), std::string(32, 'b')};
    reply.forget = true;
    reply.list = true;
    reply.stop = "why";
    reply.revoked = {"key"};
    const Reply read = fleet::readReply(signReply("H", reply, kKey), "H", {kKey.publicKey()});
    EXPECT_EQ(read.nonce, "n");
    EXPECT_EQ(read.time, Moment(5));
    EXPECT_EQ(read.over, Number{3});
    EXPECT_EQ(read.last, Number{9});
    EXPECT_EQ(read.open, reply.open);
    EXPECT_TRUE(read.forget);
    EXPECT_TRUE(read.list);
    EXPECT_EQ(read.stop, "why");
    EXPECT_EQ(read.revoked, reply.revoked);
}

TEST(HelloBytes, KeepAllOfAnOutcomeAndTheHostsDocumentAsItIs) {
    Outcome outcome;
    outcome.host = "H";
    outcome.number = 4;
    outcome.order = fleet::makeOrderId();
    outcome.journal = "j";
    outcome.state = "failed";
    outcome.task = "{ \"b\": 1, \"a\": 2 }";
    const Outcome read = fleet::readOutcome(signOutcome(outcome, kKey), "H", kKey.publicKey());
    EXPECT_TRUE(saySame(read, outcome));
    EXPECT_EQ(read.number, Number{4});
    outcome.task = "no document";
    EXPECT_THROW(fleet::readOutcome(signOutcome(outcome, kKey), "H", kKey.publicKey()),
                 MessageError);
}

TEST(OutcomeBytes, HaveAStateAndAJournalThatFitIntoTheirPlaces) {
    for (std::string Outcome::*const member : {&Outcome::state, &Outcome::journal}) {
        Outcome outcome;
        outcome.host = "H";
        outcome.number = 4;
        outcome.order = fleet::makeOrderId();
        outcome.task = "{}";
        outcome.*member = "fits";
        EXPECT_NO_THROW(fleet::readOutcome(signOutcome(outcome, kKey), "H", kKey.publicKey()));
        outcome.*member = std::string(5'000, 'x');
        EXPECT_THROW(fleet::readOutcome(signOutcome(outcome, kKey), "H", kKey.publicKey()),
                     MessageError);
    }
}

TEST(HelloBytes, OfAnotherHostOrSignerOrPurposeDoNotCount) {
    const std::string hello = signHello("H", Hello{}, kKey);
    EXPECT_THROW(fleet::readHello(hello, "G", kKey.publicKey()), MessageError);
    const KeyPair other = KeyPair::make(KeyKind::User);
    EXPECT_THROW(fleet::readHello(hello, "H", other.publicKey()), MessageError);
    EXPECT_THROW(fleet::readReply(hello, "H", {kKey.publicKey()}), MessageError);
    EXPECT_THROW(fleet::readOutcome(hello, "H", kKey.publicKey()), MessageError);
    EXPECT_THROW(fleet::readHello("", "H", kKey.publicKey()), MessageError);
}

/// A hello in which one member is another value, or is missing.
std::string helloWith(const char* member, const json& value) {
    const std::string good = signHello("H", Hello{}, kKey);
    json document = json::parse(fleet::partsOf(good)->text);
    if (value.is_discarded()) {
        document.erase(member);
    } else {
        document[member] = value;
    }
    return signMessage(Purpose::Greeting, kKey, document.dump());
}

TEST(HelloBytes, WithAMemberThatIsMissingOrOddDoNotCount) {
    const json missing(json::value_t::discarded);
    for (const char* const member : {"host", "session", "nonce", "machine", "time", "taken",
                                     "journal", "journal_now", "blocked"}) {
        EXPECT_THROW(fleet::readHello(helloWith(member, missing), "H", kKey.publicKey()),
                     MessageError)
            << member;
        EXPECT_THROW(fleet::readHello(helloWith(member, json::array()), "H", kKey.publicKey()),
                     MessageError)
            << member;
    }
    const json oddNumbers = {-1, 1.5, "1", fleet::kHighestNumber + 1, nullptr};
    for (const json& odd : oddNumbers) {
        EXPECT_THROW(fleet::readHello(helloWith("taken", odd), "H", kKey.publicKey()), MessageError)
            << odd;
    }
    const json oddLists = {1, {1}, {{{"order", "short"}, {"n", 1}}}, "x", json::object()};
    for (const json& odd : oddLists) {
        EXPECT_THROW(fleet::readHello(helloWith("have", odd), "H", kKey.publicKey()), MessageError)
            << odd;
    }
}

TEST(HelloBytes, ThatAreNoObjectDoNotCount) {
    for (const char* const text : {"", "[]", "1", "{", "null", "{}x"}) {
        EXPECT_THROW(
            fleet::readHello(signMessage(Purpose::Greeting, kKey, text), "H", kKey.publicKey()),
            MessageError)
            << text;
    }
}

}  // namespace
