/// Decides what a link does: which order its host gets when, and what the centre is told.
///
/// Nothing here talks to anybody or looks at a clock. Its program tells it what has happened and
/// carries out the actions that come back, in their order. So the model of the protocol runs this
/// very code.
#pragma once

#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "fleet/bus/messages/hello.h"
#include "fleet/link/core/actions.h"
#include "fleet/link/core/answers.h"
#include "fleet/link/core/kept.h"
#include "fleet/link/core/read_ahead.h"

namespace fleet {

/// What a link is told when it starts.
struct LinkSettings {
    std::string host;     ///< its bus key
    std::string session;  ///< made up for this start
    std::string machine;  ///< the machine's identity
    /// Makes up a text that nobody can guess, for one hello.
    std::function<std::string()> nonce;
    /// Draws the time up to the next hello or scan, 20 to 40 seconds: links must not all come at
    /// once.
    std::function<Moment()> pause;
};

/// One host's link. One thread at a time. Each function returns what is to be done now.
class Link {
public:
    /// Orders of the fleet that the host may have unfinished at the same time.
    static constexpr std::size_t kMostUnfinished = 8;
    /// How far an operator's clock may be ahead.
    static constexpr Moment kMostAhead{5 * 60 * 1000};

    Link(LinkSettings settings, Kept kept);

    // What happens on the bus.
    Actions connected(Moment now);
    void disconnected();
    /// Somebody says that an order with this number was published.
    Actions seen(Number number, Moment now);
    /// What ReadOrder came to: an order of this host whose number the centre has signed.
    Actions read(Number number, Directive directive, Moment now);
    /// The bus has no such order, or one that the centre has not signed.
    Actions missing(Number number, Moment now);
    Actions unanswered(Number number, Moment now);
    /// A reply that the centre has signed.
    Actions replied(const Reply& reply, Moment now);
    /// Nobody has replied to the hello with this nonce, and nobody will: it was lost, or the centre
    /// is away. The next one comes sooner than usual, and ever later as long as that goes on.
    Actions unheard(const std::string& nonce, Moment now);

    // What happens on the host.
    /// A host answers, and these of the fleet's orders are not over in its journal.
    Actions hostIs(const std::string& journal, std::set<std::string> unfinished, Moment now);
    Actions hostIsAway(Moment now);
    /// The task of one of the fleet's orders is over.
    Actions ended(Outcome outcome, Moment now);
    Actions recorded(Number number, const HandOverAnswer& answer, Moment now);
    Actions prepared(Number number, const PrepareAnswer& answer, Moment now);
    Actions cancelled(Number by, const CancelAnswer& answer, Moment now);
    Actions found(const std::string& order, const LookUpAnswer& answer, Moment now);

    /// Time has passed. To be called every second.
    Actions tick(Moment now);

    const Kept& kept() const { return kept_; }
    /// Whether the centre has told that this operator's key counts no longer.
    bool isRevoked(const std::string& key) const { return revoked_.count(key) > 0; }
    /// Whether a reply has said which keys those are. Before that, nobody's key counts.
    bool knowsRevoked() const { return knowsRevoked_; }
    /// Why the next order is not handed over; "" if nothing is in the way.
    const std::string& blocked() const { return blocked_; }

private:
    /// An order that never runs, and how that is recorded.
    struct End {
        EndState state;
        std::string reason;
    };

    void see(Moment now);
    Actions goOn();
    Actions andOn(Actions out);
    void handOverNext(Actions& out);
    void handOver(const Directive& directive, Actions& out);
    void enter(const Directive& directive, const End& end, Actions& out);
    std::optional<End> endOf(const Directive& directive) const;
    bool mayHandOver() const;
    void noteCancel(const Directive& directive, Actions& out);
    void postpone(const std::string& why);
    void take(Number number, Actions& out);
    void keep(Actions& out);
    void sayHello(Actions& out);
    void soonHello();
    bool needsAdoption(const Reply& reply) const;
    bool adopt(const Reply& reply, Actions& out);

    const LinkSettings settings_;
    Kept kept_;
    ReadAhead ahead_;

    // The bus.
    bool isConnected_ = false;
    bool isGreeted_ = false;      ///< the centre has replied on this connection
    std::optional<Hello> asked_;  ///< the hello whose reply is awaited
    Moment nextHello_{};
    Moment lastHello_{};
    Moment helloPatience_{};  ///< how long after an unheard hello the next one comes
    Moment nextScan_{};
    Moment lastSeen_{};  ///< when the latest scan was begun because of a number that was seen
    bool listWanted_ = false;
    bool knowsRevoked_ = false;
    std::set<std::string> revoked_;

    // The host.
    std::string journalNow_;  ///< "" while no host answers
    std::set<std::string> unfinished_;

    // The order whose turn it is.
    std::optional<Directive> busy_;         ///< an answer about it is awaited
    bool isEntering_ = false;               ///< it is about the record of an end
    std::set<std::string> endedMeanwhile_;  ///< tasks that were over before their record was known
    bool isListedMeanwhile_ = false;        ///< the host has told anew what is unfinished
    Number placed_ = 0;                     ///< the order whose files lie where they belong
    std::set<std::string> withdrawn_;       ///< orders that were cancelled before their turn
    std::string blocked_;
    Moment tryAgain_{};
    Moment patience_{};
};

}  // namespace fleet
