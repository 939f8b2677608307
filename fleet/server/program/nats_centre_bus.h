/// The bus of a centre.
#pragma once

#include <functional>
#include <string>

#include "fleet/bus/nats/connection.h"
#include "fleet/server/core/centre_bus.h"

namespace fleet {

/// Stores and removes orders on the bus. The connection outlives it.
class NatsCentreBus : public CentreBus {
public:
    /// `mayChange` tells whether this centre is still the one that works; otherwise nothing is
    /// changed on the bus, and nothing is answered.
    NatsCentreBus(Connection& connection, std::function<bool()> mayChange);

    StoreAnswer store(const std::string& host, Number number, const std::string& bytes) override;
    FetchAnswer fetch(const std::string& host, Number number) override;
    void erase(std::uint64_t sequence) override;

    /// Why the last try to store was not answered; "" if it was.
    const std::string& trouble() const { return trouble_; }

private:
    Connection& connection_;
    const std::function<bool()> mayChange_;
    std::string trouble_;
};

/// "task.HOST.NUMBER", where the order with this number is stored.
std::string taskSubject(const std::string& host, Number number);

}  // namespace fleet
