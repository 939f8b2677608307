/// Asks the host what it is and what is installed there.
#pragma once

#include <atomic>
#include <functional>
#include <optional>
#include <string>

#include "fleet/link/facts/facts_teller.h"
#include "fleet/loop/worker.h"

namespace fleet {

/// Has a thread of its own, because the host runs a program for its inventory: orders do not wait
/// for that.
class InventorySide {
public:
    explicit InventorySide(std::string socket) : socket_(std::move(socket)) {}
    /// Ends what is under way within some seconds; no answer comes any more once it is over.
    ~InventorySide();
    InventorySide(const InventorySide&) = delete;
    InventorySide& operator=(const InventorySide&) = delete;

    /// The answer comes on the object's thread: nothing if the host has not answered. It must
    /// return soon and throw nothing.
    void look(std::function<void(std::optional<HostLook>)> answer);

private:
    HostLook lookNow() const;

    const std::string socket_;
    std::atomic<bool> isEnding_{false};
    Worker worker_;  ///< last: it uses everything above
};

}  // namespace fleet
