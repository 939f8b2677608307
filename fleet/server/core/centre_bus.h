/// The bus as the centre sees it.
#pragma once

#include <cstdint>
#include <string>
#include <tuple>
#include <variant>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// The bus has it, as far as it says.
struct Stored {};
/// Another message stands at that subject already.
struct Occupied {};
/// The bus does not take it at present: it is full, or has no room for so long a message.
struct NoRoom {};
/// Nobody knows whether it arrived.
struct Unanswered {};
using StoreAnswer = std::variant<Stored, Occupied, NoRoom, Unanswered>;

/// A message of the bus, with the place that it has there now.
struct StoredOrder {
    std::uint64_t sequence = 0;
    std::string bytes;
};
/// The bus has no such message.
struct NotThere {};
using FetchAnswer = std::variant<StoredOrder, NotThere, Unanswered>;

/// Where an order stands on the bus: its host's bus key, and its number.
struct OrderPlace {
    std::string host;
    Number number = 0;

    bool operator<(const OrderPlace& other) const {
        return std::tie(host, number) < std::tie(other.host, other.number);
    }
};

struct PlacedOrder {
    OrderPlace place;
    std::string bytes;
};

/// Blocks until the bus has answered all of what it was asked, or a deadline has passed. Each
/// function asks for several things together, because the way to the bus and back costs more than
/// what is done there; each of them may succeed or fail by itself. Answers are in the order of what
/// was asked. One thread at a time.
class CentreBus {
public:
    virtual ~CentreBus() = default;

    /// Publishes orders, each if no message stands at its place.
    virtual std::vector<StoreAnswer> store(const std::vector<PlacedOrder>& orders) = 0;
    virtual std::vector<FetchAnswer> fetch(const std::vector<OrderPlace>& places) = 0;
    /// Removes the messages at these places of the bus's own. An unanswered try is repeated by the
    /// next sweep.
    virtual void erase(const std::vector<std::uint64_t>& sequences) = 0;
};

}  // namespace fleet
