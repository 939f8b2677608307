#include "fleet/operator/orders/renewed_orders.h"

#include <gtest/gtest.h>

#include <functional>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::ChosenHost;
using fleet::OperatorIdentity;
using fleet::Order;
using fleet::OrderMaker;
using fleet::Renewal;
using nlohmann::json;
using operator_test::failureOf;
using operator_test::kHour;
using operator_test::kNow;
using operator_test::newUser;

class RenewedOrders : public testing::Test {
protected:
    static fleet::Work startOf(const std::string& product) {
        return {"START", {{"product", product}}, ""};
    }
    /// A line of the list to be signed, with an order of this operator.
    static json listed(const OperatorIdentity& by, const fleet::Work& work,
                       const std::string& selector = "env=test",
                       const std::string& rollout = "r1") {
        const OrderMaker maker(by, rollout, kNow - kHour, kHour);
        const ChosenHost host{newUser().publicKey(), "web", "here"};
        const std::string bytes = maker.orderFor(host, work, selector);
        return {{"host", host.key},
                {"order", fleet::readOrder(bytes).order.id},
                {"signed", fleet::base64Of(bytes)}};
    }
    std::vector<std::string> renew(const std::vector<json>& hosts,
                                   Renewal renewal = Renewal::Resume) const {
        return renewBy(identity_, hosts, renewal);
    }
    std::vector<std::string> renewBy(const OperatorIdentity& identity,
                                     const std::vector<json>& hosts, Renewal renewal) const {
        const OrderMaker maker(identity, "r1", kNow, 2 * kHour);
        return renewedOrders({{"hosts", hosts}}, rollout_, renewal, identity, maker);
    }
    void expectRefused(const std::vector<json>& hosts, const std::string& reason) const {
        const ctl::Failure failure = failureOf([&] { renew(hosts); });
        EXPECT_EQ(failure.status(), ctl::kHostReportedFailure);
        EXPECT_NE(std::string(failure.what()).find(reason), std::string::npos) << failure.what();
    }

    const operator_test::Root root_;
    const OperatorIdentity identity_ =
        root_.certified({"START", "STOP", "SETCONFIG", "CANCEL"}, {"ux", "lz"});
    const json rollout_ = {{"kind", "START"}, {"product", "ux"}, {"selector", "env=test"}};
};

TEST_F(RenewedOrders, ChangeNothingButTheIdentifierAndTheTimes) {
    const json first = listed(identity_, startOf("ux"));
    const std::vector<std::string> orders = renew({first, listed(identity_, startOf("ux"))});
    ASSERT_EQ(orders.size(), 2U);
    const fleet::SignedOrder read = fleet::readOrder(orders.front());
    EXPECT_TRUE(isSignedByOperator(read, identity_.key.publicKey()));
    EXPECT_EQ(read.order.host, first["host"]);
    EXPECT_NE(read.order.id, first["order"]);
    EXPECT_EQ(read.order.kind, "START");
    EXPECT_EQ(read.order.selector, "env=test");
    EXPECT_EQ(json::parse(read.order.body), (json{{"product", "ux"}}));
    EXPECT_EQ(read.order.issued, kNow);
    EXPECT_EQ(read.order.expires, kNow + 2 * kHour);
}

TEST_F(RenewedOrders, KeepWhatIsSealedForEachHost) {
    json rollout = rollout_;
    rollout["kind"] = "SETCONFIG";
    const fleet::Work work{"SETCONFIG", {{"product", "ux"}}, R"({"context":"A=b"})"};
    const std::vector<json> hosts = {listed(identity_, work), listed(identity_, work)};
    const OrderMaker maker(identity_, "r1", kNow, kHour);
    const auto orders =
        renewedOrders({{"hosts", hosts}}, rollout, Renewal::RetryFailed, identity_, maker);
    ASSERT_EQ(orders.size(), 2U);
    for (std::size_t i = 0; i < 2; ++i) {
        const std::string before = fleet::bytesOfBase64(hosts[i]["signed"].get<std::string>());
        EXPECT_EQ(fleet::readOrder(orders[i]).order.body, fleet::readOrder(before).order.body);
    }
}

TEST_F(RenewedOrders, CancelOthersForAnAbort) {
    const json first = listed(identity_, startOf("ux"));
    const auto orders = renew({first}, Renewal::Abort);
    ASSERT_EQ(orders.size(), 1U);
    const Order cancel = fleet::readOrder(orders.front()).order;
    EXPECT_EQ(cancel.kind, fleet::kCancel);
    EXPECT_EQ(json::parse(cancel.body), (json{{"order", first["order"]}}));
    EXPECT_EQ(cancel.host, first["host"]);
}

