/// Takes outcomes from the bus.
#pragma once

#include <atomic>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/pull.h"

namespace fleet {

/// A thread that takes what hosts have published on "out.HOST", hands it on, and acknowledges it to
/// the bus once it has been dealt with: what is not comes again.
class OutcomeFeed {
public:
    /// Signed bytes from the host of this bus key, which nobody has looked at.
    struct Told {
        std::string host;
        std::string bytes;
    };
    /// Deals with them, durably, and returns true; false if they are to come again. On the feed's
    /// thread.
    using Take = std::function<bool(std::vector<Told>)>;

    /// The connection outlives it.
    OutcomeFeed(Connection& connection, Take take);
    /// Waits until take() has returned, and for the bus for some seconds.
    ~OutcomeFeed();
    OutcomeFeed(const OutcomeFeed&) = delete;
    OutcomeFeed& operator=(const OutcomeFeed&) = delete;

private:
    void work();
    std::unique_ptr<Pull> opened();
    void handOn(Pull& pull, const std::vector<Pull::Taken>& messages);

    Connection& connection_;
    const Take take_;
    std::atomic<bool> isEnding_{false};
    std::thread thread_;  ///< last: it uses everything above
};

}  // namespace fleet
