#include "fleet/operator/verbs/rollout_renewal.h"

#include <chrono>
#include <nlohmann/json.hpp>
#include <set>
#include <utility>
#include <vector>

#include "ctl/client/failure.h"
#include "ctl/verbs/invocation.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/orders/order_batch.h"
#include "fleet/operator/rollouts/rollout_page.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"
#include "fleet/operator/verbs/rollout_argument.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kUnknownToo =
    ctl::flag("--force", "Try again also where nobody knows whether it ran: it may run twice");
constexpr ctl::Argument kRenewedRollout[] = {kRollout};
/// A bad centre could go on for ever.
constexpr std::size_t kMostToSign = 1'000'000;

constexpr ctl::Argument kRetriedRollout[] = {kRollout, kUnknownToo};

/// What the centre lists as to be signed, page by page. It changes while hosts tell how their
/// orders have ended, so a host may stand on two pages.
json listToSign(Centre& centre, const std::string& id, Renewal renewal, bool isForced) {
    json hosts = json::array();
    std::set<std::string> seen;
    std::size_t from = 0;
    std::uint64_t total = 0;
    do {
        const json page =
            centre.get(rolloutTarget(id) + "/to-sign?for=" + nameOf(renewal) +
                       (isForced ? "&force=1" : "") + "&from=" + std::to_string(from));
        const json& listed = memberList(page, "hosts");
        for (const json& host : listed) {
            if (seen.insert(memberText(host, "host")).second) hosts.push_back(host);
        }
        if (listed.empty()) break;
        from += listed.size();
        total = memberNumber(page, "total");
    } while (from < total && from < kMostToSign);
    return {{"hosts", hosts}};
}

/// The orders that the roll-out wants, signed.
std::vector<std::string> wantedOrders(Centre& centre, const std::string& id, Renewal renewal,
                                      bool isForced, const OperatorIdentity& identity,
                                      const OrderMaker& maker) {
    const json rollout = centre.get(rolloutTarget(id));
    return renewedOrders(listToSign(centre, id, renewal, isForced), rollout, renewal, identity,
                         maker);
}

json handOver(Centre& centre, const std::string& id, Renewal renewal, bool isForced,
              const std::vector<std::string>& orders) {
    json body = json::object();
    if (orders.empty())
        body["orders"] = json::array();
    else
        body["batch"] = sendOrders(centre, orders);
    if (isForced) body["force"] = true;
    return centre.post(rolloutTarget(id) + "/" + nameOf(renewal), body);
}

/// Cancels what hosts have not done yet. Who tells that an order has ended leaves the list, and
/// what stands behind it moves up while it is read; so it is read until it brings nothing new.
void cancelAll(Centre& centre, const std::string& id, const json& rollout,
               const OperatorIdentity& identity, const OrderMaker& maker, RenewalResult& result) {
    std::set<std::string> cancelled;  // a host that has refused to stands on the list again
    for (;;) {
        json fresh = json::array();
        const json listed = listToSign(centre, id, Renewal::Abort, false);
        for (const json& host : listed["hosts"]) {
            const std::string order = memberText(host, "host") + ' ' + memberText(host, "order");
            if (cancelled.size() < kMostToSign && cancelled.insert(order).second) {
                fresh.push_back(host);
            }
        }
        if (fresh.empty()) return;
        const std::vector<std::string> cancels =
            renewedOrders({{"hosts", fresh}}, rollout, Renewal::Abort, identity, maker);
        if (cancels.empty()) return;
        result.rollout = handOver(centre, id, Renewal::Abort, false, cancels);
        result.orders += cancels.size();
    }
}

/// One that was aborted already may still have hosts that were not told.
RenewalResult abortRollout(Centre& centre, const std::string& id, const OperatorIdentity& identity,
                           const OrderMaker& maker) {
    const json rollout = centre.get(rolloutTarget(id));
    RenewalResult result{rollout, 0, ""};
    if (memberText(rollout, "state") != "aborted") {
        result.rollout = handOver(centre, id, Renewal::Abort, false, {});
    }
    try {
        cancelAll(centre, id, rollout, identity, maker, result);
    } catch (const ctl::Failure& failure) {
        result.note = "nothing more is released, but hosts that have their orders keep them: " +
                      std::string(failure.what());
    }
    return result;
}

ctl::ExitStatus runRenewal(const ctl::Invocation& invocation, Renewal renewal, bool isForced) {
    OperatorSide side(invocation);
    const std::string id = rolloutIn(invocation.given);
    const OrderMaker maker(side.identity, id, wallClock(), timeOf(invocation.given, kExpires));
    const RenewalResult result =
        renewRollout(side.centre, id, renewal, isForced, side.identity, maker);
    return ctl::print(showRenewal(result, renewal, invocation.format));
}

ctl::ExitStatus runResume(const ctl::Invocation& invocation) {
    return runRenewal(invocation, Renewal::Resume, false);
}

ctl::ExitStatus runAbort(const ctl::Invocation& invocation) {
    return runRenewal(invocation, Renewal::Abort, false);
}

ctl::ExitStatus runRetryFailed(const ctl::Invocation& invocation) {
    return runRenewal(invocation, Renewal::RetryFailed, invocation.given.flag(kUnknownToo));
}

std::string signedText(std::size_t orders, Renewal renewal) {
    if (orders == 0) return {};
    const bool isOne = orders == 1;
    return std::to_string(orders) + (isOne ? " order was" : " orders were") + " signed" +
           (renewal == Renewal::Abort ? (isOne ? " that cancels another" : " that cancel others")
                                      : " anew") +
           ".\n";
}

}  // namespace

constexpr ctl::Verb kRolloutResumeVerb = {
    "rollout resume",
    "Let a roll-out go on that is paused; what has expired is signed anew",
    kRenewedRollout,
    {"zavctl --fleet https://centre.example rollout resume ID",
     "zavctl --fleet https://centre.example --expires 2h rollout resume ID"},
    runResume,
};

constexpr ctl::Verb kRolloutAbortVerb = {
    "rollout abort",
    "End a roll-out, and cancel what hosts have not done yet",
    kRenewedRollout,
    {"zavctl --fleet https://centre.example rollout abort ID",
     "zavctl --fleet https://centre.example --json rollout abort ID"},
    runAbort,
};

constexpr ctl::Verb kRolloutRetryFailedVerb = {
    "rollout retry-failed",
    "Try again on the hosts where it failed",
    kRetriedRollout,
    {"zavctl --fleet https://centre.example rollout retry-failed ID",
     "zavctl --fleet https://centre.example rollout retry-failed ID --force"},
    runRetryFailed,
};

RenewalResult renewRollout(Centre& centre, const std::string& id, Renewal renewal, bool isForced,
                           const OperatorIdentity& identity, const OrderMaker& maker) {
    if (renewal == Renewal::Abort) return abortRollout(centre, id, identity, maker);
    const std::vector<std::string> orders =
        wantedOrders(centre, id, renewal, isForced, identity, maker);
    if (renewal == Renewal::RetryFailed && orders.empty()) {
        throw ctl::Failure(ctl::kHostReportedFailure, "there is nothing to try again");
    }
    return {handOver(centre, id, renewal, isForced, orders), orders.size(), ""};
}

ctl::Page showRenewal(const RenewalResult& result, Renewal renewal, ctl::Format format) {
    ctl::Page page = showChanged(result.rollout, format);
    if (!result.note.empty()) {
        page.err = ctl::complaint(result.note);
        page.status = ctl::kHostReportedFailure;
    }
    if (format == ctl::Format::Text) page.out = signedText(result.orders, renewal) + page.out;
    return page;
}

}  // namespace fleet
