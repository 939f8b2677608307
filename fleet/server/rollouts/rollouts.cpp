#include "fleet/server/rollouts/rollouts.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "fleet/bus/messages/order.h"
#include "fleet/server/rollouts/end_states.h"
#include "fleet/server/rollouts/learn_outcomes.h"
#include "fleet/server/rollouts/rollout_error.h"
#include "fleet/server/rollouts/share.h"
#include "fleet/server/rollouts/waves.h"

namespace fleet {
namespace {

constexpr std::size_t kLearntInOneTick = 1'000;
constexpr std::size_t kLongestOperatorName = 200;
constexpr std::size_t kAll = std::numeric_limits<std::int64_t>::max();

void insistOnState(bool holds, const std::string& otherwise) {
    if (!holds) throw RolloutError(RolloutError::Kind::Conflict, otherwise);
}

void checkOperator(const RolloutOperator& by) {
    insistThat(!by.name.empty() && by.name.size() <= kLongestOperatorName,
               "the operator has no name");
    insistThat(!by.key.empty(), "the operator has no key");
}

void checkTimes(const RolloutPlan& plan) {
    insistThat(plan.pause >= Moment{} && plan.pause <= kLongestOrder,
               "the pause between two waves must be from 0 to 7 days");
    insistThat(!plan.wait || (*plan.wait > Moment{} && *plan.wait <= kLongestOrder),
               "the time that a wave may take must be above 0 and at most 7 days");
    insistThat(!plan.parallel || *plan.parallel > 0,
               "at least one order must be allowed at the same time");
}

/// What the roll-out does is what its first order does; the others must do the same.
Rollout draftOf(const NewRollout& wanted, const IncomingOrder& first, std::size_t hosts,
                Moment now) {
    Rollout rollout;
    rollout.id = wanted.id.empty() ? makeOrderId() : wanted.id;
    rollout.by = wanted.by;
    rollout.kind = first.kind;
    rollout.product = first.product;
    rollout.selector = first.selector;
    rollout.created = rollout.since = now;
    rollout.plan = wanted.plan;
    rollout.hosts = hosts;
    rollout.mostFailures = Share(wanted.plan.maxFailures).atMost(hosts);
    return rollout;
}

Part partOf(const Rollout& rollout, std::size_t place, std::size_t wave,
            const IncomingOrder& order) {
    Part part;
    part.rollout = rollout.row;
    part.place = place;
    part.host = order.host;
    part.wave = wave;
    part.order = order.order;
    part.expires = order.expires;
    return part;
}

std::vector<HostToSign> hostsToSign(const std::vector<Part>& parts) {
    std::vector<HostToSign> hosts;
    hosts.reserve(parts.size());
    for (const Part& part : parts)
        hosts.push_back({part.host, part.order, part.end, part.tries});
    return hosts;
}

}  // namespace

Rollout Rollouts::find(const std::string& id) const {
    const std::optional<Rollout> found = store_.rollout(id);
    if (!found) throw RolloutError(RolloutError::Kind::NotFound, "there is no such roll-out");
    return *found;
}

std::string Rollouts::create(const NewRollout& wanted, Moment now) {
    insistThat(wanted.id.empty() || isOrderId(wanted.id),
               "a roll-out's identifier is 32 hexadecimal digits in lower case");
    checkOperator(wanted.by);
    const std::vector<IncomingOrder>& orders = wanted.orders;
    insistThat(!orders.empty(), "there is no order, so no host");
    checkTimes(wanted.plan);
    insistThat(orders.front().kind != kCancel, "a roll-out cannot cancel orders; abort does that");
    Rollout rollout = draftOf(wanted, orders.front(), orders.size(), now);
    const std::vector<std::size_t> waves = wavesOf(wanted.plan.waves, orders.size());
    rollout.waves = waves.size();
    store_.atomically([&] {
        insistOnState(!store_.rollout(rollout.id),
                      "there is a roll-out with this identifier already");
        store_.add(rollout);
        addParts(rollout, waves, orders);
    });
    return rollout.id;
}

void Rollouts::addParts(const Rollout& rollout, const std::vector<std::size_t>& waves,
                        const std::vector<IncomingOrder>& orders) {
    std::size_t wave = 1;
    for (std::size_t place = 0; place < orders.size(); ++place) {
        if (place == waves.at(wave - 1)) ++wave;
        const IncomingOrder& order = orders[place];
        insistOnSameWork(order, rollout);
        insistThat(store_.hasHost(order.host), "there is no host " + order.host);
        insistOnNewOrder(order);
        store_.addPart(partOf(rollout, place, wave, order), order.bytes);
    }
}

/// An order runs once. A second part with the same one would wait for an outcome that belongs to
/// the first.
void Rollouts::insistOnNewOrder(const IncomingOrder& order) const {
    insistThat(!store_.hasOrder(order.host, order.order),
               "the order for host " + order.host + " was handed over before");
}

void Rollouts::pause(const std::string& id, const RolloutOperator& by, Moment now) {
    checkOperator(by);
    store_.atomically([&] {
        Rollout rollout = find(id);
        insistOnState(rollout.state == RolloutState::Running,
                      std::string("the roll-out is ") + nameOf(rollout.state) + ", not running");
        enterState(rollout, RolloutState::Paused, now, PauseCause::Operator,
                   "paused by " + by.name);
        store_.keep(rollout);
    });
}

bool Rollouts::isOfRevoked(const Rollout& rollout) const {
    return std::find(revoked_.begin(), revoked_.end(), rollout.by.key) != revoked_.end();
}

/// Hosts refuse what still waits. That somebody else signs it anew would be no help: no client
/// takes the centre's word for it that orders which have not expired will not run.
void Rollouts::insistOnLivingKey(const Rollout& rollout) const {
    insistOnState(!isOfRevoked(rollout),
                  "the key of " + rollout.by.name +
                      ", who made the roll-out, was revoked; abort it, and begin another one");
}

void Rollouts::pauseThoseOf(std::vector<std::string> revoked, Moment now) {
    revoked_ = std::move(revoked);
    if (revoked_.empty()) return;
    for (Rollout& rollout : store_.running()) {
        if (!isOfRevoked(rollout)) continue;
        store_.atomically([&] {
            enterState(rollout, RolloutState::Paused, now, PauseCause::Operator,
                       "the key of " + rollout.by.name + " was revoked");
            store_.keep(rollout);
        });
    }
}

void Rollouts::resume(const std::string& id, const RolloutOperator& by,
                      const std::vector<IncomingOrder>& orders, Moment now) {
    checkOperator(by);
    learnAllOutcomes(store_);
    store_.atomically([&] {
        Rollout rollout = find(id);
        insistOnState(rollout.state == RolloutState::Paused,
                      std::string("the roll-out is ") + nameOf(rollout.state) + ", not paused");
        insistOnLivingKey(rollout);
        for (const IncomingOrder& order : orders) {
            const Part part = partFor(rollout, order);
            insistThat(part.state == PartState::Waiting,
                       "host " + order.host + " does not wait for its order any more");
            insistOnSameWork(order, rollout);
            replaceOrder(part, order);
        }
        insistThatNoneExpired(rollout, now);
        if (rollout.cause == PauseCause::Failures) store_.forgiveFailures(rollout.row);
        enterState(rollout, RolloutState::Running, now);
        // What a wave may take does not pass while nothing is released.
        rollout.began = now;
        store_.keep(rollout);
    });
}

void Rollouts::insistThatNoneExpired(const Rollout& rollout, Moment now) const {
    const std::vector<Part> expired = store_.expiringBy(rollout.row, now, 1);
    if (expired.empty()) return;
    insistOnState(false, "the orders of " + std::to_string(store_.countExpired(rollout.row, now)) +
                             " hosts have expired and must be signed anew, that of host " +
                             expired.front().host + " among them");
}

Part Rollouts::partFor(const Rollout& rollout, const IncomingOrder& order) const {
    std::optional<Part> part = store_.part(rollout.row, order.host);
    insistThat(part.has_value(), "host " + order.host + " has no part in the roll-out");
    return std::move(*part);
}

/// The part waits for its new order's release.
void Rollouts::replaceOrder(Part part, const IncomingOrder& order) {
    insistOnNewOrder(order);
    part.order = order.order;
    ++part.tries;
    part.expires = order.expires;
    part.state = PartState::Waiting;
    part.number = 0;
    part.end.clear();
    part.reason.clear();
    part.failure = FailureState::None;
    part.cancel.clear();
    store_.keepPart(part);
    store_.keepBytes(part, order.bytes);
    store_.forgetTold(part);
}

void Rollouts::abort(const std::string& id, const RolloutOperator& by,
                     const std::vector<IncomingOrder>& cancels, Moment now) {
    checkOperator(by);
    learnAllOutcomes(store_);
    store_.atomically([&] {
        Rollout rollout = find(id);
        if (rollout.state == RolloutState::Aborted) {
            insistOnState(!cancels.empty(), "the roll-out has been aborted already");
        } else {
            endAsAborted(rollout, by, now);
        }
        for (const IncomingOrder& cancel : cancels)
            keepCancel(rollout, cancel);
    });
}

void Rollouts::endAsAborted(Rollout& rollout, const RolloutOperator& by, Moment now) {
    insistOnState(rollout.state != RolloutState::Finished || store_.hasReleased(rollout.row),
                  "the roll-out has finished, and no host has its order any more");
    store_.cancelWaiting(rollout.row, "the roll-out was aborted before its turn came");
    enterState(rollout, RolloutState::Aborted, now, PauseCause::None, "aborted by " + by.name);
    store_.keep(rollout);
}

/// A host may have told the end of its order while the operator signed: then nothing is to be
/// cancelled.
void Rollouts::keepCancel(const Rollout& rollout, const IncomingOrder& order) {
    Part part = partFor(rollout, order);
    insistThat(order.kind == kCancel, "the order for host " + order.host + " cancels nothing");
    insistThat(order.cancels == part.order,
               "the order for host " + order.host + " cancels another one than the roll-out's");
    if (part.state != PartState::Released || part.cancel == order.order) return;
    insistOnNewOrder(order);
    part.cancel = order.order;
    store_.keepPart(part);
    store_.addCancel(part, order.bytes);
}

void Rollouts::retryFailed(const std::string& id, const RolloutOperator& by,
                           const std::vector<IncomingOrder>& orders, bool isForced, Moment now) {
    checkOperator(by);
    insistThat(!orders.empty(), "there is no order, so nothing is tried again");
    learnAllOutcomes(store_);
    store_.atomically([&] {
        Rollout rollout = find(id);
        insistOnState(rollout.state != RolloutState::Aborted, "the roll-out has been aborted");
        insistOnLivingKey(rollout);
        for (const IncomingOrder& order : orders) {
            Part part = partFor(rollout, order);
            const bool isUnknown = part.state == PartState::Over && part.end == kUnknown;
            insistThat(!isUnknown || isForced, "nobody knows whether the order of host " +
                                                   order.host +
                                                   " ran; it is tried again only by force");
            insistThat(part.state == PartState::Over && mayTryAgain(part.end, isForced),
                       "host " + order.host + " has not failed");
            insistOnSameWork(order, rollout);
            part.wave = std::max(part.wave, rollout.wave);
            replaceOrder(part, order);
        }
        if (rollout.state == RolloutState::Finished) {
            enterState(rollout, RolloutState::Running, now);
            // The others that failed are no reason to hold these back: it went on in spite of them.
            store_.forgiveFailures(rollout.row);
        }
        rollout.began = now;
        rollout.waveEnd.reset();
        store_.keep(rollout);
    });
}

bool Rollouts::tick(Moment now) {
    // Failures must be known before more is released.
    if (learnOutcomes(store_, kLearntInOneTick)) return true;
    return pace_.step(now);
}

void Rollouts::restored(Moment now) {
    store_.atomically([&] {
        for (Rollout& rollout : store_.running()) {
            enterState(rollout, RolloutState::Paused, now, PauseCause::Restore,
                       "the database was put back from a backup");
            store_.keep(rollout);
        }
    });
}

std::vector<HostToSign> Rollouts::toSignAnew(const std::string& id, Moment now) const {
    return hostsToSign(store_.expiringBy(find(id).row, now + kSoon, kAll));
}

std::vector<HostToSign> Rollouts::toCancel(const std::string& id) const {
    return hostsToSign(store_.uncancelled(find(id).row, kAll));
}

std::vector<HostToSign> Rollouts::toTryAgain(const std::string& id, bool isForced) const {
    std::vector<Part> parts = store_.over(find(id).row);
    const auto isLeftOut = [&](const Part& part) { return !mayTryAgain(part.end, isForced); };
    parts.erase(std::remove_if(parts.begin(), parts.end(), isLeftOut), parts.end());
    return hostsToSign(parts);
}

RolloutView Rollouts::show(const std::string& id, Moment now) const {
    return viewOf(store_, find(id), now);
}

std::vector<RolloutView> Rollouts::list(const std::string& before, std::size_t most,
                                        Moment now) const {
    const std::int64_t row =
        before.empty() ? std::numeric_limits<std::int64_t>::max() : find(before).row;
    std::vector<RolloutView> views;
    for (const Rollout& rollout : store_.rollouts(row, most))
        views.push_back(viewOf(store_, rollout, now));
    return views;
}

std::vector<PartView> Rollouts::parts(const std::string& id, std::size_t from, std::size_t most,
                                      Moment now) const {
    std::vector<PartView> views;
    for (const PartSight& sight : store_.parts(find(id).row, from, most))
        views.push_back(viewOf(sight, now));
    return views;
}

std::vector<Part> Rollouts::failures(const std::string& id, std::size_t most) const {
    return store_.failures(find(id).row, most);
}

}  // namespace fleet
