#include "fleet/operator/orders/order_maker.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/numbered_order.h"
#include "fleet/link/judge.h"
#include "fleet/server/rollouts/incoming_orders.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::ChosenHost;
using fleet::Order;
using fleet::OrderMaker;
using fleet::Work;
using fleet::workOf;
using nlohmann::json;
using operator_test::failureOf;
using operator_test::kHour;
using operator_test::kNow;
using operator_test::newUser;

ctl::TaskRequest startOfUx() {
    ctl::TaskRequest request;
    request.command = "START";
    request.product = "ux";
    request.isForced = true;
    return request;
}

ctl::TaskRequest setConfig(const std::string& text) {
    ctl::TaskRequest request;
    request.command = "SETCONFIG";
    request.product = "ux";
    request.context = text;
    return request;
}

class OrderMakerTest : public testing::Test {
protected:
    /// What the link on the host makes of an order.
    std::optional<fleet::Directive> judged(const std::string& order) const {
        const fleet::KeyPair centre = newUser();
        const std::string numbered =
            signNumber(host_.key, 7, fleet::readOrder(order).order.id, order, centre);
        const fleet::Trust trust{"demo",         host_.key,           "web-1", {{"env", "test"}},
                                 identity_.root, {centre.publicKey()}};
        return judge(numbered, 7, trust, bus_);
    }

    const operator_test::Root root_;
    const fleet::OperatorIdentity identity_ = root_.certified({"START", "SETCONFIG"}, {"ux"});
    const OrderMaker maker_{identity_, "r1", kNow, 24 * kHour};
    const fleet::KeyPair bus_ = newUser();
    const ChosenHost host_{bus_.publicKey(), "web-1", "here"};
};

TEST_F(OrderMakerTest, SaysWhatTheHostIsToDoAndUntilWhen) {
    const std::string bytes = maker_.orderFor(host_, workOf(startOfUx()), "env=test");
    const fleet::SignedOrder read = fleet::readOrder(bytes);
    EXPECT_TRUE(isSignedByOperator(read, identity_.key.publicKey()));
    EXPECT_EQ(read.order.fleet, "demo");
    EXPECT_EQ(read.order.host, host_.key);
    EXPECT_EQ(read.order.selector, "env=test");
    EXPECT_EQ(read.order.kind, "START");
    EXPECT_EQ(json::parse(read.order.body), (json{{"product", "ux"}, {"force", true}}));
    EXPECT_EQ(read.order.issued, kNow);
    EXPECT_EQ(read.order.expires, kNow + 24 * kHour);
}

TEST_F(OrderMakerTest, MakesOrdersThatTheCentreAndTheHostTake) {
    const std::string bytes = maker_.orderFor(host_, workOf(startOfUx()), "env=test");
    const auto incoming =
        fleet::readIncomingOrders({bytes}, {"mary", identity_.key.publicKey()}, "demo", kNow);
    ASSERT_EQ(incoming.size(), 1U);
    EXPECT_EQ(incoming.front().product, "ux");
    const std::optional<fleet::Directive> directive = judged(bytes);
    ASSERT_TRUE(directive.has_value());
    EXPECT_EQ(directive->refusal, "");
    EXPECT_EQ(json::parse(directive->request),
              (json{{"command", "START"}, {"product", "ux"}, {"force", true}}));
}

TEST_F(OrderMakerTest, SealsAConfigurationForTheHostAlone) {
    const std::string bytes =
        maker_.orderFor(host_, workOf(setConfig("INSTANCE=\nA=veryspecial\n")), "*");
    EXPECT_EQ(bytes.find("veryspecial"), std::string::npos);
    const std::optional<fleet::Directive> directive = judged(bytes);
    ASSERT_TRUE(directive.has_value());
    EXPECT_EQ(directive->refusal, "");
    EXPECT_EQ(json::parse(directive->request), (json{{"command", "SETCONFIG"},
                                                     {"product", "ux"},
                                                     {"context", "INSTANCE=\nA=veryspecial\n"}}));
}

TEST_F(OrderMakerTest, HidesPasswordsOfOtherCommands) {
    ctl::TaskRequest request = startOfUx();
    request.command = "INSTALL";
    request.context = "/bin/sh install.sh password=geheim";
    const Work work = workOf(request);
    EXPECT_FALSE(work.body.contains("context"));
    EXPECT_NE(work.hidden.find("geheim"), std::string::npos);
    request.context = "/bin/sh install.sh";
    EXPECT_EQ(workOf(request).hidden, "");
    EXPECT_EQ(workOf(request).body["context"], "/bin/sh install.sh");
}

TEST_F(OrderMakerTest, KeepsTheIdentifierOfTheTaskForTheLink) {
    ctl::TaskRequest request = startOfUx();
    request.transid = "t1";
    request.isOnce = true;
    EXPECT_EQ(workOf(request).body, (json{{"product", "ux"}, {"force", true}}));
    EXPECT_EQ(workOf(request).product(), "ux");
}

