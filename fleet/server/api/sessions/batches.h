/// Signed orders on their way: a roll-out to ten thousand hosts does not fit into one request.
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// There is no room; what() is for the operator.
class BatchesFull : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Only in memory: orders that no roll-out has taken are worth nothing. Any thread.
class Batches {
public:
    using Orders = std::vector<std::string>;
    static constexpr Moment kUnusedTime = std::chrono::minutes(10);
    static constexpr std::size_t kMostBatches = 16;
    static constexpr std::size_t kMostOfOperator = 4;
    static constexpr std::size_t kMostOrders = 100'000;
    static constexpr std::size_t kMostBytes = std::size_t{192} << 20;  ///< of all batches

    /// A new batch; an operator who has many loses the one that was used least lately. Throws
    /// BatchesFull if others have too many.
    std::string open(const std::string& operatorKey, Moment now);
    /// Returns how many there are now; nothing if the operator has no such batch. Throws
    /// BatchesFull, and then has taken none of them.
    std::optional<std::size_t> add(const std::string& operatorKey, const std::string& batch,
                                   Orders orders, Moment now);
    /// The orders, in the order in which they came. The batch stays. Null if there is none.
    std::shared_ptr<const Orders> find(const std::string& operatorKey, const std::string& batch,
                                       Moment now);
    void forget(const std::string& operatorKey, const std::string& batch);

    /// Notes that the operator changes something now; false if one such change is under way.
    bool beginChange(const std::string& operatorKey);
    void endChange(const std::string& operatorKey);

private:
    struct Batch {
        std::string operatorKey;
        Moment used{};
        std::size_t bytes = 0;
        std::shared_ptr<Orders> orders;
    };
    Batch* batchOf(const std::string& operatorKey, const std::string& batch, Moment now);
    void forgetUnused(Moment now);

    std::mutex mutex_;
    std::map<std::string, Batch> batches_;  ///< by their identifiers
    std::set<std::string> changing_;        ///< keys of operators
};

}  // namespace fleet
