#include "fleet/server/core/centre.h"

#include <algorithm>
#include <cstddef>
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

/// What goes to the bus together. Their bytes are in memory at the same time, and on a slow way the
/// renewal of the lease waits behind them.
constexpr std::size_t kMostTogether = 64;
constexpr std::size_t kMostBytesTogether = std::size_t{4} << 20;

/// The first of a set, as many as are to be done at once.
std::vector<OrderPlace> firstOf(const std::set<OrderPlace>& places, std::size_t most) {
    std::vector<OrderPlace> first;
    for (const OrderPlace& place : places) {
        if (first.size() == most) break;
        first.push_back(place);
    }
    return first;
}

/// Calls `act` with a few at a time, until it returns false. Returns whether it never did.
template <typename One, typename Act>
bool eachFew(const std::vector<One>& all, Act act) {
    for (std::size_t from = 0; from < all.size(); from += kMostTogether) {
        const auto begin = all.begin() + static_cast<std::ptrdiff_t>(from);
        const std::size_t count = std::min(kMostTogether, all.size() - from);
        if (!act(std::vector<One>(begin, begin + static_cast<std::ptrdiff_t>(count)))) return false;
    }
    return true;
}

}  // namespace

Centre::Centre(CentreStore& store, CentreBus& bus, TellAlarm alarm, CentreCounts* counts)
    : store_(store), bus_(bus), alarm_(std::move(alarm)), counts_(counts) {}

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
    const std::vector<OrderRecord> orders = store_.unpublished(most, withoutRoom_);
    const Published published = publishAll(orders);
    // What the bus has no room for is offered again when all others have had their turn; and while
    // there is any, only so many at each look.
    if (published == Published::Unanswered || orders.size() < most) withoutRoom_ = 0;
    return published == Published::All && orders.size() == most;
}

bool Centre::publishAgain(std::size_t most) {
    return eachFew(firstOf(again_, most),
                   [this](const std::vector<OrderPlace>& places) {
                       std::vector<OrderRecord> orders;
                       for (const OrderPlace& place : places) {
                           const auto order = store_.orderAt(place.host, place.number);
                           if (order && !order->outcome) orders.push_back(*order);
                       }
                       // One without room comes again with its host's next hello.
                       if (publishAll(orders) == Published::Unanswered) return false;
                       for (const OrderPlace& place : places)
                           again_.erase(place);
                       return true;
                   }) &&
           !again_.empty();
}

bool Centre::removeOver(std::size_t most) {
    return eachFew(
               firstOf(over_, most),
               [this](const std::vector<OrderPlace>& places) { return removeTogether(places); }) &&
           !over_.empty();
}

bool Centre::removeTogether(const std::vector<OrderPlace>& places) {
    // A sequence that was remembered may be another host's message after the bus has lost some.
    const std::vector<FetchAnswer> answers = bus_.fetch(places);
    std::vector<std::uint64_t> sequences;
    std::vector<OrderPlace> gone;
    for (std::size_t i = 0; i < places.size(); ++i) {
        if (std::holds_alternative<Unanswered>(answers[i])) continue;
        if (const auto* stored = std::get_if<StoredOrder>(&answers[i])) {
            sequences.push_back(stored->sequence);
        }
        gone.push_back(places[i]);
    }
    if (!sequences.empty()) bus_.erase(sequences);
    for (const OrderPlace& place : gone)
        over_.erase(place);
    return gone.size() == places.size();
}

/// A server that does not answer will not answer those behind either; one that has no room for an
/// order may have it for a shorter one.
Centre::Published Centre::publishAll(const std::vector<OrderRecord>& orders) {
    std::vector<OrderRecord> few;
    std::size_t bytes = 0;
    Published all = Published::All;
    for (const OrderRecord& order : orders) {
        const bool isFull =
            few.size() == kMostTogether || bytes + order.bytes.size() > kMostBytesTogether;
        if (isFull && !few.empty()) {
            const Published published = publishTogether(few);
            if (published == Published::Unanswered) return published;
            if (published == Published::Some) all = published;
            few.clear();
            bytes = 0;
        }
        few.push_back(order);
        bytes += order.bytes.size();
    }
    const Published last = publishTogether(few);
    return last == Published::All ? all : last;
}

