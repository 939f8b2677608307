#include "fleet/server/store/rollout_rows.h"

namespace fleet {

Rollout rolloutIn(const sqlite::Statement& row) {
    Rollout rollout;
    rollout.row = row.integer(0);
    rollout.id = row.bytes(1);
    rollout.by = {row.bytes(2), row.bytes(3)};
    rollout.kind = row.bytes(4);
    rollout.product = row.bytes(5);
    rollout.selector = row.bytes(6);
    rollout.created = Moment(row.integer(7));
    rollout.plan.waves = row.bytes(8);
    rollout.plan.maxFailures = row.bytes(9);
    rollout.plan.pause = Moment(row.integer(10));
    if (!row.isNull(11)) rollout.plan.wait = Moment(row.integer(11));
    if (!row.isNull(12)) rollout.plan.parallel = static_cast<std::size_t>(row.integer(12));
    rollout.hosts = static_cast<std::size_t>(row.integer(13));
    rollout.mostFailures = static_cast<std::size_t>(row.integer(14));
    rollout.state = static_cast<RolloutState>(row.integer(15));
    rollout.cause = static_cast<PauseCause>(row.integer(16));
    rollout.reason = row.bytes(17);
    rollout.since = Moment(row.integer(18));
    rollout.waves = static_cast<std::size_t>(row.integer(19));
    rollout.wave = static_cast<std::size_t>(row.integer(20));
    rollout.began = Moment(row.integer(21));
    if (!row.isNull(22)) rollout.waveEnd = Moment(row.integer(22));
    return rollout;
}

Part partIn(const sqlite::Statement& row) {
    Part part;
    part.rollout = row.integer(0);
    part.place = static_cast<std::size_t>(row.integer(1));
    part.host = row.bytes(2);
    part.wave = static_cast<std::size_t>(row.integer(3));
    part.order = row.bytes(4);
    part.expires = Moment(row.integer(5));
    part.tries = static_cast<std::size_t>(row.integer(6));
    part.state = static_cast<PartState>(row.integer(7));
    part.number = static_cast<Number>(row.integer(8));
    part.end = row.bytes(9);
    part.reason = row.bytes(10);
    part.failure = static_cast<FailureState>(row.integer(11));
    part.cancel = row.bytes(12);
    return part;
}

}  // namespace fleet
