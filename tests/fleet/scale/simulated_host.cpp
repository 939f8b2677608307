#include "tests/fleet/scale/simulated_host.h"

#include <algorithm>
#include <map>
#include <mutex>
#include <nlohmann/json.hpp>
#include <utility>
#include <vector>

#include "fleet/bus/messages/order.h"
#include "fleet/link/program/host_answers.h"
#include "text/utc_time.h"

using nlohmann::json;

namespace fleet_scale {
namespace {

using fleet::HostAnswer;
using std::chrono::milliseconds;
using std::chrono::steady_clock;

constexpr unsigned kAccepted = 202;
constexpr unsigned kDone = 200;
constexpr unsigned kNotFound = 404;
constexpr unsigned kConflict = 409;
constexpr unsigned kOtherJournal = 412;

std::string timeNow() {
    return text::utcTime(std::chrono::duration_cast<milliseconds>(
        std::chrono::system_clock::now().time_since_epoch()));
}

struct Task {
    json document;

    std::string state() const { return document.at("state"); }
    bool isOver() const { return state() != "queued" && state() != "running"; }
};

/// What a host with an agent tells: enough to be about as long as in earnest.
std::string inventory() {
    json products = json::array();
    for (const char* const code : {"ax", "lz", "ux"}) {
        products.push_back({{"PRODUCT", code},
                            {"VERSION", "060100000"},
                            {"RELEASE", "100"},
                            {"PLATFORM", "li6263"},
                            {"HOSTTYPE", "li6263"},
                            {"HOSTPC", "li6263"},
                            {"PRODDESC", "A simulated product"}});
    }
    return json({{"products", products},
                 {"instances", json::array({{{"product", "ux"}, {"state", "running"}}})},
                 {"warnings", json::array()}})
        .dump();
}

}  // namespace

/// What a host has on its disk, and whom it tells. The clock's thread uses it beside the link's.
class SimulatedHost::Journal : public std::enable_shared_from_this<Journal> {
public:
    Journal(SimulatedWorld& world, Events events)
        : world_(world), events_(std::move(events)), identity_(fleet::makeOrderId()) {}

    const std::string& identity() const { return identity_; }

    HostAnswer handOver(const fleet::HandOver& action) {
        HostAnswer answer = post(bodyOf(action));
        // A repetition is answered with the task that is there.
        if (answer.status != kAccepted) return answer;
        const std::lock_guard lock(mutex_);
        if (action.directive.number <= latest_) ++world_.outOfTurn;
        latest_ = action.directive.number;
        return answer;
    }

    /// POST /v1/tasks
    HostAnswer post(const std::string& body) {
        const json request = json::parse(body);
        const std::string order = request.at("transid");
        const std::lock_guard lock(mutex_);
        if (request.at("journal") != identity_) return {kOtherJournal, "{}"};
        const auto known = tasks_.find(order);
        if (known != tasks_.end()) return {kDone, known->second.document.dump()};
        Task& task = tasks_[order];
        task.document = {{"id", std::to_string(tasks_.size())},
                         {"transid", order},
                         {"command", request.value("command", "")},
                         {"product", request.value("product", "")},
                         {"state", "queued"},
                         {"accepted", timeNow()},
                         {"asker", {{"user", "zavlink"}, {"pid", 1}}},
                         {"reply", nullptr},
                         {"events", json::array()},
                         {"details", {{"commands", json::array()}}}};
        for (const char* const end : {"refused", "cancelled", "expired", "done"}) {
            if (!request.contains(end)) continue;
            task.document["state"] = end;
            task.document["reason"] = request[end];
            return {kDone, task.document.dump()};
        }
        begin(order);
        return {kAccepted, task.document.dump()};
    }

    /// GET /v1/tasks/{order}
    HostAnswer get(const std::string& order) const {
        const std::lock_guard lock(mutex_);
        const auto known = tasks_.find(order);
        if (known == tasks_.end()) return {kNotFound, "{}"};
        return {kDone, known->second.document.dump()};
    }

