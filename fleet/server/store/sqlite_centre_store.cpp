#include "fleet/server/store/sqlite_centre_store.h"

#include <algorithm>
#include <limits>
#include <stdexcept>

#include "fleet/server/store/order_rows.h"
#include "sqlite/transaction.h"

namespace fleet {
namespace {

using sqlite::Statement;
using sqlite::Transaction;

/// SQLite's integers are signed; no number that was given is beyond them.
std::int64_t bounded(std::uint64_t value) {
    constexpr auto kHighest = std::numeric_limits<std::int64_t>::max();
    return static_cast<std::int64_t>(std::min(value, static_cast<std::uint64_t>(kHighest)));
}

std::optional<OrderRecord> oneOf(Statement rows) {
    if (!rows.step()) return std::nullopt;
    return orderIn(rows);
}

std::vector<OrderRecord> allOf(Statement rows) {
    std::vector<OrderRecord> orders;
    while (rows.step())
        orders.push_back(orderIn(rows));
    return orders;
}

}  // namespace

std::optional<HostRecord> SqliteCentreStore::host(const std::string& host) const {
    Statement found = database_.ask(
        "SELECT last, told, machine, journal, session, earlier_session, stopped, unpublished,"
        " signing, name, heard, told_time FROM hosts WHERE host = ?",
        host);
    if (!found.step()) return std::nullopt;
    HostRecord record;
    record.host = host;
    record.last = static_cast<Number>(found.integer(0));
    record.told = static_cast<Number>(found.integer(1));
    record.machine = found.bytes(2);
    record.journal = found.bytes(3);
    record.session = found.bytes(4);
    record.earlierSession = found.bytes(5);
    record.stopped = found.bytes(6);
    record.unpublished = found.bytes(7);
    record.signing = found.bytes(8);
    record.name = found.bytes(9);
    record.heard = Moment(found.integer(10));
    record.toldTime = Moment(found.integer(11));
    return record;
}

void SqliteCentreStore::keepHost(const HostRecord& record) {
    Transaction transaction(database_);
    const std::optional<HostRow> before = row(record.host);
    database_.change(
        "INSERT INTO hosts (host, last, told, machine, journal, session, earlier_session, stopped,"
        " unpublished, signing, name, heard, told_time)"
        " VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)"
        " ON CONFLICT (host) DO UPDATE SET last = excluded.last, told = excluded.told,"
        " machine = excluded.machine, journal = excluded.journal, session = excluded.session,"
        " earlier_session = excluded.earlier_session, stopped = excluded.stopped,"
        " unpublished = excluded.unpublished, signing = excluded.signing, name = excluded.name,"
        " heard = excluded.heard, told_time = excluded.told_time",
        record.host, bounded(record.last), bounded(record.told), record.machine, record.journal,
        record.session, record.earlierSession, record.stopped, record.unpublished, record.signing,
        record.name, std::int64_t{record.heard.count()}, std::int64_t{record.toldTime.count()});
    if (before) holdOrders(*before, !record.unpublished.empty());
    transaction.commit();
}

/// Changes the orders only when the host's state does: records are kept with each hello.
void SqliteCentreStore::holdOrders(const HostRow& before, bool isHeld) {
    if (before.isHeld == isHeld) return;
    database_.change(isHeld ? kHold : kRelease, before.id);
}

std::optional<SqliteCentreStore::HostRow> SqliteCentreStore::row(const std::string& host) const {
    Statement found =
        database_.ask("SELECT id, last, unpublished != x'' FROM hosts WHERE host = ?", host);
    if (!found.step()) return std::nullopt;
    return HostRow{found.integer(0), static_cast<Number>(found.integer(1)), found.integer(2) != 0};
}

std::optional<Number> SqliteCentreStore::give(const std::string& host, const std::string& order,
                                              const std::function<std::string(Number)>& seal) {
    Transaction transaction(database_);
    const std::optional<HostRow> target = row(host);
    if (!target) return std::nullopt;
    if (const auto known = this->order(host, order)) return known->number;
    OrderRecord given;
    given.host = host;
    given.number = target->last + 1;
    given.order = order;
    given.bytes = seal(given.number);
    database_.change("UPDATE hosts SET last = ? WHERE id = ?", bounded(given.number), target->id);
    insert(given, *target);
    transaction.commit();
    return given.number;
}

void SqliteCentreStore::adopt(const OrderRecord& order) {
    Transaction transaction(database_);
    const std::optional<HostRow> target = row(order.host);
    if (!target) return;
    if (this->order(order.host, order.order)) {
        database_.change(kComplete, bounded(order.number), order.bytes, target->isHeld ? 1 : 0,
                         target->id, order.order);
    } else {
        insert(order, *target);
    }
    transaction.commit();
}

void SqliteCentreStore::insert(const OrderRecord& order, const HostRow& host) {
    database_.change(
        "INSERT INTO orders (host, number, name, bytes, published, held)"
        " VALUES (?, ?, ?, ?, ?, ?)",
        host.id, bounded(order.number), order.order, order.bytes, order.isPublished ? 1 : 0,
        host.isHeld ? 1 : 0);
    if (order.outcome) {
        const Outcome& outcome = *order.outcome;
        database_.change(kKeepOutcome, outcome.state, bounded(outcome.number), outcome.journal,
                         outcome.task, order.host, order.order);
    }
}

std::optional<OrderRecord> SqliteCentreStore::order(const std::string& host,
                                                    const std::string& order) const {
    return oneOf(database_.ask(kOrderByName, host, order));
}

std::optional<OrderRecord> SqliteCentreStore::orderAt(const std::string& host,
                                                      Number number) const {
    return oneOf(database_.ask(kOrderByNumber, host, bounded(number)));
}

std::vector<OrderRecord> SqliteCentreStore::unpublished(std::size_t most,
                                                        std::size_t skipped) const {
    return allOf(database_.ask(kUnpublished, bounded(most), bounded(skipped)));
}

void SqliteCentreStore::notePublished(const std::string& host, Number number) {
    database_.change(kNotePublished, host, bounded(number));
}

std::vector<OpenOrder> SqliteCentreStore::open(const std::string& host, Number from, Number upTo,
                                               std::size_t most) const {
    Statement rows = database_.ask(kOpen, host, bounded(from), bounded(upTo), bounded(most));
    std::vector<OpenOrder> orders;
    while (rows.step())
        orders.push_back(
            {static_cast<Number>(rows.integer(0)), rows.bytes(1), rows.integer(2) != 0});
    return orders;
}

void SqliteCentreStore::keepOutcome(const Outcome& outcome) {
    const int kept = database_.change(kKeepOutcome, outcome.state, bounded(outcome.number),
                                      outcome.journal, outcome.task, outcome.host, outcome.order);
    if (kept == 0)
        throw std::out_of_range("an outcome of an order that the database does not know");
}

void SqliteCentreStore::skipNumbers(Number count, Number atLeast, Moment listUntil) {
    Transaction transaction(database_);
    database_.change("UPDATE hosts SET last = MAX(last + ?, ?), unpublished = x''", bounded(count),
                     bounded(atLeast));
    database_.change(kReleaseAll);
    database_.change("INSERT OR REPLACE INTO facts VALUES ('list_until', ?)",
                     std::int64_t{listUntil.count()});
    transaction.commit();
}

bool SqliteCentreStore::isPutBack() const {
    return database_.number("SELECT count(*) FROM facts WHERE name = 'put_back'") > 0;
}

void SqliteCentreStore::noteCompleted() {
    database_.change("DELETE FROM facts WHERE name = 'put_back'");
}

Moment SqliteCentreStore::listUntil() const {
    return Moment(database_.number("SELECT value FROM facts WHERE name = 'list_until'"));
}

}  // namespace fleet
