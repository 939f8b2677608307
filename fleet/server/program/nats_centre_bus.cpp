#include "fleet/server/program/nats_centre_bus.h"

#include <utility>

#include "fleet/bus/nats/store.h"
#include "fleet/bus/nats/streams.h"
#include "fleet/server/program/answer_time.h"

namespace fleet {
namespace {

/// The store's code for why it does not take a message.
bool isWantOfRoom(int code) {
    constexpr int kNoResources = 10023;
    constexpr int kTooLong = 10054;
    constexpr int kNoStorage = 10047;
    constexpr int kStoreFailed = 10077;  // the stream has reached a limit
    return code == kNoResources || code == kTooLong || code == kNoStorage || code == kStoreFailed;
}

}  // namespace

std::string taskSubject(const std::string& host, Number number) {
    return "task." + host + '.' + std::to_string(number);
}

NatsCentreBus::NatsCentreBus(Connection& connection, std::function<bool()> mayChange)
    : connection_(connection), mayChange_(std::move(mayChange)) {}

std::vector<StoreAnswer> NatsCentreBus::store(const std::vector<PlacedOrder>& orders) {
    std::vector<StoreAnswer> answers(orders.size(), Unanswered{});
    if (!mayChange_()) return answers;
    std::vector<StoreRequest> requests;
    for (const PlacedOrder& order : orders)
        requests.push_back({taskSubject(order.place.host, order.place.number), order.bytes});
    const std::vector<StoreResult> results = storeFirst(connection_, requests, kAnswerTime);
    for (std::size_t i = 0; i < orders.size(); ++i) {
        if (results[i].kind == StoreResult::Kind::Stored) {
            answers[i] = Stored{};
        } else if (results[i].kind == StoreResult::Kind::Occupied) {
            answers[i] = Occupied{};
        } else if (results[i].kind == StoreResult::Kind::Refused && isWantOfRoom(results[i].code)) {
            answers[i] = NoRoom{};
        }
    }
    return answers;
}

std::vector<FetchAnswer> NatsCentreBus::fetch(const std::vector<OrderPlace>& places) {
    std::vector<std::string> subjects;
    for (const OrderPlace& place : places)
        subjects.push_back(taskSubject(place.host, place.number));
    std::vector<FetchAnswer> answers;
    for (LastResult& found : lastOn(connection_, kTasksStream, subjects, kAnswerTime)) {
        if (found.kind == LastResult::Kind::Found) {
            answers.emplace_back(StoredOrder{found.sequence, std::move(found.bytes)});
        } else if (found.kind == LastResult::Kind::Missing) {
            answers.emplace_back(NotThere{});
        } else {
            answers.emplace_back(Unanswered{});
        }
    }
    return answers;
}

void NatsCentreBus::erase(const std::vector<std::uint64_t>& sequences) {
    if (!mayChange_()) return;
    static_cast<void>(fleet::erase(connection_, kTasksStream, sequences, kAnswerTime));
}

}  // namespace fleet
