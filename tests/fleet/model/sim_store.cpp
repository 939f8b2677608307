#include "tests/fleet/model/sim_store.h"

#include <algorithm>
#include <cstddef>
#include <tuple>

namespace model {

void SimStore::mayDie() const {
    if (dice_.fault(1)) throw Killed{};
}

std::optional<fleet::HostRecord> SimStore::host(const std::string& host) const {
    const auto record = tables.hosts.find(host);
    if (record == tables.hosts.end()) return std::nullopt;
    return record->second;
}

void SimStore::keepHost(const fleet::HostRecord& record) {
    mayDie();
    tables.hosts[record.host] = record;
    mayDie();
}

std::optional<fleet::Number> SimStore::give(const std::string& host, const std::string& order,
                                            const std::function<std::string(fleet::Number)>& seal) {
    mayDie();
    const auto record = tables.hosts.find(host);
    if (record == tables.hosts.end()) return std::nullopt;
    const auto known = tables.orders.find({host, order});
    if (known != tables.orders.end()) return known->second.number;
    fleet::OrderRecord given;
    given.host = host;
    given.number = record->second.last + 1;
    given.order = order;
    given.bytes = seal(given.number);
    record->second.last = given.number;
    tables.orders[{host, order}] = given;
    mayDie();
    return given.number;
}

void SimStore::adopt(const fleet::OrderRecord& order) {
    mayDie();
    if (tables.hosts.count(order.host) == 0) return;
    const auto [known, isNew] = tables.orders.try_emplace({order.host, order.order}, order);
    if (!isNew && known->second.number == 0) {
        known->second.number = order.number;
        known->second.bytes = order.bytes;
    }
    mayDie();
}

std::optional<fleet::OrderRecord> SimStore::order(const std::string& host,
                                                  const std::string& order) const {
    const auto found = tables.orders.find({host, order});
    if (found == tables.orders.end()) return std::nullopt;
    return found->second;
}

fleet::OrderRecord* SimStore::at(const std::string& host, fleet::Number number) {
    for (auto& [place, order] : tables.orders) {
        if (place.first == host && order.number == number) return &order;
    }
    return nullptr;
}

std::optional<fleet::OrderRecord> SimStore::orderAt(const std::string& host,
                                                    fleet::Number number) const {
    for (const auto& [place, order] : tables.orders) {
        if (place.first == host && order.number == number) return order;
    }
    return std::nullopt;
}

std::vector<fleet::OrderRecord> SimStore::unpublished(std::size_t most, std::size_t skipped) const {
    std::vector<fleet::OrderRecord> orders;
    for (const auto& [place, order] : tables.orders) {
        if (order.isPublished || order.outcome || order.number == 0) continue;
        if (!tables.hosts.at(place.first).unpublished.empty()) continue;
        orders.push_back(order);
    }
    std::sort(orders.begin(), orders.end(), [](const auto& a, const auto& b) {
        return std::tie(a.number, a.host) < std::tie(b.number, b.host);
    });
    orders.erase(orders.begin(),
                 orders.begin() + static_cast<std::ptrdiff_t>(std::min(skipped, orders.size())));
    if (orders.size() > most) orders.resize(most);
    return orders;
}

void SimStore::notePublished(const std::string& host, fleet::Number number) {
    mayDie();
    at(host, number)->isPublished = true;
    mayDie();
}

std::vector<fleet::OpenOrder> SimStore::open(const std::string& host, fleet::Number from,
                                             fleet::Number upTo, std::size_t most) const {
    std::vector<fleet::OpenOrder> orders;
    for (const auto& [place, order] : tables.orders) {
        if (place.first != host || order.outcome) continue;
        if (order.number < from || order.number > upTo) continue;
        orders.push_back({order.number, order.order, order.isPublished});
    }
    std::sort(orders.begin(), orders.end(),
              [](const auto& a, const auto& b) { return a.number < b.number; });
    if (orders.size() > most) orders.resize(most);
    return orders;
}

void SimStore::keepOutcome(const fleet::Outcome& outcome) {
    mayDie();
    tables.orders.at({outcome.host, outcome.order}).outcome = outcome;
    mayDie();
}

void SimStore::skipNumbers(fleet::Number count, fleet::Number atLeast, fleet::Moment listUntil) {
    for (auto& [key, host] : tables.hosts) {
        host.last = std::max(host.last + count, atLeast);
        host.unpublished.clear();
    }
    tables.listUntil = listUntil;
}

std::vector<fleet::OrderRecord> SimStore::orders() const {
    std::vector<fleet::OrderRecord> orders;
    for (const auto& [place, order] : tables.orders)
        orders.push_back(order);
    return orders;
}

bool SimStore::isAllOver() const {
    return std::all_of(tables.orders.begin(), tables.orders.end(),
                       [](const auto& order) { return order.second.outcome.has_value(); });
}

}  // namespace model
