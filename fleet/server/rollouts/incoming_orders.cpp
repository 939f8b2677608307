#include "fleet/server/rollouts/incoming_orders.h"

#include <nlohmann/json.hpp>
#include <set>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/server/rollouts/rollout_error.h"

using nlohmann::json;

namespace fleet {
namespace {

/// The number that the centre puts around an order needs room, and a host's link could not read a
/// longer message: it would wait for ever for what has that number.
constexpr std::size_t kMostOrderBytes = kMostSignedBytes - 4'096;

/// A roll-out keeps these, and lists show them.
constexpr std::size_t kLongestName = 128;
constexpr std::size_t kLongestSelector = std::size_t{64} << 10;

std::string textOr(const json& body, const char* member) {
    return body.contains(member) ? textIn(body, member) : "";
}

IncomingOrder incomingOrderOf(const std::string& bytes, const RolloutOperator& by,
                              const std::string& fleet, Moment now) {
    insistThat(bytes.size() <= kMostOrderBytes, "it is too long");
    const SignedOrder read = readOrder(bytes);
    const Order& order = read.order;
    insistThat(isSignedByOperator(read, by.key), "the operator who asks has not signed it");
    insistThat(order.fleet == fleet, "it is for another fleet");
    insistThat(order.expires > now, "it has expired");
    insistThat(order.expires <= order.issued + kLongestOrder, "it is good for more than 7 days");
    const json body = readDocument(order.body);
    const std::string product = textOr(body, "product");
    insistThat(order.kind.size() <= kLongestName && product.size() <= kLongestName,
               "its kind or its product is too long");
    insistThat(order.selector.size() <= kLongestSelector, "its selector is too long");
    IncomingOrder incoming;
    incoming.host = order.host;
    incoming.order = order.id;
    incoming.bytes = bytes;
    incoming.kind = order.kind;
    incoming.product = product;
    incoming.selector = order.selector;
    if (order.kind == kCancel) incoming.cancels = textIn(body, "order");
    incoming.expires = order.expires;
    return incoming;
}

}  // namespace

std::vector<IncomingOrder> readIncomingOrders(const std::vector<std::string>& orders,
                                              const RolloutOperator& by, const std::string& fleet,
                                              Moment now) {
    insistThat(orders.size() <= kMostOrders, "there are more than 100,000 orders");
    std::vector<IncomingOrder> incoming;
    incoming.reserve(orders.size());
    std::set<std::string> hosts;
    const auto fail = [&](const char* what) {
        insistThat(false, "order " + std::to_string(incoming.size() + 1) + " of " +
                              std::to_string(orders.size()) + ": " + what);
    };
    for (const std::string& bytes : orders) {
        try {
            IncomingOrder read = incomingOrderOf(bytes, by, fleet, now);
            insistThat(hosts.insert(read.host).second, "there is another one for the same host");
            incoming.push_back(std::move(read));
        } catch (const MessageError& error) {
            fail(error.what());
        } catch (const RolloutError& error) {
            fail(error.what());
        }
    }
    return incoming;
}

void insistOnSameWork(const IncomingOrder& order, const Rollout& rollout) {
    const bool isSame = order.kind == rollout.kind && order.product == rollout.product &&
                        order.selector == rollout.selector;
    insistThat(isSame, "the order for host " + order.host +
                           " is of another kind, for another product or for another selector "
                           "than the roll-out's");
}

}  // namespace fleet
