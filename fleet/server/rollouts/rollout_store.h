/// Where the records of roll-outs are: beside those of hosts and orders.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "fleet/bus/messages/outcome.h"
#include "fleet/server/rollouts/rollout_records.h"

namespace fleet {

/// A part whose order has got an outcome, or a better one than before.
struct ToldPart {
    Part part;
    Outcome outcome;
};

/// How many hosts of a wave are in a state.
struct PartTally {
    std::size_t wave = 0;
    PartState state = PartState::Waiting;
    EndState end;
    std::size_t hosts = 0;
};

/// A part as it is shown.
struct PartSight {
    Part part;
    Moment heard{};      ///< the host's latest hello
    EndState cancelEnd;  ///< how the order that cancels it ended; "" before that
};

/// One thread at a time. `row` is Rollout::row. Lists are in the order of the hosts' places.
class RolloutStore {
public:
    virtual ~RolloutStore() = default;

    /// Does all of it in one transaction: when this returns it is durable, and when it throws
    /// nothing happened. What the centre's own store does meanwhile belongs to it.
    virtual void atomically(const std::function<void()>& act) = 0;

    virtual bool hasHost(const std::string& host) const = 0;
    /// Whether the host was given that order, or a roll-out has it for the host.
    virtual bool hasOrder(const std::string& host, const std::string& order) const = 0;

    /// Sets the row.
    virtual void add(Rollout& rollout) = 0;
    /// A waiting part with its order's bytes, for a host that exists.
    virtual void addPart(const Part& part, const std::string& bytes) = 0;
    virtual std::optional<Rollout> rollout(const std::string& id) const = 0;
    /// The newest ones first, whose row is below `before`.
    virtual std::vector<Rollout> rollouts(std::int64_t before, std::size_t most) const = 0;
    virtual std::vector<Rollout> running() const = 0;
    /// Keeps what changes while a roll-out goes on.
    virtual void keep(const Rollout& rollout) = 0;

    virtual std::optional<Part> part(std::int64_t row, const std::string& host) const = 0;
    /// Keeps what changes while a roll-out goes on.
    virtual void keepPart(const Part& part) = 0;
    /// The order of a waiting part, as its operator has signed it.
    virtual std::string bytesOf(const Part& part) const = 0;
    virtual void keepBytes(const Part& part, const std::string& bytes) = 0;
    /// Notes that a waiting part's order has its number. From now on its bytes are the centre's.
    /// An outcome that is known already is told.
    virtual void release(const Part& part) = 0;

    virtual std::vector<Part> waiting(std::int64_t row, std::size_t wave,
                                      std::size_t most) const = 0;
    virtual bool hasWaiting(std::int64_t row) const = 0;
    virtual std::size_t countReleased(std::int64_t row, std::size_t wave) const = 0;
    /// Whether a part of the wave is waiting or released.
    virtual bool hasUnfinished(std::int64_t row, std::size_t wave) const = 0;
    virtual bool hasReleased(std::int64_t row) const = 0;
    /// Moves the parts of a wave that were not released to the next one.
    virtual void postponeWaiting(std::int64_t row, std::size_t wave) = 0;
    /// Ends all waiting parts as cancelled.
    virtual void cancelWaiting(std::int64_t row, const std::string& reason) = 0;

    /// Whether there are more failures that count than so many.
    virtual bool hasMoreFailures(std::int64_t row, std::size_t than) const = 0;
    virtual void forgiveFailures(std::int64_t row) = 0;

    /// Parts whose orders have got an outcome since they were forgotten here.
    virtual std::vector<ToldPart> told(std::size_t most) const = 0;
    virtual void forgetTold(const Part& part) = 0;

    /// Keeps an order that cancels a released part's, for release. It replaces an older one.
    virtual void addCancel(const Part& part, const std::string& bytes) = 0;
    /// Parts with such an order, of all roll-outs.
    virtual std::vector<Part> cancelsToRelease(std::size_t most) const = 0;
    virtual std::string cancelBytesOf(const Part& part) const = 0;
    virtual void forgetCancel(const Part& part) = 0;

    // For people, from here on.
    /// Waiting parts whose orders end at that time or before.
    virtual std::vector<Part> expiringBy(std::int64_t row, Moment when, std::size_t most) const = 0;
    /// Released parts without an order that cancels them, or whose order to do so never ran.
    virtual std::vector<Part> uncancelled(std::int64_t row, std::size_t most) const = 0;
    virtual std::vector<Part> over(std::int64_t row) const = 0;
    virtual std::vector<PartTally> tallies(std::int64_t row) const = 0;
    /// Released parts whose hosts were not heard since then.
    virtual std::size_t countAway(std::int64_t row, Moment since) const = 0;
    /// Released parts whose orders have ended by that time, of which no host has told anything.
    virtual std::size_t countUnconfirmed(std::int64_t row, Moment now) const = 0;
    virtual std::size_t countExpired(std::int64_t row, Moment now) const = 0;
    /// Those that count first.
    virtual std::vector<Part> failures(std::int64_t row, std::size_t most) const = 0;
    /// From this place on.
    virtual std::vector<PartSight> parts(std::int64_t row, std::size_t from,
                                         std::size_t most) const = 0;
};

}  // namespace fleet
