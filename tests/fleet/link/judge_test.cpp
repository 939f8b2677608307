/// Which orders count on a host: whoever has signed them, for whomever they were made.
#include "fleet/link/judge.h"

#include <gtest/gtest.h>

#include <functional>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/numbered_order.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/sealed.h"

namespace {

using fleet::Certificate;
using fleet::Directive;
using fleet::judge;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Moment;
using fleet::Number;
using fleet::Order;
using nlohmann::json;

constexpr Moment kIssued{1'700'000'000'000};

/// A fleet with one operator, and a host of it.
class JudgeTest : public testing::Test {
protected:
    JudgeTest() {
        trust_.fleet = "north";
        trust_.host = bus_.publicKey();
        trust_.name = "web-7";
        trust_.labels = {{"env", "test"}};
        trust_.root = root_.publicKey();
        trust_.centres = {centre_.publicKey()};
        certificate_.fleet = "north";
        certificate_.name = "mira";
        certificate_.key = operator_.publicKey();
        certificate_.until = kIssued + Moment(1'000'000);
        certificate_.commands = {"START", "SET*", "CANCEL"};
        certificate_.products = {"ux"};
        certificate_.selector = "env=test";
        order_.fleet = "north";
        order_.id = fleet::makeOrderId();
        order_.host = bus_.publicKey();
        order_.selector = "web-*";
        order_.kind = "START";
        order_.body = R"({"product":"ux"})";
        order_.issued = kIssued;
        order_.expires = kIssued + Moment(60'000);
    }

    std::string orderBytes() const {
        return fleet::signOrder(order_, operator_, fleet::signCertificate(certificate_, root_));
    }
    std::string numbered(const std::string& order, Number number = 5) const {
        return fleet::signNumber(trust_.host, number, order_.id, order, centre_);
    }
    std::optional<Directive> judged(const std::string& bytes) const {
        return judge(bytes, 5, trust_, host_);
    }
    /// The order's refusal; "none" if its number does not count.
    std::string refusal() const {
        const std::optional<Directive> directive = judged(numbered(orderBytes()));
        return directive ? directive->refusal : "none";
    }
    void expectRefusal(const std::string& words) const {
        EXPECT_NE(refusal().find(words), std::string::npos) << refusal();
    }

    const KeyPair root_ = KeyPair::make(KeyKind::Operator);
    const KeyPair centre_ = KeyPair::make(KeyKind::User);
    const KeyPair operator_ = KeyPair::make(KeyKind::User);
    const KeyPair bus_ = KeyPair::make(KeyKind::User);
    const KeyPair host_ = KeyPair::make(KeyKind::User);
    fleet::Trust trust_;
    Certificate certificate_;
    Order order_;
};

TEST_F(JudgeTest, AGoodOrderIsForTheHost) {
    const std::optional<Directive> directive = judged(numbered(orderBytes()));
    ASSERT_TRUE(directive.has_value());
    EXPECT_EQ(directive->refusal, "");
    EXPECT_EQ(directive->number, Number{5});
    EXPECT_EQ(directive->order, order_.id);
    EXPECT_EQ(directive->signer, operator_.publicKey());
    EXPECT_EQ(directive->issued, order_.issued);
    EXPECT_EQ(directive->expires, order_.expires);
    EXPECT_EQ(directive->allowedUntil, certificate_.until);
    EXPECT_FALSE(directive->hasFiles);
    EXPECT_EQ(json::parse(directive->request), json({{"command", "START"}, {"product", "ux"}}));
}

TEST_F(JudgeTest, ANumberThatTheCentreHasNotSignedDoesNotCount) {
    const std::string order = orderBytes();
    const KeyPair stranger = KeyPair::make(KeyKind::User);
    EXPECT_FALSE(judged(fleet::signNumber(trust_.host, 5, order_.id, order, stranger)));
    EXPECT_FALSE(judged(numbered(order, 6)));
    EXPECT_FALSE(judged(fleet::signNumber("another", 5, order_.id, order, centre_)));
    EXPECT_FALSE(judged(order));
    EXPECT_FALSE(judged(""));
    EXPECT_FALSE(judged("garbage"));
}

TEST_F(JudgeTest, AnyOfTheCentresKeysMayHaveSignedANumber) {
    trust_.centres.insert(trust_.centres.begin(), KeyPair::make(KeyKind::User).publicKey());
    EXPECT_TRUE(judged(numbered(orderBytes())));
}

TEST_F(JudgeTest, AnOrderMayNotBeExchangedUnderItsNumber) {
    const std::string order = orderBytes();
    order_.id = fleet::makeOrderId();
    const std::optional<Directive> directive = judged(numbered(order));
    ASSERT_TRUE(directive.has_value());
    EXPECT_NE(directive->refusal.find("another identifier"), std::string::npos);
    EXPECT_EQ(directive->order, order_.id);
}

TEST_F(JudgeTest, BytesThatAreNoOrderAreRefusedUnderTheIdentifierOfTheNumber) {
    const std::optional<Directive> directive = judged(numbered("garbage"));
    ASSERT_TRUE(directive.has_value());
    EXPECT_NE(directive->refusal, "");
    EXPECT_EQ(directive->order, order_.id);
}

TEST_F(JudgeTest, OnlyTheRootMakesOperators) {
    const std::string byCentre = fleet::signCertificate(certificate_, centre_);
    const auto directive = judged(numbered(fleet::signOrder(order_, operator_, byCentre)));
    EXPECT_NE(directive.value().refusal.find("root"), std::string::npos);
    const auto stripped = judged(numbered(fleet::signOrder(order_, operator_, "")));
    EXPECT_NE(stripped.value().refusal, "");
}

TEST_F(JudgeTest, TheCentresCertificateMakesNoOperator) {
    certificate_.holder = Certificate::Holder::Centre;
    expectRefusal("does not allow");
}

TEST_F(JudgeTest, AnOrderIsSignedByTheOneWhoseCertificateItCarries) {
    const KeyPair stranger = KeyPair::make(KeyKind::User);
    const std::string certificate = fleet::signCertificate(certificate_, root_);
    const auto directive = judged(numbered(fleet::signOrder(order_, stranger, certificate)));
    EXPECT_NE(directive.value().refusal.find("has not signed"), std::string::npos);
}

TEST_F(JudgeTest, AnotherFleetsCertificateOrOrderDoesNotCount) {
    order_.fleet = "south";
    expectRefusal("another fleet");
    order_.fleet = "north";
    certificate_.fleet = "south";
    expectRefusal("another fleet");
}

TEST_F(JudgeTest, AnOrderForAnotherHostDoesNotCount) {
    order_.host = KeyPair::make(KeyKind::User).publicKey();
    expectRefusal("another host");
}

TEST_F(JudgeTest, CommandsAndProductsAreThoseOfTheCertificate) {
    order_.kind = "STOP";
    expectRefusal("does not allow");
    order_.kind = "SETCONFIG";
    EXPECT_EQ(refusal(), "");
    order_.body = R"({"product":"um"})";
    expectRefusal("does not allow");
    certificate_.products = {"*"};
    EXPECT_EQ(refusal(), "");
    certificate_.commands.clear();
    expectRefusal("does not allow");
}

TEST_F(JudgeTest, SelectorsAreTriedOnTheHostsOwnLabels) {
    certificate_.selector = "env=prod";
    expectRefusal("certificate is not for hosts");
    certificate_.selector = "env=test";
    order_.selector = "db-*";
    expectRefusal("order is not for hosts");
    order_.selector = "env in (";
    expectRefusal("selector");
}

TEST_F(JudgeTest, NoOrderWaitsLongerThanAWeek) {
    order_.expires = order_.issued + fleet::kLongestOrder;
    EXPECT_EQ(refusal(), "");
    order_.expires += Moment(1);
    expectRefusal("too long");
}

TEST_F(JudgeTest, WhatWasSealedIsForThisHostOnly) {
    order_.kind = "SETCONFIG";
    const std::string secret = R"({"context":"password=1"})";
    const std::string sealed = fleet::sealFor(host_.publicKey(), secret);
    order_.body = json({{"product", "ux"}, {"sealed", fleet::base64Of(sealed)}}).dump();
    const std::string bytes = numbered(orderBytes());
    EXPECT_EQ(bytes.find("password"), std::string::npos);
    EXPECT_EQ(json::parse(judged(bytes)->request),
              json({{"command", "SETCONFIG"}, {"context", "password=1"}, {"product", "ux"}}));
    const std::string other = fleet::sealFor(KeyPair::make(KeyKind::User).publicKey(), secret);
    order_.body = json({{"product", "ux"}, {"sealed", fleet::base64Of(other)}}).dump();
    expectRefusal("not sealed for this host");
    order_.body = R"({"product":"ux","sealed":"%%%"})";
    expectRefusal("base64");
}

TEST_F(JudgeTest, WhatIsSealedMayNotHideAnotherProduct) {
    const std::string hidden = R"({"product":"um"})";
    order_.body = json({{"product", "ux"},
                        {"sealed", fleet::base64Of(fleet::sealFor(host_.publicKey(), hidden))}})
                      .dump();
    expectRefusal("does not allow");
}

TEST_F(JudgeTest, TheLinksOwnMembersCannotBeOrdered) {
    order_.body = R"({"product":"ux","transid":"x","once":false,"journal":"j","refused":"r",
                      "command":"UNINSTALL","expires":"never","done":"d"})";
    EXPECT_EQ(json::parse(judged(numbered(orderBytes()))->request),
              json({{"command", "START"}, {"product", "ux"}}));
}

TEST_F(JudgeTest, ACancelNamesAnOrder) {
    order_.kind = fleet::kCancel;
    const std::string target = fleet::makeOrderId();
    order_.body = json({{"order", target}}).dump();
    EXPECT_EQ(judged(numbered(orderBytes()))->cancels, target);
    order_.body = R"({"order":"../x"})";
    expectRefusal("is no order");
    EXPECT_EQ(judged(numbered(orderBytes()))->cancels, "");
    order_.body = "{}";
    expectRefusal("\"order\"");
}

TEST_F(JudgeTest, AnOrderWithFilesSaysSo) {
    order_.files = {{"ux/7/install.sh", std::string(64, 'a'), 12}};
    EXPECT_TRUE(judged(numbered(orderBytes()))->hasFiles);
    order_.files[0].sha256 = "short";
    expectRefusal("sum");
}

TEST_F(JudgeTest, TextsThatAreNestedDeepAreRefused) {
    std::string deep = "{\"product\":\"ux\",\"x\":";
    for (int i = 0; i < 100'000; ++i)
        deep += '[';
    EXPECT_THROW(fleet::readDocument(deep), fleet::MessageError);
}

}  // namespace
