/// Who of several may work: a message that its holder renews.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>

#include "fleet/bus/nats/connection.h"
#include "fleet/bus/nats/store.h"

namespace fleet {

/// A claim to a lease, by compare-and-set on one subject of a stream. One thread at a time. The
/// connection must outlive it.
///
/// How old somebody else's lease is, each measures by its own clock that never goes back, from when
/// it first saw it: the clocks of two machines need not agree. So whoever comes new waits for a
/// whole term. It knows its own by a mark that no other claim has: one that was stored and whose
/// acknowledgement was lost stands in nobody's way, least of all in its own.
class Lease {
public:
    using Clock = std::chrono::steady_clock;
    using Now = std::function<Clock::time_point()>;

    struct Settings {
        std::string stream;                                        ///< allows direct reading
        std::string subject;                                       ///< one of the stream's
        std::string holder;                                        ///< who claims it, for people
        Connection::Milliseconds term = std::chrono::seconds(30);  ///< it is free when it is older
        Connection::Milliseconds deadline = std::chrono::seconds(5);  ///< for each request
    };

    explicit Lease(Connection& connection, Settings settings, Now now = &Clock::now);

    struct State {
        enum class Kind {
            Ours,
            Others,  ///< somebody else has it, or has been faster
            Unknown  ///< the bus gives no answer, or refuses
        };
        Kind kind = Kind::Unknown;
        std::string holder;               ///< who has it, if others do and it is known
        Connection::Milliseconds age{0};  ///< since when it is known to be unchanged
        std::string text;                 ///< for people, unless ours
    };

    /// Claims it if it is free, and says who has it otherwise. Call it again until it is ours.
    State claim();

    /// Renews what is ours. Others means: it is lost, stop and claim it anew. After Unknown it may
    /// be asked for again, for as long as the term since the last renewal that was answered lasts:
    /// a renewal that was stored and whose acknowledgement was lost is found to be ours.
    State renew();

    /// Gives it up, so that nobody has to wait for a term.
    void release();

private:
    State storeOver(std::uint64_t sequence);
    State renewFound();

    Connection& connection_;
    const Settings settings_;
    const Now now_;
    const std::string record_;  ///< what is stored: the holder, and the mark in a line of its own
    std::uint64_t ours_ = 0;    ///< the sequence under which it is ours; 0 if it is not
    std::uint64_t seen_ = 0;    ///< somebody else's, at the last claim
    Clock::time_point seenSince_{};
};

}  // namespace fleet
