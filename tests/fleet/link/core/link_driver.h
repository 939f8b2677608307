/// Drives a link in tests: plays the bus, the centre and the host that it talks to.
#pragma once

#include <set>
#include <string>
#include <vector>

#include "fleet/link/core/link.h"

namespace fleet_test {

constexpr fleet::Moment kNow{1'700'000'000'000};

/// An order that nothing forbids.
inline fleet::Directive directive(fleet::Number number) {
    fleet::Directive made;
    made.number = number;
    made.order = "order-" + std::to_string(number);
    made.signer = "operator";
    made.issued = kNow - fleet::Moment(1'000);
    made.expires = kNow + fleet::Moment(3'600'000);
    made.allowedUntil = fleet::Moment::max();
    made.request = "{}";
    return made;
}

inline fleet::Outcome outcome(const std::string& order, const std::string& state) {
    fleet::Outcome made;
    made.order = order;
    made.journal = "journal";
    made.state = state;
    return made;
}

class LinkDriver {
public:
    explicit LinkDriver(fleet::Kept kept) : link_(settings(), std::move(kept)) {}

    /// Connects, lets the host answer and the centre reply, and finds no order on the bus.
    void greet(fleet::Number last) {
        note(link_.hostIs("journal", {}, now));
        note(link_.connected(now));
        fleet::Reply reply;
        reply.nonce = nonce();
        reply.last = last;
        note(link_.replied(reply, now));
    }
    /// The bus has these orders and no more.
    void bring(const std::vector<fleet::Directive>& orders) {
        fleet::Number next = link_.kept().taken + 1;
        for (const fleet::Directive& order : orders) {
            note(link_.read(order.number, order, now));
            next = order.number + 1;
        }
        note(link_.missing(next, now));
    }
    /// Lets time pass. What a scan asks for meanwhile is not there.
    void wait(fleet::Moment time) {
        now += time;
        const fleet::Actions actions = link_.tick(now);
        note(actions);
        for (const fleet::Action& action : actions) {
            if (const auto* read = std::get_if<fleet::ReadOrder>(&action)) {
                note(link_.missing(read->number, now));
            }
        }
    }
    /// Waits for an action of a kind, ten minutes at most.
    template <typename Kind>
    void waitFor() {
        for (int second = 0; second < 600 && count<Kind>() == 0; ++second)
            wait(fleet::Moment(1'000));
    }
    void note(const fleet::Actions& actions) {
        for (const fleet::Action& action : actions) {
            if (const auto* hello = std::get_if<fleet::SayHello>(&action)) hello_ = hello->hello;
            done.push_back(action);
        }
    }

    /// The last action of a kind; null if there was none since forget().
    template <typename Kind>
    const Kind* last() const {
        for (auto action = done.rbegin(); action != done.rend(); ++action) {
            if (const auto* found = std::get_if<Kind>(&*action)) return found;
        }
        return nullptr;
    }
    template <typename Kind>
    std::size_t count() const {
        std::size_t found = 0;
        for (const fleet::Action& action : done)
            found += std::holds_alternative<Kind>(action) ? 1U : 0U;
        return found;
    }
    void forget() { done.clear(); }

    fleet::Link& link() { return link_; }
    const fleet::Hello& hello() const { return hello_; }
    const std::string& nonce() const { return hello_.nonce; }

    fleet::Moment now = kNow;
    fleet::Actions done;

private:
    fleet::LinkSettings settings() {
        fleet::LinkSettings made;
        made.host = "host";
        made.session = "session";
        made.machine = "machine";
        made.nonce = [this] { return "nonce-" + std::to_string(++nonces_); };
        made.pause = [] { return fleet::Moment(30'000); };
        return made;
    }

    int nonces_ = 0;
    fleet::Hello hello_;
    fleet::Link link_;
};

/// What is kept by a link that has taken so many orders of this journal.
inline fleet::Kept kept(fleet::Number taken) {
    fleet::Kept made;
    made.taken = taken;
    made.journal = "journal";
    return made;
}

}  // namespace fleet_test
