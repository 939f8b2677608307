/// Messages of a stream that are taken one after the other, each until it is acknowledged.
#pragma once

#include <condition_variable>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/status.h"

namespace fleet {

struct PullSettings {
    std::string stream;
    std::string name;  ///< the server keeps under it what has been acknowledged; one token
    /// What has been delivered and neither acknowledged nor refused by then comes again.
    Connection::Milliseconds acknowledgeWithin = std::chrono::seconds(30);
    int unacknowledged = 1000;  ///< no more are delivered while there are as many
};

/// Takes messages of a stream. One thread at a time. The connection must outlive it.
class Pull {
public:
    struct Result;

    /// Makes the consumer at the server, if it is missing, and subscribes to what it will deliver.
    /// Waits for the server.
    static Result open(Connection& connection, const PullSettings& settings,
                       Connection::Milliseconds deadline);

    ~Pull();
    Pull(const Pull&) = delete;
    Pull& operator=(const Pull&) = delete;

    struct Taken {
        std::string subject;
        std::string bytes;
        std::string acknowledgeTo;  ///< for acknowledge() and refuse()
    };
    struct Batch {
        /// NoAnswer: the server is away, or has no such consumer any more.
        BusStatus status;
        std::vector<Taken> messages;
    };
    /// What there is now, `most` at most; if there is nothing, what comes first within the wait. An
    /// empty batch that is done says that nothing has come. Takes up to `deadline` more if the
    /// server is slow.
    Batch fetch(int most, Connection::Milliseconds wait, Connection::Milliseconds deadline);

    /// Says that it need not come again. An acknowledgement may be lost: then it does.
    BusStatus acknowledge(const Taken& message);
    /// Asks for it again, soon.
    BusStatus refuse(const Taken& message);

private:
    Pull(Connection& connection, const PullSettings& settings, std::string inbox);
    void receive(const BusMessage& message);
    Batch ask(const std::string& request, std::size_t most, Connection::Milliseconds within);

    Connection& connection_;
    const std::string next_;  ///< where messages are asked for
    const std::string inbox_;
    std::uint64_t asked_ = 0;

    std::mutex mutex_;
    std::condition_variable changed_;
    std::deque<Taken> received_;
    std::uint64_t endedBy_ = 0;  ///< the newest request that the server has ended

    std::unique_ptr<Subscription> subscription_;  ///< ends first
};

struct Pull::Result {
    BusStatus status;
    std::unique_ptr<Pull> pull;  ///< none unless it is done
};

}  // namespace fleet
