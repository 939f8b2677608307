/// What the centre knows about roll-outs.
///
/// A roll-out gives one order to each of many hosts, a wave of them at a time. Each host has a
/// *part* in it. A part's order is *released* when it gets its number and so goes to the bus;
/// before that it never leaves the centre.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// Who asks for something.
struct RolloutOperator {
    std::string name;
    std::string key;  ///< the public key that signs his orders
};

/// How an operator wants his orders released.
struct RolloutPlan {
    std::string waves = "100%";           ///< see wavesOf()
    std::string maxFailures = "0";        ///< a Share: more failures than that pause the roll-out
    Moment pause{};                       ///< between the end of a wave and the release of the next
    std::optional<Moment> wait;           ///< a wave ends so long after its release at the latest
    std::optional<std::size_t> parallel;  ///< orders of one wave that are released and not over
};

/// The numbers are those of the database.
enum class RolloutState {
    Running = 0,
    Paused = 1,   ///< nothing is released; what was released goes on
    Aborted = 2,  ///< what was not released never will be
    Finished =
        3  ///< the last wave has ended; hosts that were away may still carry their orders out
};

/// Why a roll-out is paused. The numbers are those of the database.
enum class PauseCause {
    None = 0,
    Operator = 1,
    Failures = 2,  ///< more than the plan allows
    Expiry = 3,    ///< an order that was to be released is out of date and must be signed anew
    Restore = 4    ///< the database was put back and may have forgotten an abort
};

struct Rollout {
    std::int64_t row = 0;  ///< the store's own name for it, which grows
    std::string id;        ///< 32 hexadecimal digits in lower case
    RolloutOperator by;    ///< who made it
    std::string kind;      ///< what its orders do, and to which product
    std::string product;
    std::string selector;
    Moment created{};
    RolloutPlan plan;
    std::size_t hosts = 0;
    std::size_t mostFailures = 0;  ///< the plan's, in hosts

    RolloutState state = RolloutState::Running;
    PauseCause cause = PauseCause::None;
    std::string reason;             ///< why it is paused or aborted, for people
    Moment since{};                 ///< when it came into this state
    std::size_t waves = 0;          ///< how many there are
    std::size_t wave = 0;           ///< the latest one that was released, from 1; 0: none yet
    Moment began{};                 ///< when that was; anew when the wave goes on after a pause
    std::optional<Moment> waveEnd;  ///< when that wave ended
};

inline void enterState(Rollout& rollout, RolloutState state, Moment now,
                       PauseCause cause = PauseCause::None, const std::string& reason = "") {
    rollout.state = state;
    rollout.cause = cause;
    rollout.reason = reason;
    rollout.since = now;
}

/// The numbers are those of the database.
enum class PartState {
    Waiting = 0,   ///< not released
    Released = 1,  ///< the order has its number
    Over = 2       ///< it has ended, or was cancelled before it was released
};

/// The numbers are those of the database.
enum class FailureState {
    None = 0,
    Counts = 1,   ///< against what the plan allows
    Forgiven = 2  ///< an operator has seen it and let the roll-out go on
};

struct Part {
    std::int64_t rollout = 0;  ///< Rollout::row
    std::size_t place = 0;     ///< in the list of hosts, from 0
    std::string host;          ///< its bus key
    std::size_t wave = 0;      ///< the one in which it is released
    std::string order;         ///< the identifier of its latest order
    Moment expires{};          ///< until when that order may be carried out
    std::size_t tries = 1;     ///< orders that were signed for it, this one included
    PartState state = PartState::Waiting;
    Number number = 0;   ///< the order's; 0 before it is released, or if only the host knows it
    EndState end;        ///< how it ended; "" before that
    std::string reason;  ///< a few words about the end
    FailureState failure = FailureState::None;
    std::string cancel;  ///< the identifier of the order that cancels it; "" if there is none
};

/// No word of a host for so long: it is away.
constexpr Moment kAwayAfter{90 * 1000};

}  // namespace fleet
