#include "fleet/link/core/link.h"

#include <algorithm>
#include <utility>

namespace fleet {
namespace {

using std::chrono::seconds;

/// Between two hellos, however urgent.
constexpr Moment kHelloPause = seconds(2);
constexpr Moment kScanPause = seconds(1);
constexpr Moment kFirstPatience = seconds(2);
/// Of why an order waits, in a hello: it may be in others' words.
constexpr std::size_t kLongestReason = 1024;
constexpr Moment kMostPatience = seconds(30);

Moment longer(Moment patience) {
    return patience.count() == 0 ? kFirstPatience : std::min(patience * 2, kMostPatience);
}

Outcome unknownOutcome(const std::string& host, const std::string& order,
                       const std::string& journal) {
    Outcome outcome;
    outcome.host = host;
    outcome.order = order;
    outcome.journal = journal;
    outcome.state = kUnknown;
    return outcome;
}

}  // namespace

Link::Link(LinkSettings settings, Kept kept)
    : settings_(std::move(settings)), kept_(std::move(kept)) {
    ahead_.restart(kept_.taken);
}

void Link::see(Moment now) {
    kept_.latest = std::max(kept_.latest, now);
}

Actions Link::connected(Moment now) {
    see(now);
    isConnected_ = true;
    isGreeted_ = false;
    asked_.reset();
    ahead_.restart(kept_.taken);
    nextHello_ = now;
    nextScan_ = now + settings_.pause();
    return goOn();
}

void Link::disconnected() {
    isConnected_ = false;
    isGreeted_ = false;
    asked_.reset();
}

Actions Link::seen(Number number, Moment now) {
    see(now);
    if (number <= kept_.taken) return {};
    // Anybody may have said that number; only a scan shows what there is. One a second is enough.
    if (kept_.latest >= lastSeen_ + kScanPause) {
        lastSeen_ = kept_.latest;
        ahead_.scanAgain();
    } else {
        nextScan_ = std::min(nextScan_, lastSeen_ + kScanPause);
    }
    return goOn();
}

Actions Link::read(Number number, Directive directive, Moment now) {
    see(now);
    Actions out;
    const Directive copy = directive;
    if (ahead_.found(number, std::move(directive))) noteCancel(copy, out);
    return andOn(std::move(out));
}

Actions Link::missing(Number number, Moment now) {
    see(now);
    if (ahead_.missing(number) && ahead_.hasGap()) soonHello();
    return goOn();
}

Actions Link::unanswered(Number number, Moment now) {
    see(now);
    if (ahead_.unanswered(number)) nextScan_ = std::min(nextScan_, now + kFirstPatience);
    return goOn();
}

/// A cancel acts as soon as it is read: what waits on the bus will not run, and what has been
/// handed over is cancelled at the host.
void Link::noteCancel(const Directive& directive, Actions& out) {
    if (directive.cancels.empty() || endOf(directive)) return;
    if (!withdrawn_.insert(directive.cancels).second) return;
    if (!journalNow_.empty()) out.push_back(CancelTask{directive.cancels, directive.number});
}

Actions Link::replied(const Reply& reply, Moment now) {
    see(now);
    if (!asked_ || reply.nonce != asked_->nonce) return {};
    if (reply.over > reply.last || reply.last > kHighestNumber) return {};
    helloPatience_ = {};
    Actions out;
    if (!reply.stop.empty()) {
        out.push_back(StopLink{reply.stop});
        return out;
    }
    listWanted_ = reply.list;
    revoked_.clear();
    revoked_.insert(reply.revoked.begin(), reply.revoked.end());
    knowsRevoked_ = true;
    ahead_.expect(reply.last);
    if (needsAdoption(reply)) {
        // Until that is done the link must look to the centre like one that has forgotten.
        isGreeted_ = adopt(reply, out);
        if (!isGreeted_) soonHello();
    } else {
        isGreeted_ = true;
        if (reply.over > kept_.taken) take(reply.over, out);
    }
    if (!journalNow_.empty() && kept_.journal == journalNow_) {
        for (const std::string& order : reply.open)
            out.push_back(LookUp{order});
    }
    asked_.reset();
    return andOn(std::move(out));
}

Actions Link::unheard(const std::string& nonce, Moment now) {
    see(now);
    if (!asked_ || asked_->nonce != nonce) return {};
    asked_.reset();
    helloPatience_ = longer(helloPatience_);
    nextHello_ = std::min(nextHello_, kept_.latest + helloPatience_);
    return goOn();
}

/// Whether what this link remembers does not go with the journal that the host has now.
bool Link::needsAdoption(const Reply& reply) const {
    return reply.forget || (!asked_->journalNow.empty() && asked_->journalNow != kept_.journal);
}

/// Begins anew behind all that was ever given: nothing that was published before runs, because
/// nobody knows what of it has run. False if that must wait for a later reply.
bool Link::adopt(const Reply& reply, Actions& out) {
    // The host may be recording an order right now, and may have changed its journal since the
    // hello.
    if (busy_ || journalNow_.empty() || journalNow_ != asked_->journalNow) return false;
    const bool isFirst = kept_.journal.empty() && !reply.forget;
    kept_.journal = journalNow_;
    if (!isFirst) {
        kept_.adopted = kept_.latest;
        kept_.taken = std::max(kept_.taken, reply.last);
        ahead_.restart(kept_.taken);
        withdrawn_.clear();
    }
    keep(out);
    return true;
}

Actions Link::hostIs(const std::string& journal, std::set<std::string> unfinished, Moment now) {
    see(now);
    Actions out;
    if (journal == journalNow_) {
        // What has begun or ended while the list was made, nobody knows.
        unfinished.insert(unfinished_.begin(), unfinished_.end());
        for (const std::string& order : unfinished)
            out.push_back(LookUp{order});
    }
    journalNow_ = journal;
    unfinished_ = std::move(unfinished);
    isListedMeanwhile_ = true;
    if (journal != kept_.journal) soonHello();
    return andOn(std::move(out));
}

Actions Link::hostIsAway(Moment now) {
    see(now);
    journalNow_.clear();
    blocked_ = "no host answers";
    return goOn();
}

Actions Link::ended(Outcome outcome, Moment now) {
    see(now);
    if (busy_ && busy_->order == outcome.order) endedMeanwhile_.insert(outcome.order);
    unfinished_.erase(outcome.order);
    outcome.host = settings_.host;
    Actions out = {Report{std::move(outcome)}};
    return andOn(std::move(out));
}

Actions Link::found(const std::string& order, const LookUpAnswer& answer, Moment now) {
    see(now);
    Actions out;
    const bool isOpen =
        std::holds_alternative<StillOpen>(answer) || std::holds_alternative<NotNow>(answer);
    if (!isOpen) unfinished_.erase(order);
    if (const auto* outcome = std::get_if<Outcome>(&answer)) {
        Outcome told = *outcome;
        told.host = settings_.host;
        out.push_back(Report{std::move(told)});
    } else if (std::holds_alternative<Absent>(answer) && kept_.journal == journalNow_) {
        out.push_back(Report{unknownOutcome(settings_.host, order, kept_.journal)});
    }
    return andOn(std::move(out));
}

Actions Link::tick(Moment now) {
    see(now);
    if (isConnected_ && now >= nextScan_) {
        nextScan_ = now + settings_.pause();
        ahead_.scanAgain();
    }
    return goOn();
}

Actions Link::goOn() {
    return andOn({});
}

/// These actions, and what is to be done next.
Actions Link::andOn(Actions out) {
    if (!isConnected_) return out;
    if (kept_.latest >= nextHello_) sayHello(out);
    handOverNext(out);
    // Before the centre has replied nobody knows whose cancels count no longer.
    if (!isGreeted_) return out;
    if (const std::optional<Number> number = ahead_.next()) out.push_back(ReadOrder{*number});
    return out;
}

void Link::sayHello(Actions& out) {
    // The centre takes no hello that is older than one before, so after a restart none may be.
    keep(out);
    Hello hello;
    hello.session = settings_.session;
    hello.nonce = settings_.nonce();
    hello.machine = settings_.machine;
    hello.time = kept_.latest;
    hello.taken = kept_.taken;
    hello.journal = kept_.journal;
    hello.journalNow = journalNow_;
    hello.blocked = blocked_.substr(0, kLongestReason);
    lastHello_ = kept_.latest;
    nextHello_ = kept_.latest + settings_.pause();
    asked_ = hello;
    out.push_back(SayHello{std::move(hello), listWanted_});
}

void Link::soonHello() {
    nextHello_ = std::min(nextHello_, std::max(kept_.latest, lastHello_ + kHelloPause));
}

bool Link::mayHandOver() const {
    return isConnected_ && isGreeted_ && ahead_.isScanned() && !busy_ && !journalNow_.empty() &&
           journalNow_ == kept_.journal && kept_.latest >= tryAgain_;
}

/// The order runs never: it is forbidden, cancelled or out of date.
std::optional<Link::End> Link::endOf(const Directive& directive) const {
    if (withdrawn_.count(directive.order) != 0) {
        return End{"cancelled", "cancelled before its turn came"};
    }
    if (!directive.refusal.empty()) return End{"refused", directive.refusal};
    if (revoked_.count(directive.signer) != 0) {
        return End{"refused", "the operator's key has been revoked"};
    }
    if (directive.issued > kept_.latest + kMostAhead) {
        return End{"refused", "made more than five minutes in the future: a clock is wrong"};
    }
    if (directive.issued < kept_.adopted) {
        return End{"refused", "made before the host's journal began, so it may have run already"};
    }
    if (directive.expires <= kept_.latest) return End{"expired", "its turn came too late"};
    if (directive.allowedUntil <= kept_.latest) {
        return End{"refused", "the operator's certificate has ended"};
    }
    return std::nullopt;
}

void Link::handOverNext(Actions& out) {
    if (!mayHandOver()) return;
    const Directive* const next = ahead_.front();
    if (next == nullptr) {
        blocked_.clear();
        return;
    }
    if (const std::optional<End> end = endOf(*next)) {
        enter(*next, *end, out);
    } else if (!next->cancels.empty()) {
        busy_ = *next;
        out.push_back(CancelTask{next->cancels, next->number});
    } else {
        handOver(*next, out);
    }
}

void Link::enter(const Directive& directive, const End& end, Actions& out) {
    busy_ = directive;
    isEntering_ = true;
    out.push_back(EnterEnd{directive, end.state, end.reason, kept_.journal});
}

void Link::handOver(const Directive& directive, Actions& out) {
    if (unfinished_.size() >= kMostUnfinished) {
        blocked_ = "the host has " + std::to_string(kMostUnfinished) + " orders at work";
        return;
    }
    if (directive.hasFiles && placed_ != directive.number) {
        // An install's clean-up removes what was placed before it was over.
        if (!unfinished_.empty()) {
            blocked_ = "its files are placed when the orders before it are over";
            return;
        }
        busy_ = directive;
        out.push_back(PrepareFiles{directive});
        return;
    }
    if (directive.onlyBringsFiles) {
        const std::size_t count = directive.files.size();
        const std::string what = count == 1 ? "1 file is" : std::to_string(count) + " files are";
        return enter(directive, {"done", what + " in the depot"}, out);
    }
    busy_ = directive;
    isEntering_ = false;
    endedMeanwhile_.clear();
    isListedMeanwhile_ = false;
    out.push_back(HandOver{directive, kept_.journal});
}

Actions Link::prepared(Number number, const PrepareAnswer& answer, Moment now) {
    see(now);
    if (!busy_ || busy_->number != number) return {};
    const Directive directive = std::move(*busy_);
    busy_.reset();
    Actions out;
    if (const auto* words = std::get_if<Unacceptable>(&answer)) {
        if (number == kept_.taken + 1) {
            enter(directive, {"refused", words->words}, out);
            return out;
        }
    } else if (const auto* later = std::get_if<NotNow>(&answer)) {
        postpone(later->why);
    } else {
        placed_ = number;
    }
    return goOn();
}

Actions Link::cancelled(Number by, const CancelAnswer& answer, Moment now) {
    see(now);
    // An early try, made when the cancel was read, is repeated when its turn has come.
    if (!busy_ || busy_->number != by || busy_->cancels.empty()) return goOn();
    const Directive directive = std::move(*busy_);
    busy_.reset();
    Actions out;
    if (by != kept_.taken + 1) return goOn();
    if (const auto* later = std::get_if<NotNow>(&answer)) {
        postpone(later->why);
        return goOn();
    }
    if (const auto* words = std::get_if<NotCancelled>(&answer)) {
        enter(directive, {"refused", words->words}, out);
    } else {
        enter(directive, {"done", "cancelled " + directive.cancels}, out);
    }
    return out;
}

Actions Link::recorded(Number number, const HandOverAnswer& answer, Moment now) {
    see(now);
    if (!busy_ || busy_->number != number) return {};
    const Directive directive = std::move(*busy_);
    busy_.reset();
    Actions out;
    if (const auto* record = std::get_if<Recorded>(&answer)) {
        if (!record->isOver && endedMeanwhile_.count(directive.order) == 0) {
            unfinished_.insert(directive.order);
            // Whether the host's list is older than its answer, nobody knows.
            if (isListedMeanwhile_) out.push_back(LookUp{directive.order});
        }
        if (number == kept_.taken + 1) take(number, out);
        blocked_.clear();
        patience_ = {};
    } else if (const auto* words = std::get_if<Unacceptable>(&answer)) {
        if (isEntering_) {
            postpone("the host does not record how orders end: " + words->words);
        } else if (number == kept_.taken + 1) {
            enter(directive, {"refused", words->words}, out);
            return out;
        }
    } else if (const auto* later = std::get_if<NotNow>(&answer)) {
        postpone(later->why);
    } else {
        journalNow_.clear();
        blocked_ = "the host has another journal";
        soonHello();
    }
    return andOn(std::move(out));
}

void Link::postpone(const std::string& why) {
    blocked_ = why;
    patience_ = longer(patience_);
    tryAgain_ = kept_.latest + patience_;
}

void Link::take(Number number, Actions& out) {
    while (const Directive* done = ahead_.front()) {
        if (done->number > number) break;
        withdrawn_.erase(done->order);
        ahead_.drop(done->number);
    }
    ahead_.drop(number);
    kept_.taken = number;
    keep(out);
}

/// At most once among actions that are done together, at the first place: what is kept only grows,
/// and each time costs the disk.
void Link::keep(Actions& out) {
    for (Action& action : out) {
        if (auto* const keep = std::get_if<Keep>(&action)) {
            keep->kept = kept_;
            return;
        }
    }
    out.push_back(Keep{kept_});
}

}  // namespace fleet
