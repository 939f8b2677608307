/// The streams of a fleet. The centre makes those that are missing.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/status.h"

namespace fleet {

inline constexpr char kTasksStream[] = "TASKS";
inline constexpr char kOutStream[] = "OUT";
inline constexpr char kHostsStream[] = "KV_HOSTS";
inline constexpr char kCentreStream[] = "KV_CENTRE";

/// Before a host's key: where it tells about itself.
inline constexpr char kFactsSubject[] = "$KV.HOSTS.";

/// What the operator of a fleet chooses.
struct StreamLimits {
    std::int64_t tasksBytes = 0;  ///< all orders together; new ones are refused when it is full
    int replicas = 1;             ///< how many servers of a cluster have each message
};

/// What a stream is to be like: an object of the store's interface, in JSON.
struct StreamSettings {
    std::string name;
    std::string json;
};

/// "task.HOST.NUMBER": one message each, which is never replaced by storeFirst(), read directly,
/// and published again on "rp.task.HOST.NUMBER" when it is stored.
StreamSettings tasksStream(const StreamLimits& limits);

/// "out.HOST": the last 64 messages of each host, 256 KiB at most. A message's identifier
/// suppresses others with the same one, whoever sent them, for as short as the server allows, which
/// is 100 ms: nobody may use one, and a host that does can only delay others, who publish again.
StreamSettings outStream(const StreamLimits& limits);

/// "$KV.HOSTS.HOST": the last message of each, 64 KiB at most. No header makes it drop others.
StreamSettings hostsStream(const StreamLimits& limits);

/// "$KV.CENTRE.NAME": what centres tell each other, above all which of them works.
StreamSettings centreStream(const StreamLimits& limits);

struct EnsureResult {
    BusStatus status;
    bool made = false;  ///< it was missing
    /// Where one that is there is another than wanted: "max_msgs is 5, not -1". Nothing is changed.
    std::vector<std::string> differences;
};

/// Makes the stream if it is missing. Waits for the server. For any thread.
EnsureResult ensureStream(Connection& connection, const StreamSettings& settings,
                          Connection::Milliseconds deadline);

struct SubjectsResult {
    BusStatus status;
    std::vector<std::string> subjects;
};

/// The subjects of a stream on which there are messages, as far as they match the filter. Waits for
/// the server, for each 100,000 of them once. For any thread.
SubjectsResult subjectsOf(Connection& connection, const std::string& stream,
                          const std::string& filter, Connection::Milliseconds deadline);

}  // namespace fleet
