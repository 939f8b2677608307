#include "fleet/server/rollouts/rollout_pace.h"

#include <algorithm>

#include "fleet/server/rollouts/end_states.h"

namespace fleet {

bool RolloutPace::step(Moment now) {
    bool isMore = releaseCancels();
    for (const Rollout& rollout : store_.running())
        isMore = stepOf(rollout, now) || isMore;
    return isMore;
}

/// One transaction: what is released, and that the wave has begun or ended.
bool RolloutPace::stepOf(const Rollout& known, Moment now) {
    bool isMore = false;
    store_.atomically([&] {
        Rollout rollout = known;
        isMore = stepOn(rollout, now);
    });
    return isMore;
}

bool RolloutPace::stepOn(Rollout& rollout, Moment now) {
    if (pauseForFailures(rollout, now)) return false;
    const bool isBetweenWaves = rollout.wave == 0 || rollout.waveEnd.has_value();
    if (isBetweenWaves && !beginNextWave(rollout, now)) return false;
    const bool isMore = release(rollout, now);
    if (isMore || rollout.state != RolloutState::Running) return isMore;
    return endWave(rollout, now);
}

/// When everything has been released there is nothing left to hold back.
bool RolloutPace::pauseForFailures(Rollout& rollout, Moment now) {
    const std::size_t most = rollout.mostFailures;
    if (!store_.hasMoreFailures(rollout.row, most)) return false;
    if (!store_.hasWaiting(rollout.row)) return false;
    enterState(rollout, RolloutState::Paused, now, PauseCause::Failures,
               "more than " + std::to_string(most) + " of " + std::to_string(rollout.hosts) +
                   " hosts failed");
    store_.keep(rollout);
    return true;
}

bool RolloutPace::beginNextWave(Rollout& rollout, Moment now) {
    if (rollout.waveEnd && now - *rollout.waveEnd < rollout.plan.pause) return false;
    ++rollout.wave;
    rollout.began = now;
    rollout.waveEnd.reset();
    store_.keep(rollout);
    return true;
}

/// Returns whether there is more to release at once.
bool RolloutPace::release(Rollout& rollout, Moment now) {
    std::size_t most = kReleasedAtOnce;
    if (rollout.plan.parallel) {
        const std::size_t released = store_.countReleased(rollout.row, rollout.wave);
        most = std::min(most, *rollout.plan.parallel - std::min(released, *rollout.plan.parallel));
    }
    if (most == 0) return false;
    const std::vector<Part> parts = store_.waiting(rollout.row, rollout.wave, most);
    for (const Part& part : parts) {
        if (part.expires <= now) {
            enterState(rollout, RolloutState::Paused, now, PauseCause::Expiry,
                       "orders have expired before they were released, that of host " + part.host +
                           " among them; they must be signed anew");
            store_.keep(rollout);
            return false;
        }
        releasePart(part);
    }
    return parts.size() == kReleasedAtOnce;
}

void RolloutPace::releasePart(Part part) {
    const std::optional<Number> number = give_(part.host, part.order, store_.bytesOf(part));
    if (number) {
        part.number = *number;
        store_.release(part);
        return;
    }
    part.state = PartState::Over;
    part.end = kCancelled;
    part.reason = "the host is no longer in the fleet";
    store_.keepPart(part);
}

/// Whether the wave has ended, and more is to do at once.
bool RolloutPace::endWave(Rollout& rollout, Moment now) {
    const bool isLate = rollout.plan.wait && now - rollout.began >= *rollout.plan.wait;
    if (!isLate && store_.hasUnfinished(rollout.row, rollout.wave)) return false;
    rollout.waveEnd = now;
    // Those that had no turn, because hosts that are away took up all the places, come with the
    // next wave; after the last one there is another then.
    if (!store_.waiting(rollout.row, rollout.wave, 1).empty()) {
        store_.postponeWaiting(rollout.row, rollout.wave);
        rollout.waves = std::max(rollout.waves, rollout.wave + 1);
    }
    if (rollout.wave == rollout.waves) enterState(rollout, RolloutState::Finished, now);
    store_.keep(rollout);
    return rollout.state == RolloutState::Running && rollout.plan.pause == Moment{};
}

/// The orders that cancel others. Whoever is over in the meantime needs none.
bool RolloutPace::releaseCancels() {
    if (store_.cancelsToRelease(1).empty()) return false;
    std::size_t count = 0;
    store_.atomically([&] {
        const std::vector<Part> parts = store_.cancelsToRelease(kReleasedAtOnce);
        for (const Part& part : parts) {
            if (part.state == PartState::Released)
                give_(part.host, part.cancel, store_.cancelBytesOf(part));
            store_.forgetCancel(part);
        }
        count = parts.size();
    });
    return count == kReleasedAtOnce;
}

}  // namespace fleet