TEST_F(OrderMakerTest, RefusesWhatTheCertificateDoesNotAllow) {
    EXPECT_NO_THROW(maker_.insistThatAllowed("START", "ux"));
    EXPECT_EQ(failureOf([&] { maker_.insistThatAllowed("STOP", "ux"); }).status(),
              ctl::kHostReportedFailure);
    EXPECT_EQ(failureOf([&] { maker_.insistThatAllowed("START", "lz"); }).status(),
              ctl::kHostReportedFailure);
}

TEST_F(OrderMakerTest, RefusesTimesThatNoHostWouldTake) {
    EXPECT_NO_THROW(OrderMaker(identity_, "r1", kNow, 7 * 24 * kHour));
    for (const fleet::Moment lasting : {fleet::Moment{}, 7 * 24 * kHour + fleet::Moment{1}}) {
        EXPECT_EQ(failureOf([&] { OrderMaker(identity_, "r1", kNow, lasting); }).status(),
                  ctl::kWrongUsage);
    }
    const fleet::OperatorIdentity ended = root_.certified({"*"}, {"*"}, "*", kNow);
    EXPECT_EQ(failureOf([&] { OrderMaker(ended, "r1", kNow, kHour); }).status(),
              ctl::kHostReportedFailure);
}

TEST_F(OrderMakerTest, RefusesAnOrderThatIsTooLong) {
    const std::string text(fleet::kMostOrderBytes, 'x');
    EXPECT_EQ(failureOf([&] { maker_.orderFor(host_, workOf(setConfig(text)), "*"); }).status(),
              ctl::kWrongUsage);
}

TEST_F(OrderMakerTest, TriesAgainWithAnotherIdentifierAsOftenAsItMay) {
    std::string bytes = maker_.orderFor(host_, workOf(startOfUx()), "*");
    std::set<std::string> identifiers;
    for (std::size_t tries = 1; tries < fleet::kMostTries; ++tries) {
        const Order order = fleet::readOrder(bytes).order;
        EXPECT_TRUE(maker_.isOwn(order));
        EXPECT_TRUE(identifiers.insert(order.id).second);
        bytes = maker_.again(order, tries);
    }
    const Order last = fleet::readOrder(bytes).order;
    EXPECT_EQ(failureOf([&] { maker_.again(last, fleet::kMostTries); }).status(),
              ctl::kHostReportedFailure);
}

TEST_F(OrderMakerTest, TakesTurnsWithAnotherOperator) {
    const fleet::OperatorIdentity colleague = root_.certified({"*"}, {"*"});
    const OrderMaker other(colleague, "r1", kNow, kHour);
    std::string bytes = maker_.orderFor(host_, workOf(startOfUx()), "*");
    std::set<std::string> identifiers = {fleet::readOrder(bytes).order.id};
    const OrderMaker* const turns[] = {&other, &maker_, &maker_, &other, &other, &maker_, &other};
    std::size_t tries = 0;
    for (const OrderMaker* const maker : turns) {
        bytes = maker->again(fleet::readOrder(bytes).order, ++tries);
        const Order order = fleet::readOrder(bytes).order;
        EXPECT_TRUE(identifiers.insert(order.id).second) << "try " << tries;
        EXPECT_EQ(maker->again(order, tries + 1), maker->again(order, tries + 1))
            << "who is interrupted and begins again makes the same order again";
    }
}

TEST_F(OrderMakerTest, CancelsAnOrder) {
    const fleet::OperatorIdentity canceller = root_.certified({"START", "CANCEL"}, {"ux"});
    const OrderMaker maker(canceller, "r1", kNow, kHour);
    const Order order =
        fleet::readOrder(maker_.orderFor(host_, workOf(startOfUx()), "env=test")).order;
    const std::optional<fleet::Directive> directive = judged(maker.cancelOf(order));
    ASSERT_TRUE(directive.has_value());
    EXPECT_EQ(directive->refusal, "");
    EXPECT_EQ(directive->cancels, order.id);
}

TEST_F(OrderMakerTest, CancelsForAsLongAsTheOrderIsGood) {
    const auto expiryOf = [](const std::string& bytes) {
        return fleet::readOrder(bytes).order.expires;
    };
    const OrderMaker longer(identity_, "r1", kNow, 50 * kHour);
    const std::string bytes = longer.orderFor(host_, workOf(startOfUx()), "env=test");
    const Order order = fleet::readOrder(bytes).order;
    EXPECT_EQ(expiryOf(maker_.cancelOf(order)), order.expires);
    Order shorter = order;
    shorter.expires = kNow + fleet::Moment(1);
    EXPECT_EQ(expiryOf(maker_.cancelOf(shorter)), kNow + 24 * kHour);
    Order endless = order;
    endless.expires = kNow + 1000 * kHour;
    EXPECT_EQ(expiryOf(maker_.cancelOf(endless)), kNow + fleet::kLongestOrder);
}

}  // namespace