    /// POST /v1/tasks/{order}/cancel
    HostAnswer cancel(const std::string& order) {
        const std::lock_guard lock(mutex_);
        const auto known = tasks_.find(order);
        if (known == tasks_.end()) return {kNotFound, R"({"error":"there is no such task"})"};
        if (known->second.isOver()) return {kConflict, R"({"error":"it is over"})"};
        end(known->second, "cancelled");
        return {kDone, known->second.document.dump()};
    }

    std::vector<std::string> orders() const {
        const std::lock_guard lock(mutex_);
        std::vector<std::string> all;
        for (const auto& [order, task] : tasks_)
            all.push_back(order);
        return all;
    }

    void tellThere() {
        const std::lock_guard lock(mutex_);
        if (isOver_) return;
        std::set<std::string> unfinished;
        for (const auto& [order, task] : tasks_) {
            if (!task.isOver()) unfinished.insert(order);
        }
        events_.isThere(identity_, std::move(unfinished));
    }

    /// No event comes any more.
    void close() {
        const std::lock_guard lock(mutex_);
        isOver_ = true;
    }

private:
    /// Behind those that run already.
    void begin(const std::string& order) {
        idleAt_ = std::max(idleAt_, steady_clock::now()) + world_.taskTime;
        world_.clock.at(idleAt_, [weak = weak_from_this(), order] {
            if (const auto self = weak.lock()) self->run(order);
        });
    }

    void run(const std::string& order) {
        const std::lock_guard lock(mutex_);
        Task& task = tasks_.at(order);
        if (task.isOver()) return;
        ++world_.tasks;
        task.document["details"]["commands"].push_back(
            {{"command", "TovrinAgent start " + task.document.at("product").get<std::string>()},
             {"pid", 4711},
             {"started", timeNow()},
             {"ended", timeNow()},
             {"exit", 0},
             {"stdout", "The agent was started.\n"},
             {"stderr", ""}});
        end(task, "done");
    }

    void end(Task& task, const std::string& state) {
        task.document["state"] = state;
        task.document["ended"] = timeNow();
        if (isOver_) return;
        events_.tasksChanged();
        events_.ended(fleet::outcomeOf(task.document.dump(), identity_).value());
    }

    SimulatedWorld& world_;
    const Events events_;
    const std::string identity_;
    mutable std::mutex mutex_;
    std::map<std::string, Task> tasks_;
    steady_clock::time_point idleAt_{};
    fleet::Number latest_ = 0;  ///< of the orders that were handed over
    bool isOver_ = false;
};

SimulatedHost::SimulatedHost(SimulatedWorld& world, Events events)
    : journal_(std::make_shared<Journal>(world, std::move(events))) {
    journal_->tellThere();
}

SimulatedHost::~SimulatedHost() {
    journal_->close();
}

void SimulatedHost::handOver(const fleet::HandOver& action,
                             std::function<void(fleet::HandOverAnswer)> answer) {
    answer(fleet::recordedBy(journal_->handOver(action)).value());
}

void SimulatedHost::enter(const fleet::EnterEnd& action,
                          std::function<void(fleet::HandOverAnswer)> answer) {
    answer(fleet::recordedBy(journal_->post(bodyOf(action))).value());
}

void SimulatedHost::cancel(const std::string& order, const std::string&,
                           std::function<void(fleet::CancelAnswer)> answer) {
    const HostAnswer told = journal_->cancel(order);
    if (const std::optional<fleet::CancelAnswer> known = fleet::cancelledBy(told)) {
        return answer(*known);
    }
    answer(fleet::cancelledOf(journal_->get(order), told));
}

void SimulatedHost::lookUp(const std::string& order, const std::string&,
                           std::function<void(fleet::LookUpAnswer)> answer) {
    answer(fleet::lookUpOf(journal_->get(order), order, journal_->identity()));
}

void SimulatedHost::listOrders(
    const std::string&, std::function<void(std::optional<std::vector<std::string>>)> answer) {
    answer(journal_->orders());
}

void SimulatedHost::lookAgain() {
    journal_->tellThere();
}

void SimulatedHost::look(std::function<void(std::optional<fleet::HostLook>)> answer) {
    answer(fleet::HostLook{ZAV_VERSION, inventory()});
}

}  // namespace fleet_scale
