#include "fleet/bus/messages/enrolment.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <stdexcept>
#include <string>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/bus/trust/signed.h"

namespace {

using fleet::EnrolmentAnswer;
using fleet::EnrolmentRequest;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::MessageError;
using fleet::Purpose;
using fleet::readEnrolment;
using fleet::signEnrolment;
using fleet::signMessage;

class Enrolment : public testing::Test {
protected:
    EnrolmentRequest request() const {
        return {"demo", fleet::makeJoinToken(), bus_.publicKey(), signing_.publicKey(), "machine"};
    }
    std::string textOf(const EnrolmentRequest& request) const {
        return nlohmann::json{{"fleet", request.fleet},
                              {"token", request.token},
                              {"host", request.host},
                              {"signing", request.signing},
                              {"machine", request.machine}}
            .dump();
    }
    /// Signed by any two keys for any two purposes.
    std::string signedBy(const KeyPair& outer, const KeyPair& inner, Purpose outerPurpose,
                         Purpose innerPurpose) const {
        const std::string text = textOf(request());
        return signMessage(outerPurpose, outer, text, signMessage(innerPurpose, inner, text));
    }
    static std::string refusalOf(const std::string& bytes) {
        try {
            readEnrolment(bytes);
            return "";
        } catch (const MessageError& error) {
            return error.what();
        }
    }

    const KeyPair bus_ = KeyPair::make(KeyKind::User);
    const KeyPair signing_ = KeyPair::make(KeyKind::User);
};

TEST_F(Enrolment, TellsTheCentreWhoWantsToJoin) {
    const EnrolmentRequest sent = request();
    const EnrolmentRequest read = readEnrolment(signEnrolment(sent, bus_, signing_));
    EXPECT_EQ(read.fleet, sent.fleet);
    EXPECT_EQ(read.token, sent.token);
    EXPECT_EQ(read.host, bus_.publicKey());
    EXPECT_EQ(read.signing, signing_.publicKey());
    EXPECT_EQ(read.machine, "machine");
}

TEST_F(Enrolment, IsSignedByBothKeysForThisPurpose) {
    constexpr auto kEnrol = Purpose::Enrolling;
    const char* const unsignedText = "the request is not signed by its keys";
    EXPECT_EQ(refusalOf(signedBy(signing_, bus_, kEnrol, kEnrol)), "");
    EXPECT_EQ(refusalOf(signedBy(signing_, signing_, kEnrol, kEnrol)), unsignedText);
    EXPECT_EQ(refusalOf(signedBy(bus_, bus_, kEnrol, kEnrol)), unsignedText);
    EXPECT_EQ(refusalOf(signedBy(signing_, bus_, Purpose::LoggingIn, kEnrol)), unsignedText);
    EXPECT_EQ(refusalOf(signedBy(signing_, bus_, kEnrol, Purpose::Greeting)), unsignedText);
}

TEST_F(Enrolment, IsNotSignedWithKeysOfOthers) {
    EXPECT_THROW(signEnrolment(request(), signing_, bus_), std::invalid_argument);
}

TEST_F(Enrolment, IsNoneWhenAnyByteIsAnotherOneOrMissing) {
    const std::string bytes = signEnrolment(request(), bus_, signing_);
    for (std::size_t i = 0; i < bytes.size(); ++i) {
        std::string changed = bytes;
        changed[i] = static_cast<char>(changed[i] ^ 1);
        EXPECT_NE(refusalOf(changed), "") << i;
        EXPECT_NE(refusalOf(bytes.substr(0, i)), "") << i;
    }
    EXPECT_NE(refusalOf(bytes + "x"), "");
    EXPECT_NE(refusalOf(std::string(1 << 20, '\0')), "");
}

TEST_F(Enrolment, SignsOneTextTwiceAndNotTwoTexts) {
    const std::string text = textOf(request());
    const std::string other = textOf(request());
    EXPECT_EQ(refusalOf(signMessage(Purpose::Enrolling, signing_, text,
                                    signMessage(Purpose::Enrolling, bus_, other))),
              "this is no request to join a fleet");
}

TEST_F(Enrolment, NeedsTwoKeysAndAMachine) {
    EnrolmentRequest wrong = request();
    wrong.signing = wrong.host;
    EXPECT_EQ(refusalOf(signEnrolment(wrong, bus_, bus_)), "the two keys are the same");
    for (const std::string& machine : {std::string(), std::string(129, 'm')}) {
        wrong = request();
        wrong.machine = machine;
        EXPECT_EQ(refusalOf(signEnrolment(wrong, bus_, signing_)),
                  "\"machine\" is no identity of a machine");
    }
    const KeyPair account = KeyPair::make(KeyKind::Account);
    wrong = request();
    wrong.host = account.publicKey();
    EXPECT_EQ(refusalOf(signEnrolment(wrong, account, signing_)), "\"host\" is no key");
}

TEST_F(Enrolment, AnswerArrivesAsItWasSent) {
    const EnrolmentAnswer sent{"web1", "token", {"nats://a:1", "nats://b:2"},
                               "a",    "PEM",   {std::string("\0\xff", 2), "second"}};
    const EnrolmentAnswer read = fleet::readEnrolmentAnswer(fleet::enrolmentAnswerText(sent));
    EXPECT_EQ(read.name, sent.name);
    EXPECT_EQ(read.userToken, sent.userToken);
    EXPECT_EQ(read.busUrls, sent.busUrls);
    EXPECT_EQ(read.serverName, sent.serverName);
    EXPECT_EQ(read.authority, sent.authority);
    EXPECT_EQ(read.centres, sent.centres);
    EXPECT_THROW(fleet::readEnrolmentAnswer("{}"), MessageError);
}

}  // namespace
