/// How many requests are under way.
#pragma once

#include <atomic>
#include <memory>

namespace console {

/// A page that asks and goes away must not keep those from their turn who want something done. Any
/// thread.
class Turns {
public:
    /// Held as long as a request that only reads is under way; null if too many are.
    std::shared_ptr<void> beginRead();
    /// Held as long as a request is under way that may change something.
    std::shared_ptr<void> beginChange();

    /// Whether no request is under way that may change something.
    bool quiet() const { return *changes_ == 0; }

private:
    using Count = std::shared_ptr<std::atomic<int>>;

    static std::shared_ptr<void> counted(Count count);

    const Count reads_ = std::make_shared<std::atomic<int>>(0);
    const Count changes_ = std::make_shared<std::atomic<int>>(0);
};

}  // namespace console
