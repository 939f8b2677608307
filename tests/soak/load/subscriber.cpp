#include "soak/load/subscriber.h"

#include <cstdlib>
#include <stdexcept>

namespace soak {
namespace {

/// How long a row that the control subscription has got may take to another one.
constexpr double kLag = 4;
/// How long a head may take, and an outcome that one waits for.
constexpr double kPatience = 90;
/// How often one that waits looks whether there is anything to wait for.
constexpr double kLookSeconds = 1;
/// Rows that may come to the control subscription after another one of the same moment.
constexpr std::size_t kRowsAhead = 600;

/// The row as the ledger's; a fault when it belongs to no request.
Ledger::Row ledgerRow(World& world, const OutcomeRow& row) {
    const Ledger::Number number = world.ledger.find(row.transid);
    if (number == Ledger::kNone) world.tally.fault("a subscriber got a row of nobody's");
    return {number, row.retval, row.messageId};
}

}  // namespace

bool ControlSubscriber::begin() {
    const std::string after = position_.empty() ? "" : "&after=" + position_;
    connection_.send(getRequest("/v1/events?table=KAGDYST&tasks=1" + after));
    wakeIn(1e9);
    return connection_.flush();
}

bool ControlSubscriber::proceed(bool readable, bool) {
    if (!readable) return true;
    const bool open = connection_.fill();
    if (!live_) {
        const auto head = takeAnswer(connection_.in());
        if (head && head->status != 200) world_.tally.fault("no control subscription");
        live_ = head.has_value();
    }
    while (const auto message = live_ ? takeEvent(connection_.in()) : std::nullopt) {
        take(*message);
    }
    if (!open && !world_.hostIsDead) {
        world_.tally.fault("the host ended the control subscription");
    }
    return open;
}

void ControlSubscriber::take(const EventMessage& message) {
    world_.tally.count("events");
    if (message.gap) {
        world_.tally.fault("the control subscription lost " + std::to_string(message.lost) +
                           " rows although it always reads");
        return;
    }
    follow(message.id);
    if (message.end) {
        world_.ledger.ended(*message.end, world_.tally);
    } else {
        world_.ledger.outcome(message.row, world_.tally);
    }
}

/// It gets all events, so their numbers have no gaps, not even when the host has died.
void ControlSubscriber::follow(const std::string& id) {
    const std::size_t dash = id.find('-');
    const std::string journal = id.substr(0, dash);
    const auto number = [](const std::string& text, std::size_t at) {
        return std::strtoull(text.c_str() + at + 1, nullptr, 10);
    };
    const bool follows = dash != std::string::npos &&
                         (position_.empty() || (position_.rfind(journal + '-', 0) == 0 &&
                                                number(id, dash) == number(position_, dash) + 1));
    if (!follows) world_.tally.fault("event " + id + " came behind " + position_);
    position_ = id;
}

Subscriber::Subscriber(World& world, std::string kind, EventFilter filter, Manner manner,
                       std::function<void()> live)
    : Client(world, std::move(kind), world.home.socket()),
      manner_(manner),
      announceLive_(std::move(live)) {
    record_.filter = std::move(filter);
}

bool Subscriber::wantsToRead() const {
    return !live_ || world_.draining || now() >= sleepsUntil_;
}

bool Subscriber::begin() {
    world_.tally.count("subscriptions");
    record_.rowsBefore = world_.ledger.rows().size();
    connection_.send(
        getRequest("/v1/events?table=KAGDYST" + record_.filter.parameters(world_.ledger)));
    decidesAt_ = now() + kPatience;
    wakeIn(kPatience);
    return connection_.flush();
}

bool Subscriber::proceed(bool readable, bool) {
    const bool open = !readable || !wantsToRead() || connection_.fill();
    if (!live_) {
        if (!takeHead()) return false;
        if (!live_) {
            if (open && now() < decidesAt_) return true;
            if (open) world_.tally.fault("no head of a subscription");
            if (!open) world_.tally.count("turned away without an answer");
            return false;
        }
    }
    takeRows();
    if (!open) {
        if (world_.hostIsDead) return breakOff();
        world_.tally.fault("the host ended a subscription");
        return false;
    }
    const bool leavesNow = decided_ && now() >= leavesAt_;
    if (!decided_ && (now() >= decidesAt_ || served_ || world_.draining)) decideToGo();
    if (leavesNow) return leave();
    return !(decided_ && manner_.goesAtOnce) || leave();
}

bool Subscriber::takeHead() {
    const auto head = takeAnswer(connection_.in());
    if (!head) return true;
    if (head->status == 503) {
        world_.tally.count("503 answers");
        return false;
    }
    if (head->status != 200) {
        world_.tally.fault("a subscription was answered with status " +
                           std::to_string(head->status) + ": " + head->body);
        return false;
    }
    live_ = true;
    record_.live = world_.clock.wall();
    sleepsUntil_ = now() + manner_.sleepsBefore;
    decidesAt_ = now() + manner_.sleepsBefore + manner_.stays;
    wakeIn(manner_.sleepsBefore > 0 ? manner_.sleepsBefore : manner_.stays);
    if (announceLive_) announceLive_();
    return true;
}

void Subscriber::takeRows() {
    while (const auto message = takeEvent(connection_.in())) {
        if (message->gap) {
            world_.tally.count("gaps told");
            world_.tally.count("events told missing", message->lost);
            record_.items.push_back({Ledger::kNone, 0, message->lost});
            continue;
        }
        const Ledger::Row row = ledgerRow(world_, message->row);
        if (row.number == Ledger::kNone) continue;
        world_.tally.count("rows to subscribers");
        if (!record_.filter.matches(world_.ledger, row)) {
            world_.tally.fault("a row that does not match" +
                               record_.filter.parameters(world_.ledger) + ": " +
                               message->row.transid);
        }
        record_.items.push_back({row.number, row.retval, 0});
        served_ = served_ || manner_.awaitsItsOwn;
    }
    if (manner_.awaitsItsOwn) lookForAnswer();
    if (now() < decidesAt_ && !decided_) {
        wakeIn(manner_.awaitsItsOwn ? kLookSeconds : decidesAt_ - now());
    }
}

/// A command that was not accepted has no outcome to wait for.
void Subscriber::lookForAnswer() {
    const Ledger::Answer answer = world_.ledger.entry(record_.filter.number).answer;
    served_ = served_ || answer == Ledger::Answer::Refused || answer == Ledger::Answer::Unknown;
}

void Subscriber::decideToGo() {
    decided_ = true;
    if (manner_.awaitsItsOwn && !served_ && !world_.draining) {
        world_.tally.fault("no outcome came to the subscription" +
                           record_.filter.parameters(world_.ledger));
    }
    record_.cutoff = manner_.goesAtOnce ? 0 : world_.ledger.rows().size();
    leavesAt_ = now() + (manner_.goesAtOnce ? 0 : kLag);
    wakeIn(leavesAt_ - now());
}

void Subscriber::hostDied() {
    if (live_) breakOff();
}

/// What has come must be right; nobody knows how much more would have come.
bool Subscriber::breakOff() {
    record_.cutoff = 0;
    return leave();
}

bool Subscriber::leave() {
    record_.rowsAfter = world_.ledger.rows().size() + kRowsAhead;
    world_.subscriptions.push_back(std::move(record_));
    return false;
}

}  // namespace soak
