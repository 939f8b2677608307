#include "fleet/server/api/sessions/batches.h"

#include <iterator>
#include <utility>

#include "fleet/bus/messages/order.h"

namespace fleet {

std::string Batches::open(const std::string& operatorKey, Moment now) {
    const std::lock_guard lock(mutex_);
    forgetUnused(now);
    if (batches_.count(operatorKey) == 0 && batches_.size() >= kMostBatches) {
        throw BatchesFull("too many operators hand over orders just now; try again in a minute");
    }
    const std::string id = makeOrderId();
    batches_[operatorKey] = {id, now, 0, std::make_shared<Orders>()};
    return id;
}

std::optional<std::size_t> Batches::add(const std::string& operatorKey, const std::string& batch,
                                        Orders orders, Moment now) {
    const std::lock_guard lock(mutex_);
    Batch* const found = batchOf(operatorKey, batch, now);
    if (found == nullptr) return std::nullopt;
    std::size_t bytes = found->bytes;
    for (const std::string& order : orders)
        bytes += order.size();
    if (bytes > kMostBytes || found->orders->size() + orders.size() > kMostOrders) {
        throw BatchesFull("a roll-out to so many hosts is refused");
    }
    found->bytes = bytes;
    // Somebody may be reading them.
    if (found->orders.use_count() > 1) found->orders = std::make_shared<Orders>(*found->orders);
    found->orders->insert(found->orders->end(), std::make_move_iterator(orders.begin()),
                          std::make_move_iterator(orders.end()));
    return found->orders->size();
}

std::shared_ptr<const Batches::Orders> Batches::find(const std::string& operatorKey,
                                                     const std::string& batch, Moment now) {
    const std::lock_guard lock(mutex_);
    const Batch* const found = batchOf(operatorKey, batch, now);
    return found == nullptr ? nullptr : found->orders;
}

void Batches::forget(const std::string& operatorKey) {
    const std::lock_guard lock(mutex_);
    batches_.erase(operatorKey);
}

/// The caller holds the lock.
Batches::Batch* Batches::batchOf(const std::string& operatorKey, const std::string& batch,
                                 Moment now) {
    forgetUnused(now);
    const auto found = batches_.find(operatorKey);
    if (found == batches_.end() || found->second.id != batch) return nullptr;
    found->second.used = now;
    return &found->second;
}

void Batches::forgetUnused(Moment now) {
    for (auto batch = batches_.begin(); batch != batches_.end();)
        batch = batch->second.used + kUnusedTime < now ? batches_.erase(batch) : std::next(batch);
}

}  // namespace fleet
