/// Takes what hosts have published from the bus.
#pragma once

#include <atomic>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/pull.h"

namespace fleet {

/// A thread that takes what hosts have published on a stream's subjects, such as "out.HOST", hands
/// it on, and acknowledges it to the bus once it has been dealt with: what is not comes again.
class HostFeed {
public:
    /// Where it comes from.
    struct Source {
        std::string stream;
        std::string subject;  ///< before a host's key: "out."
        std::string what;     ///< for people
    };
    /// Signed bytes from the host of this bus key, which nobody has looked at.
    struct Told {
        std::string host;
        std::string bytes;
    };
    /// Deals with them, durably, and returns true; false if they are to come again. On the feed's
    /// thread.
    using Take = std::function<bool(std::vector<Told>)>;

    /// The connection outlives it.
    HostFeed(Connection& connection, Source source, Take take);
    /// Waits until take() has returned, and for the bus for some seconds.
    ~HostFeed();
    HostFeed(const HostFeed&) = delete;
    HostFeed& operator=(const HostFeed&) = delete;

private:
    void work();
    std::unique_ptr<Pull> opened();
    void handOn(Pull& pull, const std::vector<Pull::Taken>& messages);

    Connection& connection_;
    const Source source_;
    const Take take_;
    std::atomic<bool> isEnding_{false};
    std::thread thread_;  ///< last: it uses everything above
};

}  // namespace fleet
