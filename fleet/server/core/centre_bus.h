/// The bus as the centre sees it.
#pragma once

#include <cstdint>
#include <string>
#include <variant>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// The bus has it, as far as it says.
struct Stored {};
/// Another message stands at that subject already.
struct Occupied {};
/// Nobody knows whether it arrived.
struct Unanswered {};
using StoreAnswer = std::variant<Stored, Occupied, Unanswered>;

/// A message of the bus, with the place that it has there now.
struct StoredOrder {
    std::uint64_t sequence = 0;
    std::string bytes;
};
/// The bus has no such message.
struct NotThere {};
using FetchAnswer = std::variant<StoredOrder, NotThere, Unanswered>;

/// Blocks until the bus has answered or a deadline has passed. One thread at a time.
class CentreBus {
public:
    virtual ~CentreBus() = default;

    /// Publishes an order, if no message stands at its subject.
    virtual StoreAnswer store(const std::string& host, Number number, const std::string& bytes) = 0;
    virtual FetchAnswer fetch(const std::string& host, Number number) = 0;
    /// Removes the message at this place. An unanswered try is repeated by the next sweep.
    virtual void erase(std::uint64_t sequence) = 0;
};

}  // namespace fleet
