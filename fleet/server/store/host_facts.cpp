#include "fleet/server/store/host_facts.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"

using nlohmann::json;

namespace fleet {
namespace {

std::string keptLabelsOf(const Labels& labels) {
    json document = json::object();
    for (const auto& [name, value] : labels)
        document[name] = value;
    return textOf(document);
}

/// Of a row that this centre has written.
Labels labelsOfKept(const std::string& text) {
    Labels labels;
    const json document = json::parse(text);
    for (const auto& [name, value] : document.items())
        labels[name] = value.get<std::string>();
    return labels;
}

/// When the inventory was taken; -1 without one.
std::int64_t takenOf(const Facts& facts) {
    return facts.inventory ? static_cast<std::int64_t>(facts.inventory->time.count()) : -1;
}

}  // namespace

bool HostFacts::keep(const Facts& facts, Moment heard) {
    const int changed = database_.change(
        "INSERT INTO host_facts (host, told, heard, name, labels, link, version, journal, blocked,"
        " taken, inventory) SELECT id, ?, ?, ?, ?, ?, ?, ?, ?, ?, ? FROM hosts WHERE host = ?"
        " ON CONFLICT (host) DO UPDATE SET told = excluded.told, heard = excluded.heard,"
        " name = excluded.name, labels = excluded.labels, link = excluded.link,"
        " version = excluded.version, journal = excluded.journal, blocked = excluded.blocked,"
        " taken = excluded.taken, inventory = excluded.inventory"
        " WHERE excluded.told > host_facts.told",
        static_cast<std::int64_t>(facts.time.count()), static_cast<std::int64_t>(heard.count()),
        facts.name, keptLabelsOf(facts.labels), facts.link, facts.version, facts.journal,
        facts.blocked, takenOf(facts), facts.inventory ? facts.inventory->document : std::string(),
        facts.host);
    return changed > 0;
}

std::optional<KeptFacts> HostFacts::of(const std::string& host) const {
    sqlite::Statement row = database_.ask(
        "SELECT f.told, f.heard, f.name, f.labels, f.link, f.version, f.journal, f.blocked,"
        " f.taken, f.inventory FROM hosts h CROSS JOIN host_facts f ON f.host = h.id"
        " WHERE h.host = ?",
        host);
    if (!row.step()) return std::nullopt;
    KeptFacts kept;
    kept.facts.host = host;
    kept.facts.time = Moment(row.integer(0));
    kept.heard = Moment(row.integer(1));
    kept.facts.name = row.bytes(2);
    kept.facts.labels = labelsOfKept(row.bytes(3));
    kept.facts.link = row.bytes(4);
    kept.facts.version = row.bytes(5);
    kept.facts.journal = row.bytes(6);
    kept.facts.blocked = row.bytes(7);
    const Moment taken(row.integer(8));
    if (taken >= Moment{}) kept.facts.inventory = Inventory{taken, row.bytes(9)};
    return kept;
}

std::map<std::string, Labels> HostFacts::labels() const {
    std::map<std::string, Labels> all;
    sqlite::Statement rows = database_.ask(
        "SELECT h.host, f.labels FROM host_facts f CROSS JOIN hosts h ON h.id = f.host");
    while (rows.step())
        all[rows.bytes(0)] = labelsOfKept(rows.bytes(1));
    return all;
}

}  // namespace fleet
