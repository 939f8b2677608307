#include "soak/load/requester.h"

#include <algorithm>

namespace soak {
namespace {

/// The host has 32 workers and 128 places before them, and its children end after 2 s.
constexpr double kPatience = 60;

constexpr double kShortThought = 0.02;
constexpr double kLongThought = 2.5;

}  // namespace

Requester::Requester(World& world, std::string kind, NextExchanges next, std::size_t rounds)
    : Client(world, std::move(kind), world.home.socket()),
      next_(std::move(next)),
      rounds_(rounds) {}

bool Requester::begin() {
    return ask();
}

bool Requester::ask() {
    --rounds_;
    std::string bytes;
    for (Exchange& exchange : next_()) {
        if (exchange.sending) exchange.sending();
        bytes += exchange.request;
        world_.tally.count("requests");
        pending_.push_back(std::move(exchange));
    }
    connection_.send(std::move(bytes));
    askedAt_ = now();
    wakeIn(kPatience + 1);
    // The other side may refuse to read on; what it has said before that is read below.
    connection_.flush();
    return true;
}

bool Requester::proceed(bool readable, bool writable) {
    if (writable && !connection_.flush()) readable = true;
    if (readable) {
        const bool open = connection_.fill();
        if (!takeAnswers()) return false;
        if (!open) return cutOff(true);
        if (!pending_.empty()) return true;
    }
    if (pending_.empty()) return next();
    if (now() - askedAt_ > kPatience) {
        world_.tally.fault("no answer within " + std::to_string(kPatience) +
                           " s to: " + pending_.front().request);
        return cutOff(false);
    }
    return true;
}

bool Requester::takeAnswers() {
    while (const auto answer = takeAnswer(connection_.in())) {
        if (pending_.empty()) {
            // Whom the host has no place for is told so without having asked.
            if (answer->status != 503) {
                world_.tally.fault("an answer that nobody asked for, status " +
                                   std::to_string(answer->status));
            }
            return false;
        }
        const Exchange exchange = std::move(pending_.front());
        pending_.pop_front();
        if (answer->status == 503) world_.tally.count("503 answers");
        exchange.answered(&*answer);
        answeredBefore_ = true;
        if (answer->closes) {
            cutOff(false);
            return false;
        }
        if (pending_.empty()) {
            wakeIn(world_.draining ? 0 : world_.chance.seconds(kShortThought, kLongThought));
        }
    }
    return true;
}

bool Requester::cutOff(bool byHost) {
    if (byHost && !pending_.empty()) {
        if (answeredBefore_ && !world_.hostIsDead) {
            world_.tally.fault("the host cut a connection off before answering: " +
                               pending_.front().request);
        } else {
            world_.tally.count("turned away without an answer");
        }
    }
    for (const Exchange& exchange : pending_)
        exchange.answered(nullptr);
    pending_.clear();
    return false;
}

bool Requester::next() {
    if (now() < wakeAt()) return true;
    if (rounds_ == 0 || world_.draining) return false;
    return ask();
}

Vanisher::Vanisher(World& world, Exchange exchange)
    : Client(world, "vanishing", world.home.socket()), exchange_(std::move(exchange)) {}

bool Vanisher::begin() {
    Chance& chance = world_.chance;
    const std::size_t length = exchange_.request.size();
    sends_ = chance.oneIn(3) ? chance.below(length) : length;
    reads_ = chance.oneIn(3) ? chance.between(1, 300) : 0;
    leavesAt_ = now() + (chance.oneIn(2) ? 0 : chance.seconds(0, 0.2));
    world_.tally.count("vanishing clients");
    if (exchange_.sending) exchange_.sending();
    connection_.send(exchange_.request.substr(0, sends_));
    exchange_.answered(nullptr);
    if (!connection_.flush() || leavesAt_ <= now()) return false;
    wakeIn(leavesAt_ - now());
    return true;
}

bool Vanisher::proceed(bool readable, bool writable) {
    if (writable && !connection_.flush()) return false;
    if (readable && reads_ > 0) {
        // Closing with unread bytes resets the connection.
        const bool open = connection_.fill(reads_);
        if (!open || connection_.in().size() >= reads_) return false;
    } else if (readable) {
        return false;
    }
    return now() < leavesAt_;
}

}  // namespace soak
