#include "soak/ledger.h"

#include <algorithm>
#include <cstdlib>
#include <limits>
#include <unordered_map>

namespace soak {
namespace {

constexpr int kInstallFailed = 1031;
constexpr const char* kNotStarted = "ZAV1030E";

/// So many percent must end as hoped, when there are more than a few.
constexpr std::size_t kHopedPercent = 70;
constexpr std::size_t kFewOutcomes = 30;

}  // namespace

Ledger::Number Ledger::announce(const std::string& command, const std::string& target,
                                unsigned rows, Hope hope, std::size_t burst) {
    Entry entry;
    entry.command = command;
    entry.target = target;
    entry.rows = rows;
    entry.hope = hope;
    entry.burst = burst;
    entries_.push_back(entry);
    return entries_.size() - 1;
}

Ledger::Number Ledger::find(const std::string& transid) const {
    if (transid.size() <= prefix_.size() || transid.compare(0, prefix_.size(), prefix_) != 0) {
        return kNone;
    }
    char* end = nullptr;
    const Number number = std::strtoul(transid.c_str() + prefix_.size(), &end, 10);
    return *end == '\0' && number < entries_.size() ? number : kNone;
}

void Ledger::answered(Number number, bool accepted, double now) {
    Entry& entry = entries_[number];
    entry.answered = now;
    entry.state = accepted ? State::Accepted : State::Refused;
    if (accepted && !done(number)) ++outstanding_;
}

void Ledger::lost(Number number) {
    entries_[number].state = State::Unknown;
}

void Ledger::outcome(const OutcomeRow& row, Tally& tally) {
    tally.count("outcomes");
    const Number number = find(row.transid);
    if (number == kNone) {
        tally.fault("an outcome of a request that nobody made: TRANSID \"" + row.transid + "\"");
        return;
    }
    Entry& entry = entries_[number];
    if (entry.outcomes == 0) {
        entry.firstRow = rows_.size();
        // Without a translator, when the inventory program was killed, nothing is installed.
        if (entry.rows == 2 && row.retval == kInstallFailed && row.messageId == kNotStarted) {
            entry.rows = 1;
        }
    }
    rows_.push_back({number, row.retval, row.messageId});
    ++entry.outcomes;
    entry.retval = row.retval;
    if (entry.state == State::Accepted && entry.outcomes == entry.rows) --outstanding_;
    if (row.command != entry.command || row.target != entry.target || row.originNode != "soaked") {
        tally.fault("the outcome of " + row.transid + " is of command \"" + row.command +
                    "\", target \"" + row.target + "\", node \"" + row.originNode +
                    "\"; sent were \"" + entry.command + "\" and \"" + entry.target + "\"");
    }
}

void Ledger::judge(Tally& tally) const {
    judgeCounts(tally);
    judgeOrder(tally);
    judgeBursts(tally);
    judgePairs(tally);
    judgeHopes(tally);
}

void Ledger::judgeCounts(Tally& tally) const {
    for (Number number = 0; number < entries_.size(); ++number) {
        const Entry& entry = entries_[number];
        const std::string name = entry.command + " " + transid(number);
        const std::string came = std::to_string(entry.outcomes) + " outcomes";
        switch (entry.state) {
            case State::Announced:
                if (entry.sent > 0) tally.fault(name + " was never answered");
                if (entry.outcomes > 0) tally.fault(name + " without an answer has " + came);
                break;
            case State::Accepted:
                tally.count("accepted");
                if (entry.outcomes != entry.rows) {
                    tally.fault(name + " was accepted and has " + came + " instead of " +
                                std::to_string(entry.rows));
                }
                break;
            case State::Refused:
                tally.count("refused");
                if (entry.outcomes != 0) tally.fault(name + " was refused and has " + came);
                break;
            case State::Unknown:
                tally.count(entry.outcomes > 0 ? "vanished, carried out" : "vanished, not taken");
                if (entry.outcomes != 0 && entry.outcomes != entry.rows) {
                    tally.fault(name + ", whose client vanished, has " + came);
                }
                break;
        }
    }
}

/// Whoever was answered before another one was sent was accepted before it.
void Ledger::judgeOrder(Tally& tally) const {
    double earliestAnswer = std::numeric_limits<double>::infinity();
    Number earliest = kNone;
    for (std::size_t i = rows_.size(); i-- > 0;) {
        const Number number = rows_[i].number;
        const Entry& entry = entries_[number];
        if (entry.firstRow != i) continue;
        if (entry.sent > earliestAnswer) {
            tally.fault(transid(earliest) + " was accepted before " + transid(number) +
                        " was sent, but its outcome came later");
        }
        if (entry.state == State::Accepted && entry.answered < earliestAnswer) {
            earliestAnswer = entry.answered;
            earliest = number;
        }
    }
}

/// Requests of one connection are handled in their order, and so are their outcomes.
void Ledger::judgeBursts(Tally& tally) const {
    std::unordered_map<std::size_t, Number> last;
    for (Number number = 0; number < entries_.size(); ++number) {
        const Entry& entry = entries_[number];
        if (entry.burst == 0 || entry.outcomes == 0) continue;
        const auto [before, first] = last.emplace(entry.burst, number);
        if (!first && entries_[before->second].firstRow > entry.firstRow) {
            tally.fault(transid(before->second) + " was sent before " + transid(number) +
                        " on one connection, but its outcome came later");
        }
        before->second = number;
    }
}

/// One task at a time is carried out, so nothing comes between its outcomes.
void Ledger::judgePairs(Tally& tally) const {
    for (Number number = 0; number < entries_.size(); ++number) {
        const Entry& entry = entries_[number];
        if (entry.rows != 2 || entry.outcomes != 2) continue;
        if (rows_[entry.firstRow].retval != 0) {
            tally.fault(transid(number) + " does not begin with a success");
        }
        if (rows_[entry.firstRow + 1].number != number) {
            tally.fault("between the outcomes of " + transid(number) + " is another one's");
        }
    }
}

void Ledger::judgeHopes(Tally& tally) const {
    for (const Hope hope : {Hope::Success, Hope::Failure}) {
        std::size_t all = 0;
        std::size_t right = 0;
        for (const Entry& entry : entries_) {
            if (entry.hope != hope || entry.outcomes == 0) continue;
            ++all;
            right += (entry.retval == 0) == (hope == Hope::Success) ? 1 : 0;
        }
        const std::string name = hope == Hope::Success ? "to succeed" : "to fail";
        tally.count(name, all);
        tally.count(name + ", and did", right);
        if (all > kFewOutcomes && right * 100 < all * kHopedPercent) {
            tally.fault("of " + std::to_string(all) + " commands " + name + " only " +
                        std::to_string(right) + " did");
        }
    }
}

}  // namespace soak
