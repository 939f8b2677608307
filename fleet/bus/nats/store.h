/// Single messages in the streams of the bus. Both ends use this, each as far as its permissions
/// go.
///
/// All functions wait for the server and may be called from any thread.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/status.h"

namespace fleet {

struct StoreResult {
    enum class Kind {
        Stored,    ///< and acknowledged; not yet synced to disk
        Occupied,  ///< the last message on the subject is not the expected one; nothing has changed
        NoAnswer,  ///< it may have been stored
        Forbidden,  ///< the server does not allow it
        Refused     ///< the store does not take it: too large, no room
    };
    Kind kind = Kind::Stored;
    std::uint64_t sequence = 0;  ///< the message's, if stored
    int code = 0;                ///< the store's, if refused
    std::string text;            ///< for people, unless stored
};

/// Stores the bytes as the only message on the subject: nothing may be there. That says nothing of
/// what was there once and has been erased.
StoreResult storeFirst(Connection& connection, const std::string& subject, std::string_view bytes,
                       Connection::Milliseconds deadline);

struct StoreRequest {
    std::string subject;
    std::string_view bytes;
};
/// The same for several messages at once, of which each may fail by itself. Results in their order.
std::vector<StoreResult> storeFirst(Connection& connection,
                                    const std::vector<StoreRequest>& messages,
                                    Connection::Milliseconds deadline);

/// Stores the bytes if the last message on the subject has that sequence; 0 for none.
StoreResult storeAfter(Connection& connection, const std::string& subject, std::string_view bytes,
                       std::uint64_t lastSequence, Connection::Milliseconds deadline);

/// Stores the bytes behind whatever is there.
StoreResult store(Connection& connection, const std::string& subject, std::string_view bytes,
                  Connection::Milliseconds deadline);

struct LastResult {
    enum class Kind {
        Found,
        Missing,    ///< this server has none; another one of a cluster may know of it already
        NoAnswer,   ///< no answer, or no such stream
        Forbidden,  ///< the server does not allow it
        Refused     ///< the answer makes no sense
    };
    Kind kind = Kind::Found;
    std::uint64_t sequence = 0;
    std::string bytes;
    std::string storedAt;  ///< by the server's clock: "2026-11-22T20:22:18.414189655Z"
    std::string text;      ///< for people, unless found
};

/// The last message on a subject of a stream that allows direct reading.
LastResult lastOn(Connection& connection, const std::string& stream, const std::string& subject,
                  Connection::Milliseconds deadline);

/// The same for several subjects at once. Results in their order.
std::vector<LastResult> lastOn(Connection& connection, const std::string& stream,
                               const std::vector<std::string>& subjects,
                               Connection::Milliseconds deadline);

/// Removes several messages at once.
std::vector<BusStatus> erase(Connection& connection, const std::string& stream,
                             const std::vector<std::uint64_t>& sequences,
                             Connection::Milliseconds deadline);

/// Removes one message. One that is not there is Refused with 10057.
BusStatus erase(Connection& connection, const std::string& stream, std::uint64_t sequence,
                Connection::Milliseconds deadline);

}  // namespace fleet
