#include "soak/ledger.h"

#include <algorithm>
#include <cstdlib>
#include <sstream>
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
    entry.life = life_;
    entry.answer = accepted ? Answer::Accepted : Answer::Refused;
    if (accepted && entry.ends == 0) ++outstanding_;
}

void Ledger::lost(Number number) {
    entries_[number].answer = Answer::Unknown;
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
    rows_.push_back({number, row.retval, row.messageId, life_});
    ++entry.outcomes;
    entry.retval = row.retval;
    if (row.command != entry.command || row.target != entry.target || row.originNode != "soaked") {
        tally.fault("the outcome of " + row.transid + " is of command \"" + row.command +
                    "\", target \"" + row.target + "\", node \"" + row.originNode +
                    "\"; sent were \"" + entry.command + "\" and \"" + entry.target + "\"");
    }
}

void Ledger::ended(const TaskEnd& end, Tally& tally) {
    const Number number = find(end.transid);
    if (number == kNone) return;  // one that was carried out at once
    tally.count("tasks " + end.state);
    Entry& entry = entries_[number];
    if (++entry.ends > 1) {
        tally.fault(end.transid + " was over as " + entry.state + " and is now " + end.state);
        return;
    }
    entry.state = end.state;
    entry.endLife = life_;
    if (entry.answer == Answer::Accepted) --outstanding_;
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
        switch (entry.answer) {
            case Answer::Announced:
                if (entry.sent > 0) tally.fault(name + " was never answered");
                if (entry.outcomes > 0) tally.fault(name + " without an answer has " + came);
                break;
            case Answer::Accepted:
                tally.count("accepted");
                judgeAccepted(number, tally);
                break;
            case Answer::Refused:
                tally.count("refused");
                if (entry.outcomes != 0) tally.fault(name + " was refused and has " + came);
                if (entry.ends > 0 && entry.state != "refused") {
                    tally.fault(name + " was refused and is " + entry.state);
                }
                break;
            case Answer::Unknown:
                tally.count(entry.ends > 0 ? "vanished, taken" : "vanished, not taken");
                if (entry.ends > 0) judgeAccepted(number, tally);
                if (entry.ends == 0 && entry.outcomes != 0) {
                    tally.fault(name + ", whose client vanished, has " + came + " and no end");
                }
                break;
        }
    }
}

/// It is over in one state, which fits its outcomes.
void Ledger::judgeAccepted(Number number, Tally& tally) const {
    const Entry& entry = entries_[number];
    bool fits = entry.ends == 1;
    if (entry.state == "done" || entry.state == "failed") {
        // Where a restart of the host came between, its own question brings the rest to light.
        const bool interfered = entry.rows == 2 && entry.endLife != entry.life;
        fits = fits && entry.outcomes <= entry.rows && (interfered || entry.outcomes == entry.rows);
    } else if (entry.state == "interrupted") {
        fits = fits && entry.endLife > 0 && entry.outcomes < entry.rows;
    } else {
        // In its turn the plug-in may have refused it.
        fits = fits && entry.state == "refused" && entry.way == Way::Turn && entry.outcomes == 0;
    }
    if (fits) return;
    tally.fault(entry.command + " " + transid(number) + " was accepted, was over " +
                std::to_string(entry.ends) + " times, is \"" + entry.state + "\" and has " +
                std::to_string(entry.outcomes) + " of " + std::to_string(entry.rows) + " outcomes");
}

void Ledger::judgeListed(const std::multimap<std::string, std::string>& states,
                         Tally& tally) const {
    for (Number number = 0; number < entries_.size(); ++number) {
        const Entry& entry = entries_[number];
        const std::size_t count = states.count(transid(number));
        const bool counts = entry.answer == Answer::Accepted ? count == 1 : count <= 1;
        if (!counts) {
            tally.fault("the journal has " + std::to_string(count) + " tasks of " +
                        transid(number));
        } else if (entry.ends == 1 && count == 1 &&
                   states.find(transid(number))->second != entry.state) {
            tally.fault("the journal says that " + transid(number) + ", which was told to be " +
                        entry.state + ", is " + states.find(transid(number))->second);
        }
    }
}

void Ledger::judgeRuns(const std::string& notes, Tally& tally) const {
    std::unordered_map<std::string, unsigned> runs;
    std::istringstream lines(notes);
    for (std::string line; std::getline(lines, line);)
        ++runs[line];
    std::size_t done = 0;
    std::size_t doneAndNoted = 0;
    for (Number number = 0; number < entries_.size(); ++number) {
        const Entry& entry = entries_[number];
        if (!entry.notesItsRun) continue;
        const auto found = runs.find(name(number));
        const unsigned count = found == runs.end() ? 0 : found->second;
        tally.count("runs noted", count);
        done += entry.state == "done" ? 1U : 0U;
        doneAndNoted += entry.state == "done" ? count : 0U;
        // A command that was killed may not have come to its first word, and counts as done without
        // guards.
        const bool mayRun =
            entry.state == "done" || entry.state == "failed" || entry.state == "interrupted";
        if (count <= (mayRun ? 1U : 0U)) continue;
        tally.fault(transid(number) + " is \"" + entry.state + "\" and ran " +
                    std::to_string(count) + " times");
    }
    if (done > kFewOutcomes && doneAndNoted * 100 < done * kHopedPercent) {
        tally.fault("of " + std::to_string(done) + " tasks that are done only " +
                    std::to_string(doneAndNoted) + " wrote that down");
    }
}

/// Whoever was answered before another one of the same way was sent was accepted before it. On the
/// table that holds within one life of the host: what it leaves behind may be overtaken.
void Ledger::judgeOrder(Tally& tally) const {
    constexpr unsigned kAllLives = static_cast<unsigned>(-1);
    std::unordered_map<unsigned, Number> earliest;
    for (std::size_t i = rows_.size(); i-- > 0;) {
        const Number number = rows_[i].number;
        const Entry& entry = entries_[number];
        if (entry.firstRow != i) continue;
        if (entry.way == Way::Table && entry.life != rows_[i].life) continue;
        const auto group =
            earliest.emplace(entry.way == Way::Turn ? kAllLives : entry.life, kNone).first;
        Number& first = group->second;
        if (first != kNone && entry.sent > entries_[first].answered) {
            tally.fault(transid(first) + " was accepted before " + transid(number) +
                        " was sent, but its outcome came later");
        }
        if (entry.answer == Answer::Accepted &&
            (first == kNone || entry.answered < entries_[first].answered)) {
            first = number;
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
        if (entry.endLife == entry.life && rows_[entry.firstRow + 1].number != number) {
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
