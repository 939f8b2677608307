#include "fleet/operator/orders/order_maker.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "ctl/client/failure.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/sealed.h"
#include "fleet/operator/centre/answers.h"
#include "secrets/masked.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr const char* kSetsConfiguration = "SETCONFIG";
/// The texts that people write into a task.
constexpr const char* kTexts[] = {"context", "optional"};
/// The order itself has these.
constexpr const char* kOwnOfOrders[] = {"command", "transid", "once"};

bool isSecret(const std::string& kind, const std::string& text) {
    return kind == kSetsConfiguration || secrets::masked(text) != text;
}

}  // namespace

std::string Work::product() const {
    return memberText(body, "product");
}

Work workOf(const ctl::TaskRequest& request) {
    Work work{request.command, request.document(), "", {}};
    for (const char* const member : kOwnOfOrders)
        work.body.erase(member);
    json hidden = json::object();
    for (const char* const member : kTexts) {
        const std::string text = memberText(work.body, member);
        if (text.empty() || !isSecret(work.kind, text)) continue;
        hidden[member] = text;
        work.body.erase(member);
    }
    if (!hidden.empty()) work.hidden = textOf(hidden);
    return work;
}

OrderMaker::OrderMaker(const OperatorIdentity& identity, std::string rollout, Moment now,
                       Moment lasting)
    : identity_(identity),
      grant_(identity.grant()),
      rollout_(std::move(rollout)),
      now_(now),
      lasting_(lasting) {
    if (grant_.until <= now) {
        throw ctl::Failure(ctl::kHostReportedFailure, "your certificate has ended",
                           "Ask for another invitation, and log in with that.");
    }
    if (lasting <= Moment{} || lasting > kLongestOrder) {
        throw ctl::Failure(ctl::kWrongUsage, "an order is good for at most 7 days");
    }
}

void OrderMaker::insistThatAllowed(const std::string& kind, const std::string& product) const {
    if (allows(grant_, kind, product)) return;
    throw ctl::Failure(ctl::kHostReportedFailure,
                       "your certificate does not allow " + kind +
                           (product.empty() ? std::string() : " for the product " + product),
                       "zavctl whoami with --fleet shows what it allows.");
}

OrderChain OrderMaker::chainOf(const std::string& host) const {
    return {identity_.key, rollout_, host};
}

bool OrderMaker::isOwn(const Order& order) const {
    return chainOf(order.host).numberOf(order.id).has_value();
}

std::string OrderMaker::sign(Order order, Moment lasting) const {
    order.fleet = identity_.fleet;
    order.issued = now_;
    order.expires = now_ + lasting;
    std::string bytes = signOrder(order, identity_.key, identity_.certificate);
    if (bytes.size() > kMostOrderBytes) {
        throw ctl::Failure(ctl::kWrongUsage,
                           "an order has at most " + std::to_string(kMostOrderBytes) +
                               " bytes, and this one would have " + std::to_string(bytes.size()));
    }
    return bytes;
}

std::string OrderMaker::orderFor(const ChosenHost& host, const Work& work,
                                 const std::string& selector) const {
    json body = work.body;
    if (!work.hidden.empty()) {
        // The order's own host is meant, whatever the centre says of its keys.
        body["sealed"] = base64Of(sealFor(host.key, work.hidden));
    }
    Order order;
    order.id = chainOf(host.key).identifier(0);
    order.host = host.key;
    order.selector = selector;
    order.kind = work.kind;
    order.body = textOf(body);
    order.files = work.files;
    return sign(std::move(order), lasting_);
}

std::string OrderMaker::again(const Order& order, std::size_t tries) const {
    const OrderChain chain = chainOf(order.host);
    const std::optional<std::size_t> known = chain.numberOf(order.id);
    // In the place of another operator's order comes one behind all that this one can have signed.
    const std::size_t next = known ? *known + 1 : tries;
    if (next >= kMostTries) {
        throw ctl::Failure(ctl::kHostReportedFailure,
                           "the roll-out has tried too often; begin another one");
    }
    Order another = order;
    another.id = chain.identifier(next);
    return sign(std::move(another), lasting_);
}

std::string OrderMaker::cancelOf(const Order& order) const {
    Order cancel;
    cancel.id = makeOrderId();
    cancel.host = order.host;
    cancel.selector = order.selector;
    cancel.kind = kCancel;
    cancel.body = textOf({{"order", order.id}});
    // A host that comes back late must not find the cancel out of date and the order not.
    const Moment left = order.expires - now_;
    return sign(std::move(cancel), std::min(kLongestOrder, std::max(lasting_, left)));
}

}  // namespace fleet
