#include "fleet/server/core/centre.h"

#include <algorithm>
#include <vector>

#include "fleet/server/core/outcome_rule.h"

namespace fleet {
namespace {

/// Whether a link's memory is older than what it has told before. One that knows no journal at all
/// may adopt the first one that it sees, but not another one than it has seen before.
///
/// While a database that was put back learns what it has forgotten, no memory counts as a lost one.
bool hasForgotten(const HostRecord& record, const Hello& hello, bool isListing) {
    if (hello.taken < record.told) return true;
    if (!hello.journal.empty() || hello.journalNow.empty()) return false;
    return isListing || (!record.journal.empty() && hello.journalNow != record.journal);
}

/// The first of a set, as many as are to be done at once.
template <typename Place>
std::vector<Place> firstOf(const std::set<Place>& places, std::size_t most) {
    std::vector<Place> first;
    for (const Place& place : places) {
        if (first.size() == most) break;
        first.push_back(place);
    }
    return first;
}

}  // namespace

Centre::Centre(CentreStore& store, CentreBus& bus, TellAlarm alarm)
    : store_(store), bus_(bus), alarm_(std::move(alarm)) {}

std::optional<Number> Centre::submit(const std::string& host, const std::string& order,
                                     const std::function<std::string(Number)>& seal) {
    return store_.give(host, order, seal);
}

bool Centre::work(std::size_t most) {
    bool isMore = false;
    if (!isBehind()) {
        isMore = publish(most);
        isMore = publishAgain(most) || isMore;
    }
    return removeOver(most) || isMore;
}

bool Centre::publish(std::size_t most) {
    const std::vector<OrderRecord> orders = store_.unpublished(most);
    for (const OrderRecord& order : orders) {
        // A server that does not answer will not answer the next one either.
        if (!publishOne(order)) return false;
    }
    return orders.size() == most;
}

bool Centre::publishAgain(std::size_t most) {
    for (const Place& place : firstOf(again_, most)) {
        const std::optional<OrderRecord> order = store_.orderAt(place.first, place.second);
        if (order && !order->outcome && !publishOne(*order)) return false;
        again_.erase(place);
    }
    return !again_.empty();
}

bool Centre::removeOver(std::size_t most) {
    for (const Place& place : firstOf(over_, most)) {
        // A sequence that was remembered may be another host's message after the bus has lost some.
        const FetchAnswer there = bus_.fetch(place.first, place.second);
        if (std::holds_alternative<Unanswered>(there)) return false;
        if (const auto* stored = std::get_if<StoredOrder>(&there)) bus_.erase(stored->sequence);
        over_.erase(place);
    }
    return !over_.empty();
}

/// Whether the bus has the order now, or never will.
bool Centre::publishOne(const OrderRecord& order) {
    const StoreAnswer answer = bus_.store(order.host, order.number, order.bytes);
    if (std::holds_alternative<Unanswered>(answer)) return false;
    if (std::holds_alternative<Occupied>(answer)) {
        const FetchAnswer there = bus_.fetch(order.host, order.number);
        const auto* stored = std::get_if<StoredOrder>(&there);
        if (stored == nullptr) return false;
        if (stored->bytes != order.bytes) {
            HostRecord record = store_.host(order.host).value();
            stopPublishing(record,
                           "the bus has another message in the place of order " + order.order);
            store_.keepHost(record);
            return true;
        }
    }
    if (!order.isPublished) store_.notePublished(order.host, order.number);
    return true;
}

std::optional<Reply> Centre::greet(const std::string& host, const Hello& hello, Moment now) {
    std::optional<HostRecord> record = store_.host(host);
    if (!record) return std::nullopt;
    // A hello of an earlier session, repeated or late, would look like a second machine.
    if (hello.time < record->toldTime) return std::nullopt;
    record->toldTime = hello.time;
    const bool isListing = now < store_.listUntil();
    if (hello.have && isListing) adoptListed(host, hello);
    Reply reply;
    reply.forget = hasForgotten(*record, hello, isListing);
    noteSession(*record, hello);
    noteTaken(*record, hello, isListing);
    if (!hello.journal.empty()) {
        record->journal = hello.journal;
    } else if (record->journal.empty()) {
        record->journal = hello.journalNow;
    }
    record->heard = now;
    store_.keepHost(*record);

    reply.nonce = hello.nonce;
    reply.time = now;
    reply.last = record->last;
    reply.over = overOf(*record);
    reply.list = isListing;
    reply.stop = record->stopped;
    for (const OrderRecord& order : store_.open(host, 0, hello.taken, kMostOpen)) {
        reply.open.push_back(order.order);
    }
    for (const OrderRecord& order : store_.open(host, hello.taken + 1, record->last, kMostOpen)) {
        if (order.isPublished && record->unpublished.empty()) again_.insert({host, order.number});
    }
    return reply;
}

/// Two links with the same keys: a machine was copied.
void Centre::noteSession(HostRecord& record, const Hello& hello) {
    if (!record.stopped.empty()) return;
    if (record.machine.empty()) record.machine = hello.machine;
    if (hello.machine != record.machine) {
        record.stopped = "this is not the machine that was enrolled";
    } else if (hello.session == record.earlierSession) {
        record.stopped = "two machines claim to be this host";
    }
    if (!record.stopped.empty()) alarm_({record.host, record.stopped});
    if (hello.session == record.session) return;
    record.earlierSession = record.session;
    record.session = hello.session;
}

void Centre::noteTaken(HostRecord& record, const Hello& hello, bool isListing) {
    if (hello.taken > record.last && isListing) {
        record.last = std::min(hello.taken + kRestoreGap, kHighestNumber);
    } else if (hello.taken > record.last) {
        if (record.unpublished.empty()) {
            stopPublishing(
                record,
                "it has taken an order that this database never gave: one of them is wrong");
        }
        ahead_.insert(record.host);
        return;
    }
    record.told = std::max(record.told, hello.taken);
}

void Centre::stopPublishing(HostRecord& record, const std::string& why) {
    record.unpublished = why;
    alarm_({record.host, "nothing is published for this host any more: " + why});
}

/// All orders below the first open one are over. Numbers that a restore skipped were never given.
Number Centre::overOf(const HostRecord& record) const {
    const std::vector<OrderRecord> first = store_.open(record.host, 1, record.last, 1);
    return first.empty() ? record.last : first.front().number - 1;
}

void Centre::adoptListed(const std::string& host, const Hello& hello) {
    for (const HeldOrder& held : *hello.have) {
        if (store_.order(host, held.order)) continue;
        OrderRecord order;
        order.host = host;
        order.order = held.order;
        order.isPublished = true;
        store_.adopt(order);
    }
}

void Centre::hear(const Outcome& outcome) {
    const std::optional<OrderRecord> order = store_.order(outcome.host, outcome.order);
    if (!order) return;
    switch (judgeOutcome(order->outcome, outcome)) {
        case OutcomeVerdict::Ignore:
            return;
        case OutcomeVerdict::Conflict:
            alarm_({outcome.host, "the host tells two outcomes of order " + outcome.order});
            return;
        case OutcomeVerdict::Keep:
            break;
    }
    store_.keepOutcome(outcome);
    if (order->number != 0) over_.insert({outcome.host, order->number});
}

void Centre::foundOnBus(const OrderRecord& order) {
    std::optional<HostRecord> record = store_.host(order.host);
    if (!record) return;
    const std::optional<OrderRecord> known = store_.order(order.host, order.order);
    if (known && known->outcome) {
        over_.insert({order.host, order.number});
    } else if (!known || known->number == 0) {
        OrderRecord adopted = order;
        adopted.isPublished = true;
        store_.adopt(adopted);
    }
    if (order.number > record->last) {
        record->last = order.number;
        store_.keepHost(*record);
    }
}

void Centre::restored(Moment now) {
    // A backup may be put back twice, and what was given in between would be given again. So each
    // restore begins behind all that a million orders a second could have used since 1970.
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(now).count();
    const Number since1970 = static_cast<Number>(seconds) * kRestoreGap;
    store_.skipNumbers(kRestoreGap, std::min(since1970, kHighestNumber / 2), now + kListTime);
    ahead_.clear();
}

}  // namespace fleet
