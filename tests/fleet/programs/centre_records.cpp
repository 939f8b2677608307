#include "tests/fleet/programs/centre_records.h"

#include "fleet/server/rollouts/rollout_records.h"
#include "fleet/server/store/centre_directory.h"

namespace fleet_programs {

CentreRecords::CentreRecords(const fleet::FleetDirectory& directory)
    : database_(fleet::CentreDirectory::databaseIn(directory.orders())) {}

std::int64_t CentreRecords::hosts() {
    return database_.number("SELECT count(*) FROM hosts");
}

std::int64_t CentreRecords::heardSince(fleet::Moment then) {
    return database_.number("SELECT count(*) FROM hosts WHERE heard >= ?", then.count());
}

std::int64_t CentreRecords::withFacts() {
    return database_.number("SELECT count(*) FROM host_facts");
}

CentreRecords::Orders CentreRecords::orders() {
    // An index has the open ones, so this is cheap enough to be asked again and again.
    Orders orders;
    orders.open = database_.number("SELECT count(*) FROM orders WHERE state IS NULL");
    orders.over = database_.number("SELECT count(*) FROM orders") - orders.open;
    return orders;
}

std::int64_t CentreRecords::rollouts() {
    return database_.number("SELECT count(*) FROM rollouts");
}

std::int64_t CentreRecords::finishedRollouts() {
    return database_.number("SELECT count(*) FROM rollouts WHERE state = ?",
                            static_cast<std::int64_t>(fleet::RolloutState::Finished));
}

fleet::Moment CentreRecords::newestRollout() {
    return fleet::Moment(database_.number("SELECT max(created) FROM rollouts"));
}

std::vector<RolledOut> CentreRecords::rolledOut() {
    sqlite::Statement rows = database_.ask(
        "SELECT h.host, r.product, p.name, o.number, p.outcome, coalesce(o.state, x''), "
        "coalesce(o.journal, x'') FROM rollout_parts p JOIN rollouts r ON r.id = p.rollout "
        "JOIN hosts h ON h.id = p.host "
        "LEFT JOIN orders o ON o.host = p.host AND o.name = p.name ORDER BY p.host, o.number");
    std::vector<RolledOut> all;
    while (rows.step()) {
        RolledOut one;
        one.host = rows.bytes(0);
        one.product = rows.bytes(1);
        one.order = rows.bytes(2);
        one.number = rows.integer(3);
        one.partState = rows.bytes(4);
        one.orderState = rows.bytes(5);
        one.journal = rows.bytes(6);
        all.push_back(std::move(one));
    }
    return all;
}

}  // namespace fleet_programs
