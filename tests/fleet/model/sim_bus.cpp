#include "tests/fleet/model/sim_bus.h"

#include <algorithm>

namespace model {

void SimBus::loseDisks() {
    disk_ = synced_ = Disk{};
    acknowledged_ = 0;
}

bool SimBus::store(const std::string& host, fleet::Number number, const std::string& bytes) {
    const auto [place, isNew] = disk_.tasks.try_emplace({host, number});
    if (isNew) place->second = {++disk_.lastTask, bytes};
    return isNew;
}

std::optional<StoredMessage> SimBus::fetch(const std::string& host, fleet::Number number) const {
    const auto place = disk_.tasks.find({host, number});
    if (place == disk_.tasks.end()) return std::nullopt;
    return place->second;
}

void SimBus::erase(std::uint64_t sequence) {
    for (auto task = disk_.tasks.begin(); task != disk_.tasks.end(); ++task) {
        if (task->second.sequence != sequence) continue;
        disk_.tasks.erase(task);
        return;
    }
}

void SimBus::publish(const fleet::Outcome& outcome) {
    disk_.outs.emplace_back(++disk_.lastOut, outcome);
    const auto isHosts = [&](const auto& out) { return out.second.host == outcome.host; };
    const auto count = std::count_if(disk_.outs.begin(), disk_.outs.end(), isHosts);
    if (static_cast<std::size_t>(count) <= kOutcomesPerHost) return;
    disk_.outs.erase(std::find_if(disk_.outs.begin(), disk_.outs.end(), isHosts));
}

std::optional<std::pair<std::uint64_t, fleet::Outcome>> SimBus::nextOutcome() const {
    for (const auto& out : disk_.outs) {
        if (out.first > acknowledged_) return out;
    }
    return std::nullopt;
}

/// Each of those that were asked together may be lost by itself, and the centre may be killed
/// between any two of them.
std::vector<fleet::StoreAnswer> SimCentreBus::store(const std::vector<fleet::PlacedOrder>& orders) {
    std::vector<fleet::StoreAnswer> answers;
    for (const fleet::PlacedOrder& order : orders)
        answers.push_back(storeOne(order));
    return answers;
}

std::vector<fleet::FetchAnswer> SimCentreBus::fetch(const std::vector<fleet::OrderPlace>& places) {
    std::vector<fleet::FetchAnswer> answers;
    for (const fleet::OrderPlace& place : places)
        answers.push_back(fetchOne(place));
    return answers;
}

void SimCentreBus::erase(const std::vector<std::uint64_t>& sequences) {
    for (const std::uint64_t sequence : sequences)
        eraseOne(sequence);
}

fleet::StoreAnswer SimCentreBus::storeOne(const fleet::PlacedOrder& order) {
    const auto& [host, number] = order.place;
    if (dice_.fault(2)) throw Killed{};
    if (dice_.fault(3)) return fleet::Unanswered{};
    const bool isNew = bus_.store(host, number, order.bytes);
    if (isNew) republish(host, number);
    if (dice_.fault(2)) throw Killed{};
    if (dice_.fault(5)) return fleet::Unanswered{};
    if (isNew) return fleet::Stored{};
    return fleet::Occupied{};
}

fleet::FetchAnswer SimCentreBus::fetchOne(const fleet::OrderPlace& place) {
    if (dice_.fault(2)) throw Killed{};
    if (dice_.fault(5)) return fleet::Unanswered{};
    const std::optional<StoredMessage> message = bus_.fetch(place.host, place.number);
    // Between the two requests of a removal the bus may lose its newest messages, so that the
    // sequence names another message when it is used.
    if (dice_.fault(1)) bus_.losePower();
    if (!message || dice_.fault(2)) return fleet::NotThere{};
    return fleet::StoredOrder{message->sequence, message->bytes};
}

void SimCentreBus::eraseOne(std::uint64_t sequence) {
    if (dice_.fault(2)) throw Killed{};
    if (dice_.fault(5)) return;
    bus_.erase(sequence);
    if (dice_.fault(2)) throw Killed{};
}

}  // namespace model
