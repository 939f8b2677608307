#include "fleet/server/program/nats_centre_bus.h"

#include <chrono>
#include <utility>

#include "fleet/bus/nats/store.h"
#include "fleet/bus/nats/streams.h"

namespace fleet {
namespace {

constexpr std::chrono::seconds kAnswerTime{5};

}  // namespace

std::string taskSubject(const std::string& host, Number number) {
    return "task." + host + '.' + std::to_string(number);
}

NatsCentreBus::NatsCentreBus(Connection& connection, std::function<bool()> mayChange)
    : connection_(connection), mayChange_(std::move(mayChange)) {}

StoreAnswer NatsCentreBus::store(const std::string& host, Number number, const std::string& bytes) {
    if (!mayChange_()) return Unanswered{};
    StoreResult result = storeFirst(connection_, taskSubject(host, number), bytes, kAnswerTime);
    trouble_.clear();
    if (result.kind == StoreResult::Kind::Stored) return Stored{};
    if (result.kind == StoreResult::Kind::Occupied) return Occupied{};
    trouble_ = std::move(result.text);
    return Unanswered{};
}

FetchAnswer NatsCentreBus::fetch(const std::string& host, Number number) {
    LastResult found = lastOn(connection_, kTasksStream, taskSubject(host, number), kAnswerTime);
    if (found.kind == LastResult::Kind::Missing) return NotThere{};
    if (found.kind != LastResult::Kind::Found) return Unanswered{};
    return StoredOrder{found.sequence, std::move(found.bytes)};
}

void NatsCentreBus::erase(std::uint64_t sequence) {
    if (!mayChange_()) return;
    static_cast<void>(fleet::erase(connection_, kTasksStream, sequence, kAnswerTime));
}

}  // namespace fleet