TEST_F(RenewedOrders, AreNoneOfAnotherOperator) {
    const OperatorIdentity other = root_.certified({"START"}, {"ux"});
    expectRefused({listed(identity_, startOf("ux")), listed(other, startOf("ux"))},
                  "another operator's");
}

TEST_F(RenewedOrders, AreThoseOfOtherOperatorsForWhoMayDoEverything) {
    const OperatorIdentity admin = root_.certified({"*"}, {"*"});
    const json theirs = listed(identity_, startOf("ux"));
    const auto orders = renewBy(admin, {theirs}, Renewal::Resume);
    ASSERT_EQ(orders.size(), 1U);
    EXPECT_TRUE(isSignedByOperator(fleet::readOrder(orders.front()), admin.key.publicKey()));
    const operator_test::Root stranger;
    const OperatorIdentity foreign = stranger.certified({"START"}, {"ux"});
    EXPECT_EQ(failureOf([&] {
                  renewBy(admin, {listed(foreign, startOf("ux"))}, Renewal::Resume);
              }).status(),
              ctl::kHostReportedFailure);
}

TEST_F(RenewedOrders, AreNoneThatTheirOwnOperatorWasNotAllowedToGive) {
    const OperatorIdentity admin = root_.certified({"*"}, {"*"});
    const auto refusal = [&](const OperatorIdentity& by) {
        return std::string(failureOf([&] {
                               renewBy(admin, {listed(by, startOf("ux"))}, Renewal::RetryFailed);
                           }).what());
    };
    EXPECT_NE(refusal(root_.certified({"STOP"}, {"ux"})).find("not allowed"), std::string::npos);
    EXPECT_NE(refusal(root_.certified({"START"}, {"lz"})).find("not allowed"), std::string::npos);
    EXPECT_NE(refusal(root_.certified({"START"}, {"ux"}, "env=prod")).find("those hosts"),
              std::string::npos);
}

TEST_F(RenewedOrders, AreNoneThatMayStillRunIfARollOutGoesOn) {
    const OrderMaker maker(identity_, "r1", kNow, kHour);
    const ChosenHost host{newUser().publicKey(), "web", "here"};
    const std::string bytes = maker.orderFor(host, startOf("ux"), "env=test");
    const json open = {{"host", host.key},
                       {"order", fleet::readOrder(bytes).order.id},
                       {"signed", fleet::base64Of(bytes)}};
    expectRefused({open}, "good for long enough");
    EXPECT_EQ(renew({open}, Renewal::RetryFailed).size(), 1U);
}

TEST_F(RenewedOrders, AreTheRolloutsWorkOnly) {
    expectRefused({listed(identity_, startOf("lz"))}, "another product");
    expectRefused({listed(identity_, {"STOP", {{"product", "ux"}}, ""})}, "another kind");
    expectRefused({listed(identity_, startOf("ux"), "*")}, "another selector");
    expectRefused({listed(identity_, startOf("ux")),
                   listed(identity_, {"START", {{"product", "ux"}, {"force", true}}, ""})},
                  "not the same work");
}

TEST_F(RenewedOrders, AreNoneThatWereMadeForAnotherRollout) {
    expectRefused({listed(identity_, startOf("ux"), "env=test", "r0")}, "not of this roll-out");
}

TEST_F(RenewedOrders, AreForTheHostsThatTheListNames) {
    json moved = listed(identity_, startOf("ux"));
    moved["host"] = newUser().publicKey();
    expectRefused({moved}, "another host");
    json swapped = listed(identity_, startOf("ux"));
    swapped["order"] = fleet::makeOrderId();
    expectRefused({swapped}, "another order");
    const json twice = listed(identity_, startOf("ux"));
    expectRefused({twice, twice}, "another one for the same host");
}

TEST_F(RenewedOrders, AreNoneWhenAnyByteWasChanged) {
    json changed = listed(identity_, startOf("ux"));
    std::string bytes = fleet::bytesOfBase64(changed["signed"].get<std::string>());
    bytes[80] = static_cast<char>(bytes[80] ^ 1);
    changed["signed"] = fleet::base64Of(bytes);
    expectRefused({changed}, "not signed anew");
    for (const json& odd : {json(1), json::object(), json{{"signed", 1}}, json{{"signed", "!"}}})
        expectRefused({odd}, "not signed anew");
}

TEST_F(RenewedOrders, AreNoneThatTheCertificateDoesNotAllow) {
    const OperatorIdentity starter = root_.certified({"START"}, {"ux"});
    const json own = listed(starter, startOf("ux"));
    EXPECT_EQ(renewBy(starter, {own}, Renewal::Resume).size(), 1U);
    EXPECT_EQ(failureOf([&] { renewBy(starter, {own}, Renewal::Abort); }).status(),
              ctl::kHostReportedFailure);
}

}  // namespace
