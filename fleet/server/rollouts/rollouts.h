/// What operators do with roll-outs.
///
/// Each function is one transaction. One that throws has changed nothing: RolloutError if what was
/// asked for cannot be done, and whatever the store throws.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "fleet/server/rollouts/incoming_orders.h"
#include "fleet/server/rollouts/rollout_pace.h"
#include "fleet/server/rollouts/rollout_view.h"

namespace fleet {

/// What an operator hands over for a new roll-out.
struct NewRollout {
    std::string id;  ///< 32 hexadecimal digits in lower case; "" has one made up
    RolloutOperator by;
    RolloutPlan plan;
    /// One for each host, in the order of the hosts in the waves.
    std::vector<IncomingOrder> orders;
};

/// A host for which an operator has to sign an order.
struct HostToSign {
    std::string host;
    std::string order;  ///< the one that is replaced or cancelled
    EndState end;       ///< how that ended, if it did
    std::size_t tries;  ///< as in Part
};

/// One thread at a time, and the same one that uses the centre's store. Orders that are handed over
/// here have been read for the operator who hands them over, see readIncomingOrders(): that needs
/// no store, and takes long for many hosts.
class Rollouts {
public:
    /// Orders that end so soon are signed anew together with those that have ended.
    static constexpr Moment kSoon{5 * 60 * 1000};

    /// Borrows the store.
    Rollouts(RolloutStore& store, GiveNumber give) : store_(store), pace_(store, std::move(give)) {}

    /// Returns the roll-out's identifier. Nothing is released yet.
    std::string create(const NewRollout& wanted, Moment now);

    /// Nothing more is released. What was released goes on.
    void pause(const std::string& id, const RolloutOperator& by, Moment now);

    /// These keys count no longer: what was made with them is paused, and does not go on. To be
    /// called before each tick(), with all of them.
    void pauseThoseOf(std::vector<std::string> revoked, Moment now);

    /// Goes on with a roll-out that is paused. `orders` replace those of hosts that still wait, and
    /// must do so for all that have expired: see toSignAnew(). Failures that have paused it are
    /// forgiven; it pauses again after as many others.
    void resume(const std::string& id, const RolloutOperator& by,
                const std::vector<IncomingOrder>& orders, Moment now);

    /// Releases nothing any more, and ends all parts that still wait. Hosts that have their orders
    /// need others that cancel them: see toCancel(). `cancels` are some of those; more may follow
    /// by calling it again. A roll-out that has finished can be aborted while hosts still have its
    /// orders.
    void abort(const std::string& id, const RolloutOperator& by,
               const std::vector<IncomingOrder>& cancels, Moment now);

    /// Gives other orders to hosts that failed, see toTryAgain(); some or all. They belong to the
    /// latest wave, which goes on with them. A finished roll-out runs again; a paused one stays so.
    void retryFailed(const std::string& id, const RolloutOperator& by,
                     const std::vector<IncomingOrder>& orders, bool isForced, Moment now);

    /// Learns what hosts have told, and releases what is due. To be called every second. Returns
    /// whether there is more to do at once.
    bool tick(Moment now);

    /// The end of a restore: the database may have forgotten that a roll-out was paused or aborted.
    /// So all that run are paused.
    void restored(Moment now);

    // What resume(), abort() and retryFailed() want orders for. It changes while hosts tell.
    std::vector<HostToSign> toSignAnew(const std::string& id, Moment now) const;
    std::vector<HostToSign> toCancel(const std::string& id) const;
    std::vector<HostToSign> toTryAgain(const std::string& id, bool isForced) const;

    RolloutView show(const std::string& id, Moment now) const;
    /// The newest ones first, from the one that was made before the roll-out `before` on; "" begins
    /// with the newest.
    std::vector<RolloutView> list(const std::string& before, std::size_t most, Moment now) const;
    /// Hosts in their order, from a place on, the first being 0.
    std::vector<PartView> parts(const std::string& id, std::size_t from, std::size_t most,
                                Moment now) const;
    /// Hosts that failed, those that count first.
    std::vector<Part> failures(const std::string& id, std::size_t most) const;

private:
    Rollout find(const std::string& id) const;
    bool isOfRevoked(const Rollout& rollout) const;
    void insistOnLivingKey(const Rollout& rollout) const;
    void addParts(const Rollout& rollout, const std::vector<std::size_t>& waves,
                  const std::vector<IncomingOrder>& orders);
    void insistOnNewOrder(const IncomingOrder& order) const;
    void replaceOrder(Part part, const IncomingOrder& order);
    Part partFor(const Rollout& rollout, const IncomingOrder& order) const;
    void insistThatNoneExpired(const Rollout& rollout, Moment now) const;
    void endAsAborted(Rollout& rollout, const RolloutOperator& by, Moment now);
    void keepCancel(const Rollout& rollout, const IncomingOrder& order);

    RolloutStore& store_;
    RolloutPace pace_;
    std::vector<std::string> revoked_;  ///< keys of operators
};

}  // namespace fleet
