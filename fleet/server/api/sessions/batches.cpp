#include "fleet/server/api/sessions/batches.h"

#include <iterator>
#include <utility>

#include "fleet/bus/messages/order.h"

namespace fleet {

std::string Batches::open(const std::string& operatorKey, Moment now) {
    const std::lock_guard lock(mutex_);
    forgetUnused(now);
    std::size_t own = 0;
    auto oldest = batches_.end();
    for (auto batch = batches_.begin(); batch != batches_.end(); ++batch) {
        if (batch->second.operatorKey != operatorKey) continue;
        ++own;
        if (oldest == batches_.end() || batch->second.used < oldest->second.used) oldest = batch;
    }
    if (own >= kMostOfOperator) batches_.erase(oldest);
    if (batches_.size() >= kMostBatches) {
        throw BatchesFull("too many operators hand over orders just now; try again in a minute");
    }
    const std::string id = makeOrderId();
    batches_[id] = {operatorKey, now, 0, std::make_shared<Orders>()};
    return id;
}

std::optional<std::size_t> Batches::add(const std::string& operatorKey, const std::string& batch,
                                        Orders orders, Moment now) {
    const std::lock_guard lock(mutex_);
    Batch* const found = batchOf(operatorKey, batch, now);
    if (found == nullptr) return std::nullopt;
    std::size_t more = 0;
    for (const std::string& order : orders)
        more += order.size();
    std::size_t all = more;
    for (const auto& [id, other] : batches_)
        all += other.bytes;
    if (all > kMostBytes || found->orders->size() + orders.size() > kMostOrders) {
        throw BatchesFull("there is no room for so many orders");
    }
    found->bytes += more;
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

void Batches::forget(const std::string& operatorKey, const std::string& batch) {
    const std::lock_guard lock(mutex_);
    const auto found = batches_.find(batch);
    if (found != batches_.end() && found->second.operatorKey == operatorKey) batches_.erase(found);
}

bool Batches::beginChange(const std::string& operatorKey) {
    const std::lock_guard lock(mutex_);
    return changing_.insert(operatorKey).second;
}

void Batches::endChange(const std::string& operatorKey) {
    const std::lock_guard lock(mutex_);
    changing_.erase(operatorKey);
}

/// The caller holds the lock.
Batches::Batch* Batches::batchOf(const std::string& operatorKey, const std::string& batch,
                                 Moment now) {
    forgetUnused(now);
    const auto found = batches_.find(batch);
    if (found == batches_.end() || found->second.operatorKey != operatorKey) return nullptr;
    found->second.used = now;
    return &found->second;
}

void Batches::forgetUnused(Moment now) {
    for (auto batch = batches_.begin(); batch != batches_.end();)
        batch = batch->second.used + kUnusedTime < now ? batches_.erase(batch) : std::next(batch);
}

}  // namespace fleet
