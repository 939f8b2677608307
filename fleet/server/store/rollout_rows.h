/// What the roll-outs' store asks its tables. It stands here so that a test can look at how each is
/// carried out: what is asked every second must not go through all hosts of a roll-out.
#pragma once

#include "fleet/server/rollouts/rollout_store.h"
#include "sqlite/database.h"

namespace fleet {

// The rows of the statements below that select roll-outs, parts, and parts with more behind them.
Rollout rolloutIn(const sqlite::Statement& row);
Part partIn(const sqlite::Statement& row);
/// The columns of a part; what else a statement selects begins there.
inline constexpr int kPartColumns = 13;

inline constexpr const char* kKnowsOrder =
    "SELECT EXISTS (SELECT 1 FROM orders WHERE host = h.id AND name = ?)"
    " OR EXISTS (SELECT 1 FROM rollout_parts WHERE host = h.id AND name = ?)"
    " FROM hosts h WHERE h.host = ?";

// Roll-outs.
inline constexpr const char* kAddRollout =
    "INSERT INTO rollouts (name, operator, operator_key, kind, product, selector, created,"
    " plan_waves, plan_failures, pause, wait, parallel, hosts, most_failures, state, cause, reason,"
    " since, waves, wave, began, wave_end)"
    " VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)";
inline constexpr const char* kRolloutByName =
    "SELECT id, name, operator, operator_key, kind, product, selector, created, plan_waves,"
    " plan_failures, pause, wait, parallel, hosts, most_failures, state, cause, reason, since,"
    " waves, wave, began, wave_end FROM rollouts WHERE name = ?";
inline constexpr const char* kRolloutsBefore =
    "SELECT id, name, operator, operator_key, kind, product, selector, created, plan_waves,"
    " plan_failures, pause, wait, parallel, hosts, most_failures, state, cause, reason, since,"
    " waves, wave, began, wave_end FROM rollouts WHERE id < ? ORDER BY id DESC LIMIT ?";
inline constexpr const char* kRolloutsRunning =
    "SELECT id, name, operator, operator_key, kind, product, selector, created, plan_waves,"
    " plan_failures, pause, wait, parallel, hosts, most_failures, state, cause, reason, since,"
    " waves, wave, began, wave_end FROM rollouts INDEXED BY rollouts_running"
    " WHERE id > 0 AND state = 0 ORDER BY id";
inline constexpr const char* kKeepRollout =
    "UPDATE rollouts SET state = ?, cause = ?, reason = ?, since = ?, waves = ?, wave = ?,"
    " began = ?, wave_end = ? WHERE id = ?";

// Parts. CROSS JOIN fixes which table comes first.
inline constexpr const char* kAddPart =
    "INSERT INTO rollout_parts (rollout, place, host, wave, name, expires, tries, state, number,"
    " outcome, reason, failure, cancel)"
    " SELECT ?, ?, id, ?, ?, ?, ?, ?, ?, ?, ?, ?, ? FROM hosts WHERE host = ?";
inline constexpr const char* kPartOfHost =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel"
    " FROM hosts h CROSS JOIN rollout_parts p ON p.host = h.id"
    " WHERE h.host = ? AND p.rollout = ?";
inline constexpr const char* kKeepPart =
    "UPDATE rollout_parts SET wave = ?, name = ?, expires = ?, tries = ?, state = ?, number = ?,"
    " outcome = ?, reason = ?, failure = ?, cancel = ? WHERE rollout = ? AND place = ?";
inline constexpr const char* kKeepWaitingOrder =
    "INSERT OR REPLACE INTO rollout_orders (rollout, place, bytes) VALUES (?, ?, ?)";
inline constexpr const char* kWaitingOrder =
    "SELECT bytes FROM rollout_orders WHERE rollout = ? AND place = ?";
inline constexpr const char* kDropWaitingOrder =
    "DELETE FROM rollout_orders WHERE rollout = ? AND place = ?";
inline constexpr const char* kDropWaitingOrders = "DELETE FROM rollout_orders WHERE rollout = ?";
// Without the index's name SQLite may go through all parts in their order, waiting or not.
inline constexpr const char* kWaitingParts =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel"
    " FROM rollout_parts p INDEXED BY rollout_parts_by_state CROSS JOIN hosts h ON h.id = p.host"
    " WHERE p.rollout = ? AND p.state = 0 AND p.wave = ? AND p.outcome = x''"
    " ORDER BY p.place LIMIT ?";
inline constexpr const char* kHasWaiting =
    "SELECT 1 FROM rollout_parts WHERE rollout = ? AND state = 0 LIMIT 1";
inline constexpr const char* kCountReleased =
    "SELECT COUNT(*) FROM rollout_parts WHERE rollout = ? AND state = 1 AND wave = ?";
inline constexpr const char* kHasUnfinished =
    "SELECT 1 FROM rollout_parts WHERE rollout = ? AND state IN (0, 1) AND wave = ? LIMIT 1";
inline constexpr const char* kHasReleased =
    "SELECT 1 FROM rollout_parts WHERE rollout = ? AND state = 1 LIMIT 1";
inline constexpr const char* kPostponeWaiting =
    "UPDATE rollout_parts SET wave = wave + 1 WHERE rollout = ? AND state = 0 AND wave = ?";
inline constexpr const char* kEndWaiting =
    "UPDATE rollout_parts SET state = 2, outcome = ?, reason = ? WHERE rollout = ? AND state = 0";
inline constexpr const char* kHasMoreFailures =
    "SELECT 1 FROM rollout_parts WHERE rollout = ? AND failure > 0 AND failure < 2"
    " LIMIT 1 OFFSET ?";
inline constexpr const char* kForgiveFailures =
    "UPDATE rollout_parts SET failure = 2 WHERE rollout = ? AND failure > 0 AND failure < 2";

// Outcomes.
inline constexpr const char* kToldParts =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel, o.state, o.told_number, o.journal, o.task"
    " FROM rollout_news n CROSS JOIN rollout_parts p ON p.rollout = n.rollout AND p.place = n.place"
    " CROSS JOIN hosts h ON h.id = p.host"
    " CROSS JOIN orders o ON o.host = p.host AND o.name = p.name"
    " WHERE n.rollout > 0 ORDER BY n.rollout, n.place LIMIT ?";
inline constexpr const char* kForgetTold =
    "DELETE FROM rollout_news WHERE rollout = ? AND place = ?";
inline constexpr const char* kTellKnown =
    "INSERT OR IGNORE INTO rollout_news SELECT p.rollout, p.place"
    " FROM rollout_parts p CROSS JOIN orders o ON o.host = p.host AND o.name = p.name"
    " WHERE p.rollout = ? AND p.place = ? AND o.state IS NOT NULL";

// Orders that cancel others.
inline constexpr const char* kAddCancel =
    "INSERT OR REPLACE INTO rollout_cancels (rollout, place, bytes) VALUES (?, ?, ?)";
inline constexpr const char* kCancelsToRelease =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel"
    " FROM rollout_cancels c CROSS JOIN rollout_parts p"
    " ON p.rollout = c.rollout AND p.place = c.place CROSS JOIN hosts h ON h.id = p.host"
    " WHERE c.rollout > 0 ORDER BY c.rollout, c.place LIMIT ?";
inline constexpr const char* kCancelOrder =
    "SELECT bytes FROM rollout_cancels WHERE rollout = ? AND place = ?";
inline constexpr const char* kForgetCancel =
    "DELETE FROM rollout_cancels WHERE rollout = ? AND place = ?";

// For people.
inline constexpr const char* kExpiringParts =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel"
    " FROM rollout_parts p CROSS JOIN hosts h ON h.id = p.host"
    " WHERE p.rollout = ? AND p.state = 0 AND p.expires <= ? ORDER BY p.place LIMIT ?";
inline constexpr const char* kUncancelledParts =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel"
    " FROM rollout_parts p CROSS JOIN hosts h ON h.id = p.host"
    " LEFT JOIN orders c ON c.host = p.host AND c.name = p.cancel"
    " WHERE p.rollout = ? AND p.state = 1 AND (p.cancel = x'' OR c.state IN (?, ?))"
    " ORDER BY p.place LIMIT ?";
inline constexpr const char* kPartsOver =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel"
    " FROM rollout_parts p CROSS JOIN hosts h ON h.id = p.host"
    " WHERE p.rollout = ? AND p.state = 2 ORDER BY p.place";
inline constexpr const char* kTallies =
    "SELECT wave, state, outcome, COUNT(*) FROM rollout_parts WHERE rollout = ?"
    " GROUP BY state, wave, outcome";
inline constexpr const char* kCountAway =
    "SELECT COUNT(*) FROM rollout_parts p CROSS JOIN hosts h ON h.id = p.host"
    " WHERE p.rollout = ? AND p.state = 1 AND h.heard < ?";
inline constexpr const char* kCountPastExpiry =
    "SELECT COUNT(*) FROM rollout_parts WHERE rollout = ? AND state = ? AND expires <= ?";
inline constexpr const char* kFailedParts =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel"
    " FROM rollout_parts p CROSS JOIN hosts h ON h.id = p.host"
    " WHERE p.rollout = ? AND p.failure > 0 ORDER BY p.failure, p.place LIMIT ?";
inline constexpr const char* kPartsFrom =
    "SELECT p.rollout, p.place, h.host, p.wave, p.name, p.expires, p.tries, p.state, p.number,"
    " p.outcome, p.reason, p.failure, p.cancel, h.heard, c.state"
    " FROM rollout_parts p CROSS JOIN hosts h ON h.id = p.host"
    " LEFT JOIN orders c ON c.host = p.host AND c.name = p.cancel"
    " WHERE p.rollout = ? AND p.place >= ? ORDER BY p.place LIMIT ?";

}  // namespace fleet
