/// The bus of a centre.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "fleet/bus/nats/connection.h"
#include "fleet/server/core/centre_bus.h"

namespace fleet {

/// Stores and removes orders on the bus. The connection outlives it.
class NatsCentreBus : public CentreBus {
public:
    /// `mayChange` tells whether this centre is still the one that works; otherwise nothing is
    /// changed on the bus, and nothing is answered.
    NatsCentreBus(Connection& connection, std::function<bool()> mayChange);

    std::vector<StoreAnswer> store(const std::vector<PlacedOrder>& orders) override;
    std::vector<FetchAnswer> fetch(const std::vector<OrderPlace>& places) override;
    void erase(const std::vector<std::uint64_t>& sequences) override;

private:
    Connection& connection_;
    const std::function<bool()> mayChange_;
};

/// "task.HOST.NUMBER", where the order with this number is stored.
std::string taskSubject(const std::string& host, Number number);

}  // namespace fleet
