/// What the centre's store asks its tables. It stands here so that a test can look at how each is
/// carried out: none may go through all orders, nor sort them.
#pragma once

#include "fleet/server/core/records.h"
#include "sqlite/database.h"

namespace fleet {

/// The row of a statement below that selects orders; kOpen selects less.
OrderRecord orderIn(const sqlite::Statement& row);

// CROSS JOIN fixes which table comes first.
inline constexpr const char* kOrderByName =
    "SELECT h.host, o.number, o.name, o.bytes, o.published, o.state, o.told_number, o.journal,"
    " o.task FROM hosts h CROSS JOIN orders o ON o.host = h.id WHERE h.host = ? AND o.name = ?";
// For people, who ask seldom: a search for each host.
inline constexpr const char* kOrdersNamed =
    "SELECT h.host, o.number, o.name, o.bytes, o.published, o.state, o.told_number, o.journal,"
    " o.task FROM hosts h CROSS JOIN orders o ON o.host = h.id AND o.name = ?";
inline constexpr const char* kOrderByNumber =
    "SELECT h.host, o.number, o.name, o.bytes, o.published, o.state, o.told_number, o.journal,"
    " o.task FROM hosts h CROSS JOIN orders o ON o.host = h.id"
    " WHERE h.host = ? AND o.number = ? AND o.number > 0";
inline constexpr const char* kUnpublished =
    "SELECT h.host, o.number, o.name, o.bytes, o.published, o.state, o.told_number, o.journal,"
    " o.task FROM orders o CROSS JOIN hosts h ON h.id = o.host"
    " WHERE o.published = 0 AND o.held = 0 AND o.state IS NULL AND o.number > 0"
    " ORDER BY o.number, o.host LIMIT ? OFFSET ?";
inline constexpr const char* kOpen =
    "SELECT o.number, o.name, o.published FROM hosts h CROSS JOIN orders o ON o.host = h.id"
    " WHERE h.host = ? AND o.state IS NULL AND o.number >= ? AND o.number <= ?"
    " ORDER BY o.number LIMIT ?";
inline constexpr const char* kLatest =
    "SELECT h.host, o.number, o.name, o.bytes, o.published, o.state, o.told_number, o.journal,"
    " o.task FROM hosts h CROSS JOIN orders o ON o.host = h.id"
    " WHERE h.host = ? AND o.number > 0 ORDER BY o.number DESC LIMIT ?";
inline constexpr const char* kNotePublished =
    "UPDATE orders SET published = 1"
    " WHERE host = (SELECT id FROM hosts WHERE host = ?) AND number = ? AND number > 0";
inline constexpr const char* kKeepOutcome =
    "UPDATE orders SET state = ?, told_number = ?, journal = ?, task = ?"
    " WHERE host = (SELECT id FROM hosts WHERE host = ?) AND name = ?";
inline constexpr const char* kHold =
    "UPDATE orders SET held = 1"
    " WHERE host = ? AND state IS NULL AND number > 0 AND published = 0";
inline constexpr const char* kRelease = "UPDATE orders SET held = 0 WHERE host = ? AND held = 1";
inline constexpr const char* kReleaseAll = "UPDATE orders SET held = 0 WHERE host > 0 AND held = 1";
inline constexpr const char* kComplete =
    "UPDATE orders SET number = ?, bytes = ?, held = ?"
    " WHERE host = ? AND name = ? AND number = 0";

}  // namespace fleet
