/// The bus: it keeps, forgets, lags and loses.
#pragma once

#include <algorithm>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "fleet/bus/messages/outcome.h"
#include "fleet/server/core/centre_bus.h"
#include "tests/fleet/model/dice.h"

namespace model {

struct StoredMessage {
    std::uint64_t sequence;
    std::string bytes;
};
using Place = std::pair<std::string, fleet::Number>;

/// What a server has on its disk.
struct Disk {
    std::map<Place, StoredMessage> tasks;
    std::uint64_t lastTask = 0;
    std::deque<std::pair<std::uint64_t, fleet::Outcome>> outs;
    std::uint64_t lastOut = 0;
};

class SimBus {
public:
    explicit SimBus(Dice& dice) : dice_(dice) {}

    /// The server has synced its files now.
    void sync() { synced_ = disk_; }
    /// What was not synced is lost. Of the consumer of outcomes the newer file is kept.
    void losePower() { disk_ = synced_; }
    /// All streams are gone; the centre makes them again.
    void loseDisks();

    bool store(const std::string& host, fleet::Number number, const std::string& bytes);
    std::optional<StoredMessage> fetch(const std::string& host, fleet::Number number) const;
    void erase(std::uint64_t sequence);

    void publish(const fleet::Outcome& outcome);
    /// The next outcome that is not acknowledged.
    std::optional<std::pair<std::uint64_t, fleet::Outcome>> nextOutcome() const;
    void acknowledge(std::uint64_t sequence) { acknowledged_ = std::max(acknowledged_, sequence); }

    const std::map<Place, StoredMessage>& tasks() const { return disk_.tasks; }

private:
    static constexpr std::size_t kOutcomesPerHost = 64;

    Dice& dice_;
    Disk disk_;
    Disk synced_;
    std::uint64_t acknowledged_ = 0;
};

/// The centre's side of it, where answers get lost and the centre is killed.
class SimCentreBus : public fleet::CentreBus {
public:
    SimCentreBus(SimBus& bus, Dice& dice) : bus_(bus), dice_(dice) {}

    std::vector<fleet::StoreAnswer> store(const std::vector<fleet::PlacedOrder>& orders) override;
    std::vector<fleet::FetchAnswer> fetch(const std::vector<fleet::OrderPlace>& places) override;
    void erase(const std::vector<std::uint64_t>& sequences) override;

    /// Called for each order that the bus has newly stored: it is republished.
    std::function<void(const std::string&, fleet::Number)> republish;

private:
    fleet::StoreAnswer storeOne(const fleet::PlacedOrder& order);
    fleet::FetchAnswer fetchOne(const fleet::OrderPlace& place);
    void eraseOne(std::uint64_t sequence);

    SimBus& bus_;
    Dice& dice_;
};

}  // namespace model
