/// Makes orders and signs them: on the operator's machine, and nowhere else.
#pragma once

#include <chrono>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "ctl/client/tasks/task_request.h"
#include "fleet/bus/messages/order.h"
#include "fleet/operator/identity/operator_identity.h"
#include "fleet/operator/orders/chosen_hosts.h"
#include "fleet/operator/orders/order_chain.h"

namespace fleet {

/// What each of many hosts is to do.
struct Work {
    std::string kind;     ///< the command
    nlohmann::json body;  ///< the other members of the task, as everybody on the way may read them
    std::string
        hidden;  ///< JSON with the members that only the host may read; "" if there are none
    std::vector<OrderFile> files = {};  ///< that are to lie in the depot

    std::string product() const;
};

/// The work that a task of one host is for many. A configuration is hidden, and every other text in
/// which something looks like a password.
Work workOf(const ctl::TaskRequest& request);

/// No order is longer: it has to fit into one request to the centre.
constexpr std::size_t kMostOrderBytes = 700'000;

class OrderMaker {
public:
    /// The orders are those of one roll-out, are issued now and end so much later. Borrows the
    /// identity. Throws ctl::Failure if the certificate has ended, or `lasting` is above
    /// kLongestOrder or not above 0.
    OrderMaker(const OperatorIdentity& identity, std::string rollout, Moment now, Moment lasting);

    /// Throws ctl::Failure if the certificate does not allow a command, for which no host would
    /// carry it out.
    void insistThatAllowed(const std::string& kind, const std::string& product) const;

    /// The signed order for one host. Throws ctl::Failure if it gets too long.
    std::string orderFor(const ChosenHost& host, const Work& work,
                         const std::string& selector) const;

    /// Whether this operator has made the order, for this roll-out.
    bool isOwn(const Order& order) const;

    /// Whether an order ends so soon that it may be replaced before it has: within 10 minutes.
    bool isOverSoon(const Order& order) const { return order.expires <= now_ + kSoonOver; }

    /// A signed order that does the same as another one, with another identifier and other times.
    /// `tries` is how many were signed for that host so far, whoever has signed them. Throws
    /// ctl::Failure for more than kMostTries.
    std::string again(const Order& order, std::size_t tries) const;
    /// A signed order that cancels another one.
    std::string cancelOf(const Order& order) const;

private:
    /// Twice what the centre calls soon: clocks differ.
    static constexpr Moment kSoonOver = std::chrono::minutes(10);

    OrderChain chainOf(const std::string& host) const;
    std::string sign(Order order, Moment lasting) const;

    const OperatorIdentity& identity_;
    const Certificate grant_;
    const std::string rollout_;
    const Moment now_;
    const Moment lasting_;
};

}  // namespace fleet
