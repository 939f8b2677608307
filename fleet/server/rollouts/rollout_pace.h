/// Decides when which orders of a roll-out are released.
///
/// It keeps nothing: all of it is in the store. After a kill, another one goes on where this one
/// was.
#pragma once

#include <functional>
#include <optional>
#include <string>

#include "fleet/server/rollouts/rollout_store.h"

namespace fleet {

/// Gives an order its number: Centre::submit() with the order's bytes sealed. Nothing if there is
/// no such host. The same order again gets the number that it has. It is called within a
/// transaction of the store, so what it does counts together with the note of it.
using GiveNumber = std::function<std::optional<Number>(
    const std::string& host, const std::string& order, const std::string& bytes)>;

/// One thread at a time.
class RolloutPace {
public:
    /// Orders released in one transaction. It keeps others from the database for so long, and is
    /// what one sync of the disk is shared by.
    static constexpr std::size_t kReleasedAtOnce = 500;

    /// Borrows the store.
    RolloutPace(RolloutStore& store, GiveNumber give) : store_(store), give_(std::move(give)) {}

    /// Does the next step of each roll-out that runs. Returns whether there is more to do at once.
    bool step(Moment now);

private:
    bool stepOf(const Rollout& known, Moment now);
    bool stepOn(Rollout& rollout, Moment now);
    bool pauseForFailures(Rollout& rollout, Moment now);
    bool beginNextWave(Rollout& rollout, Moment now);
    bool release(Rollout& rollout, Moment now);
    void releasePart(Part part);
    bool endWave(Rollout& rollout, Moment now);
    bool releaseCancels();

    RolloutStore& store_;
    const GiveNumber give_;
};

}  // namespace fleet
