#include "fleet/server/store/change_notes.h"

#include <algorithm>
#include <cstdint>

namespace fleet {
namespace {

/// The ids are those of the tables that are watched. OR IGNORE would not do: within a statement
/// with ON CONFLICT a trigger's own way to deal with conflicts does not count.
constexpr const char* kNotes = R"(
CREATE TEMP TABLE IF NOT EXISTS changed_hosts (id INTEGER PRIMARY KEY);
CREATE TEMP TABLE IF NOT EXISTS changed_facts (id INTEGER PRIMARY KEY);
CREATE TEMP TABLE IF NOT EXISTS changed_orders (id INTEGER PRIMARY KEY);
CREATE TEMP TABLE IF NOT EXISTS changed_rollouts (id INTEGER PRIMARY KEY);
CREATE TEMP TRIGGER IF NOT EXISTS host_added AFTER INSERT ON main.hosts BEGIN
    INSERT INTO changed_hosts SELECT new.id WHERE NOT EXISTS (SELECT 1 FROM changed_hosts WHERE id = new.id); END;
CREATE TEMP TRIGGER IF NOT EXISTS host_changed AFTER UPDATE OF heard, stopped ON main.hosts BEGIN
    INSERT INTO changed_hosts SELECT new.id WHERE NOT EXISTS (SELECT 1 FROM changed_hosts WHERE id = new.id); END;
CREATE TEMP TRIGGER IF NOT EXISTS facts_added AFTER INSERT ON main.host_facts BEGIN
    INSERT INTO changed_facts SELECT new.host WHERE NOT EXISTS (SELECT 1 FROM changed_facts WHERE id = new.host); END;
CREATE TEMP TRIGGER IF NOT EXISTS facts_changed AFTER UPDATE ON main.host_facts BEGIN
    INSERT INTO changed_facts SELECT new.host WHERE NOT EXISTS (SELECT 1 FROM changed_facts WHERE id = new.host); END;
CREATE TEMP TRIGGER IF NOT EXISTS order_added AFTER INSERT ON main.orders BEGIN
    INSERT INTO changed_orders SELECT new.id WHERE NOT EXISTS (SELECT 1 FROM changed_orders WHERE id = new.id); END;
CREATE TEMP TRIGGER IF NOT EXISTS order_over AFTER UPDATE OF state ON main.orders BEGIN
    INSERT INTO changed_orders SELECT new.id WHERE NOT EXISTS (SELECT 1 FROM changed_orders WHERE id = new.id); END;
CREATE TEMP TRIGGER IF NOT EXISTS rollout_added AFTER INSERT ON main.rollouts BEGIN
    INSERT INTO changed_rollouts SELECT new.id WHERE NOT EXISTS (SELECT 1 FROM changed_rollouts WHERE id = new.id); END;
CREATE TEMP TRIGGER IF NOT EXISTS rollout_changed AFTER UPDATE ON main.rollouts BEGIN
    INSERT INTO changed_rollouts SELECT new.id WHERE NOT EXISTS (SELECT 1 FROM changed_rollouts WHERE id = new.id); END;
CREATE TEMP TRIGGER IF NOT EXISTS part_changed AFTER UPDATE ON main.rollout_parts BEGIN
    INSERT INTO changed_rollouts SELECT new.rollout WHERE NOT EXISTS (SELECT 1 FROM changed_rollouts WHERE id = new.rollout); END;
)";

// CROSS JOIN fixes which table comes first: the notes are few.
constexpr const char* kHosts =
    "SELECT c.id, h.host FROM changed_hosts c CROSS JOIN hosts h ON h.id = c.id"
    " ORDER BY c.id LIMIT ?";
constexpr const char* kFacts =
    "SELECT c.id, h.host FROM changed_facts c CROSS JOIN hosts h ON h.id = c.id"
    " ORDER BY c.id LIMIT ?";
constexpr const char* kRollouts =
    "SELECT c.id, r.name FROM changed_rollouts c CROSS JOIN rollouts r ON r.id = c.id"
    " ORDER BY c.id LIMIT ?";
constexpr const char* kOrders =
    "SELECT c.id, h.host, o.name, o.state, r.name, r.kind, r.product,"
    " CASE WHEN r.id IS NULL THEN o.bytes END"
    " FROM changed_orders c CROSS JOIN orders o ON o.id = c.id CROSS JOIN hosts h ON h.id = o.host"
    " LEFT JOIN rollout_parts p ON p.host = o.host AND p.name = o.name"
    " LEFT JOIN rollouts r ON r.id = p.rollout ORDER BY c.id LIMIT ?";

}  // namespace

ChangeNotes::ChangeNotes(sqlite::Database& database) : database_(database) {
    database_.run(kNotes);
}

Changes ChangeNotes::take(std::size_t most) {
    Changes changes;
    changes.hosts = takeNames("changed_hosts", kHosts, most);
    changes.facts = takeNames("changed_facts", kFacts, most);
    changes.orders = takeOrders(most);
    changes.rollouts = takeNames("changed_rollouts", kRollouts, most);
    const std::size_t longest = std::max({changes.hosts.size(), changes.facts.size(),
                                          changes.orders.size(), changes.rollouts.size()});
    changes.isMore = longest == most;
    return changes;
}

std::vector<std::string> ChangeNotes::takeNames(const char* table, const char* select,
                                                std::size_t most) {
    std::vector<std::string> names;
    std::int64_t last = 0;
    {
        sqlite::Statement rows = database_.ask(select, static_cast<std::int64_t>(most));
        while (rows.step()) {
            last = rows.integer(0);
            names.push_back(rows.bytes(1));
        }
    }
    if (!names.empty()) forget(table, last);
    return names;
}

std::vector<ChangedOrder> ChangeNotes::takeOrders(std::size_t most) {
    std::vector<ChangedOrder> orders;
    std::int64_t last = 0;
    {
        sqlite::Statement rows = database_.ask(kOrders, static_cast<std::int64_t>(most));
        while (rows.step()) {
            last = rows.integer(0);
            orders.push_back({rows.bytes(1), rows.bytes(2), rows.bytes(3), rows.bytes(4),
                              rows.bytes(5), rows.bytes(6), rows.bytes(7)});
        }
    }
    if (!orders.empty()) forget("changed_orders", last);
    return orders;
}

void ChangeNotes::forget(const char* table, std::int64_t upTo) {
    database_.change(("DELETE FROM " + std::string(table) + " WHERE id <= ?").c_str(), upTo);
}

}  // namespace fleet