Centre::Published Centre::publishTogether(const std::vector<OrderRecord>& orders) {
    std::vector<PlacedOrder> placed;
    for (const OrderRecord& order : orders)
        placed.push_back({{order.host, order.number}, order.bytes});
    const std::vector<StoreAnswer> answers =
        placed.empty() ? std::vector<StoreAnswer>() : bus_.store(placed);
    std::vector<OrderRecord> occupied;
    bool isAnswered = true;
    bool isRoom = true;
    for (std::size_t i = 0; i < orders.size(); ++i) {
        if (std::holds_alternative<Stored>(answers[i])) {
            if (counts_ != nullptr) counts_->published.add();
            notePublished(orders[i]);
        } else if (std::holds_alternative<Occupied>(answers[i])) {
            occupied.push_back(orders[i]);
        } else {
            if (counts_ != nullptr) counts_->unanswered.add();
            const bool isFull = std::holds_alternative<NoRoom>(answers[i]);
            (isFull ? isRoom : isAnswered) = false;
            if (isFull && !orders[i].isPublished) ++withoutRoom_;
        }
    }
    if (!comparePublished(occupied) || !isAnswered) return Published::Unanswered;
    return isRoom ? Published::All : Published::Some;
}

/// Where a message stood already: the same one is as good as published.
bool Centre::comparePublished(const std::vector<OrderRecord>& orders) {
    if (orders.empty()) return true;
    std::vector<OrderPlace> places;
    for (const OrderRecord& order : orders)
        places.push_back({order.host, order.number});
    const std::vector<FetchAnswer> answers = bus_.fetch(places);
    bool isDone = true;
    for (std::size_t i = 0; i < orders.size(); ++i) {
        const OrderRecord& order = orders[i];
        const auto* stored = std::get_if<StoredOrder>(&answers[i]);
        if (stored == nullptr) {
            isDone = false;
        } else if (stored->bytes == order.bytes) {
            if (counts_ != nullptr) counts_->foundThere.add();
            notePublished(order);
        } else {
            HostRecord record = store_.host(order.host).value();
            stopPublishing(record,
                           "the bus has another message in the place of order " + order.order);
            store_.keepHost(record);
        }
    }
    return isDone;
}

void Centre::notePublished(const OrderRecord& order) {
    if (!order.isPublished) store_.notePublished(order.host, order.number);
}

std::optional<Reply> Centre::greet(const std::string& host, const Hello& hello, Moment now) {
    std::optional<HostRecord> record = store_.host(host);
    if (!record) return std::nullopt;
    // A hello of an earlier session, repeated or late, would look like a second machine.
    if (hello.time < record->toldTime) return std::nullopt;
    // The same one again would let a bus tell for ever that the host is there.
    std::string& nonce = nonces_[host];
    if (hello.time == record->toldTime && hello.nonce == nonce) return std::nullopt;
    nonce = hello.nonce;
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
    for (const OpenOrder& order : store_.open(host, 0, hello.taken, kMostOpen)) {
        reply.open.push_back(order.order);
    }
    for (const OpenOrder& order : store_.open(host, hello.taken + 1, record->last, kMostOpen)) {
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
    const std::vector<OpenOrder> first = store_.open(record.host, 1, record.last, 1);
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
    if (counts_ != nullptr) counts_->noteOutcome(*order, outcome.state);
    if (order->number != 0) over_.insert({outcome.host, order->number});
}

void Centre::foundOnBus(const OrderRecord& order, Moment now) {
    std::optional<HostRecord> record = store_.host(order.host);
    if (!record) return;
    if (now < store_.listUntil() || store_.order(order.host, order.order)) {
        return adoptFromBus(order);
    }
    if (!record->unpublished.empty()) return;
    stopPublishing(*record, "the bus has order " + order.order +
                                ", which this database never gave: one of them is wrong");
    store_.keepHost(*record);
}

void Centre::adoptFromBus(const OrderRecord& order) {
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
