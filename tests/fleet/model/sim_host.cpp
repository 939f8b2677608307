#include "tests/fleet/model/sim_host.h"

namespace model {

void SimHost::begin() {
    Journal journal;
    journal.identity = key_ + "-journal-" + std::to_string(journals_.size() + 1);
    journals_.push_back(std::move(journal));
}

fleet::HandOverAnswer SimHost::handOver(const fleet::HandOver& order) {
    if (!isUp_) return fleet::NotNow{"no host answers"};
    if (order.journal != journal()) return fleet::OtherJournal{};
    const auto known = now().tasks.find(order.directive.order);
    if (known != now().tasks.end()) return fleet::Recorded{isOver(known->second)};
    if (dice_.fault(3)) return fleet::NotNow{"full"};
    if (order.directive.request == "bad") return fleet::Unacceptable{"no such command"};
    now().tasks[order.directive.order] = {order.directive.number, "queued",
                                          order.directive.expires};
    now().waiting.push_back(order.directive.order);
    if (dice_.fault(3)) return fleet::NotNow{"the answer was lost"};
    return fleet::Recorded{false};
}

fleet::HandOverAnswer SimHost::enter(const fleet::EnterEnd& order) {
    if (!isUp_) return fleet::NotNow{"no host answers"};
    if (order.journal != journal()) return fleet::OtherJournal{};
    if (dice_.fault(3)) return fleet::NotNow{"full"};
    const auto [task, isNew] = now().tasks.try_emplace(order.directive.order);
    if (isNew) task->second = {order.directive.number, "queued", order.directive.expires};
    if (isNew) end(order.directive.order, order.state);
    if (dice_.fault(3)) return fleet::NotNow{"the answer was lost"};
    return fleet::Recorded{isOver(task->second)};
}

fleet::CancelAnswer SimHost::cancel(const std::string& order) {
    if (!isUp_) return fleet::NotNow{"no host answers"};
    const auto task = now().tasks.find(order);
    if (task == now().tasks.end()) return fleet::NotCancelled{"there is no such task"};
    if (task->second.state == "cancelled") return fleet::WasCancelled{};
    if (isOver(task->second)) return fleet::NotCancelled{"it is over: " + task->second.state};
    for (auto waiting = now().waiting.begin(); waiting != now().waiting.end(); ++waiting) {
        if (*waiting != order) continue;
        now().waiting.erase(waiting);
        break;
    }
    end(order, "cancelled");
    return fleet::WasCancelled{};
}

fleet::LookUpAnswer SimHost::lookUp(const std::string& order) const {
    if (!isUp_) return fleet::NotNow{"no host answers"};
    const auto task = journals_.back().tasks.find(order);
    if (task == journals_.back().tasks.end()) return fleet::Absent{};
    if (!isOver(task->second)) return fleet::StillOpen{};
    return outcomeOf(order);
}

std::set<std::string> SimHost::unfinished() const {
    std::set<std::string> orders;
    for (const auto& [order, task] : journals_.back().tasks) {
        if (!isOver(task)) orders.insert(order);
    }
    return orders;
}

void SimHost::step(fleet::Moment time) {
    if (!isUp_ || now().waiting.empty()) return;
    const std::string order = now().waiting.front();
    Task& task = now().tasks.at(order);
    if (task.state == "running") {
        now().waiting.pop_front();
        end(order, dice_.chance(80) ? "done" : "failed");
    } else if (task.expires <= time) {
        now().waiting.pop_front();
        end(order, "expired");
    } else {
        task.state = "running";
        ran_.push_back(order);
    }
}

void SimHost::start() {
    isUp_ = true;
    if (now().waiting.empty() || now().tasks.at(now().waiting.front()).state != "running") return;
    const std::string order = now().waiting.front();
    now().waiting.pop_front();
    end(order, "interrupted");
}

void SimHost::setJournalAside() {
    const std::deque<std::string> left = now().waiting;
    const std::map<std::string, Task> old = now().tasks;
    begin();
    for (const std::string& order : left) {
        if (!dice_.chance(50)) continue;
        now().tasks[order] = old.at(order);
        end(order, "interrupted");
    }
}

void SimHost::end(const std::string& order, const std::string& state) {
    now().tasks.at(order).state = state;
    if (isUp_ && onEnd) onEnd(outcomeOf(order));
}

fleet::Outcome SimHost::outcomeOf(const std::string& order) const {
    fleet::Outcome outcome;
    outcome.host = key_;
    outcome.order = order;
    outcome.journal = journal();
    outcome.state = journals_.back().tasks.at(order).state;
    return outcome;
}

}  // namespace model
