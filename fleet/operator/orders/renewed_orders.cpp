#include "fleet/operator/orders/renewed_orders.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>

#include "ctl/client/failure.h"
#include "fleet/bus/messages/document.h"
#include "fleet/operator/centre/answers.h"

using nlohmann::json;

namespace fleet {
namespace {

bool isEverything(const std::vector<std::string>& patterns) {
    return std::find(patterns.begin(), patterns.end(), "*") != patterns.end();
}

/// Whether a holder of this certificate may put an order of their own in the place of another's.
bool mayTakeOver(const Certificate& grant) {
    return isEverything(grant.commands) && isEverything(grant.products) && grant.selector == "*";
}

void insistOn(bool holds, const std::string& otherwise) {
    if (!holds) throw MessageError(otherwise);
}

/// Whoever has made it: this operator for this roll-out, or another one of the fleet. That another
/// one's was for this roll-out, only the centre says.
void checkSigner(const SignedOrder& read, const OperatorIdentity& identity,
                 const OrderMaker& maker) {
    if (isSignedByOperator(read, identity.key.publicKey())) {
        return insistOn(maker.isOwn(read.order), "it is not of this roll-out");
    }
    insistOn(mayTakeOver(identity.grant()), "it is another operator's");
    const Certificate other = readCertificate(read.certificate, identity.root, identity.fleet);
    insistOn(other.holder == Certificate::Holder::Operator && isSignedByOperator(read, other.key),
             "no operator of the fleet has signed it");
    // Under this operator's certificate it would run where the other's did not let it.
    const Order& order = read.order;
    insistOn(allows(other, order.kind, memberText(readDocument(order.body), "product")),
             other.name + " was not allowed to give it");
    insistOn(other.selector == "*" || other.selector == order.selector,
             other.name + " was not allowed to give it to those hosts");
    insistOn(order.issued < other.until, other.name + " was no operator any more");
}

void checkWork(const Order& order, const json& listed, const json& rollout,
               const OperatorIdentity& identity) {
    insistOn(order.fleet == identity.fleet, "it is for another fleet");
    insistOn(order.host == memberText(listed, "host"), "it is for another host");
    insistOn(order.id == memberText(listed, "order"), "it is another order");
    insistOn(order.kind == memberText(rollout, "kind") && order.kind != kCancel,
             "it is of another kind than the roll-out");
    insistOn(order.selector == memberText(rollout, "selector"),
             "it has another selector than the roll-out");
    insistOn(memberText(readDocument(order.body), "product") == memberText(rollout, "product"),
             "it is for another product than the roll-out");
}

/// The order that a member of the list holds. Throws MessageError.
Order checkedOrder(const json& listed, const json& rollout, const OperatorIdentity& identity,
                   const OrderMaker& maker) {
    const std::string bytes = bytesOfBase64(textIn(listed, "signed"));
    const SignedOrder read = readOrder(bytes);
    checkSigner(read, identity, maker);
    checkWork(read.order, listed, rollout, identity);
    return read.order;
}

/// How many orders were signed for the host. An older centre does not say that.
std::size_t triesOf(const json& listed) {
    return listed.contains("tries") ? static_cast<std::size_t>(memberNumber(listed, "tries")) : 0;
}

/// What the orders have in common, and must: all but what is sealed for each host.
json openPartOf(const Order& order) {
    json body = readDocument(order.body);
    body.erase("sealed");
    json files = json::array();
    for (const OrderFile& file : order.files)
        files.push_back({file.path, file.sha256});
    return {{"body", body}, {"files", files}};
}

}  // namespace

const char* nameOf(Renewal renewal) {
    switch (renewal) {
        case Renewal::Resume:
            return "resume";
        case Renewal::Abort:
            return "abort";
        case Renewal::RetryFailed:
            return "retry-failed";
    }
    return "";
}

std::vector<std::string> renewedOrders(const json& toSign, const json& rollout, Renewal renewal,
                                       const OperatorIdentity& identity, const OrderMaker& maker) {
    const bool isAbort = renewal == Renewal::Abort;
    std::vector<std::string> orders;
    std::set<std::string> hosts;
    json common;
    for (const json& listed : memberList(toSign, "hosts")) {
        try {
            const Order order = checkedOrder(listed, rollout, identity, maker);
            const json open = openPartOf(order);
            if (common.is_null()) common = open;
            insistOn(open == common, "it is not the same work as the others");
            // A centre that lists others wants the work done twice.
            insistOn(renewal != Renewal::Resume || maker.isOverSoon(order),
                     "it is good for long enough");
            insistOn(hosts.insert(order.host).second, "there is another one for the same host");
            if (orders.empty()) {
                maker.insistThatAllowed(isAbort ? kCancel : order.kind,
                                        isAbort ? "" : memberText(open["body"], "product"));
            }
            orders.push_back(isAbort ? maker.cancelOf(order) : maker.again(order, triesOf(listed)));
        } catch (const MessageError& error) {
            throw ctl::Failure(
                ctl::kHostReportedFailure,
                "the centre lists an order that is not signed anew: " + std::string(error.what()));
        }
    }
    return orders;
}

}  // namespace fleet
