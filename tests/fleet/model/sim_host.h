/// A host with its journal, and what really ran on it.
#pragma once

#include <deque>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "fleet/link/core/actions.h"
#include "fleet/link/core/answers.h"
#include "tests/fleet/model/dice.h"

namespace model {

struct Task {
    fleet::Number number;
    std::string state;
    fleet::Moment expires;
};

inline bool isOver(const Task& task) {
    return task.state != "queued" && task.state != "running";
}

/// One life of a journal.
struct Journal {
    std::string identity;
    std::map<std::string, Task> tasks;
    std::deque<std::string> waiting;  ///< the first one may be running
};

class SimHost {
public:
    SimHost(std::string key, Dice& dice) : key_(std::move(key)), dice_(dice) { begin(); }

    const std::string& key() const { return key_; }
    bool isUp() const { return isUp_; }
    const std::string& journal() const { return journals_.back().identity; }

    fleet::HandOverAnswer handOver(const fleet::HandOver& order);
    fleet::HandOverAnswer enter(const fleet::EnterEnd& order);
    fleet::CancelAnswer cancel(const std::string& order);
    fleet::LookUpAnswer lookUp(const std::string& order) const;
    std::set<std::string> unfinished() const;

    /// Runs what waits, one step.
    void step(fleet::Moment now);
    /// Killed. What ran is interrupted when it starts again.
    void kill() { isUp_ = false; }
    void start();
    /// The journal is damaged and set aside; of what was not over, some is entered in the new one.
    void setJournalAside();

    /// Called when a task is over while the host is up.
    std::function<void(const fleet::Outcome&)> onEnd;

    // What the checks look at.
    const std::vector<Journal>& journals() const { return journals_; }
    /// The orders whose commands were started, in that order.
    const std::vector<std::string>& ran() const { return ran_; }
    bool hasLostJournal() const { return journals_.size() > 1; }

private:
    void begin();
    Journal& now() { return journals_.back(); }
    void end(const std::string& order, const std::string& state);
    fleet::Outcome outcomeOf(const std::string& order) const;

    const std::string key_;
    Dice& dice_;
    bool isUp_ = true;
    std::vector<Journal> journals_;
    std::vector<std::string> ran_;
};

}  // namespace model
