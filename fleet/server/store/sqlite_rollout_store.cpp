#include "fleet/server/store/sqlite_rollout_store.h"

#include "fleet/server/rollouts/end_states.h"
#include "fleet/server/store/rollout_rows.h"
#include "sqlite/transaction.h"

namespace fleet {
namespace {

using sqlite::Statement;

std::int64_t asInteger(std::size_t value) {
    return static_cast<std::int64_t>(value);
}

std::int64_t asInteger(Moment moment) {
    return moment.count();
}

template <typename Value>
std::optional<std::int64_t> asInteger(const std::optional<Value>& value) {
    if (!value) return std::nullopt;
    return asInteger(*value);
}

template <typename Read>
auto rowsOf(Statement statement, Read read) {
    std::vector<decltype(read(statement))> rows;
    while (statement.step())
        rows.push_back(read(statement));
    return rows;
}

std::string bytesIn(Statement statement) {
    return statement.step() ? statement.bytes(0) : std::string();
}

ToldPart toldIn(const Statement& row) {
    ToldPart told{partIn(row), {}};
    Outcome& outcome = told.outcome;
    outcome.host = told.part.host;
    outcome.order = told.part.order;
    outcome.state = row.bytes(kPartColumns);
    outcome.number = static_cast<Number>(row.integer(kPartColumns + 1));
    outcome.journal = row.bytes(kPartColumns + 2);
    outcome.task = row.bytes(kPartColumns + 3);
    return told;
}

PartTally tallyIn(const Statement& row) {
    return {static_cast<std::size_t>(row.integer(0)), static_cast<PartState>(row.integer(1)),
            row.bytes(2), static_cast<std::size_t>(row.integer(3))};
}

PartSight sightIn(const Statement& row) {
    return {partIn(row), Moment(row.integer(kPartColumns)), row.bytes(kPartColumns + 1)};
}

}  // namespace

void SqliteRolloutStore::atomically(const std::function<void()>& act) {
    sqlite::Transaction transaction(database_);
    act();
    transaction.commit();
}

bool SqliteRolloutStore::hasHost(const std::string& host) const {
    return database_.number("SELECT 1 FROM hosts WHERE host = ?", host) != 0;
}

bool SqliteRolloutStore::hasOrder(const std::string& host, const std::string& order) const {
    return database_.number(kKnowsOrder, order, order, host) != 0;
}

void SqliteRolloutStore::add(Rollout& rollout) {
    database_.change(kAddRollout, rollout.id, rollout.by.name, rollout.by.key, rollout.kind,
                     rollout.product, rollout.selector, asInteger(rollout.created),
                     rollout.plan.waves, rollout.plan.maxFailures, asInteger(rollout.plan.pause),
                     asInteger(rollout.plan.wait), asInteger(rollout.plan.parallel),
                     asInteger(rollout.hosts), asInteger(rollout.mostFailures),
                     static_cast<int>(rollout.state), static_cast<int>(rollout.cause),
                     rollout.reason, asInteger(rollout.since), asInteger(rollout.waves),
                     asInteger(rollout.wave), asInteger(rollout.began), asInteger(rollout.waveEnd));
    rollout.row = database_.lastInserted();
}

void SqliteRolloutStore::addPart(const Part& part, const std::string& bytes) {
    database_.change(kAddPart, part.rollout, asInteger(part.place), asInteger(part.wave),
                     part.order, asInteger(part.expires), asInteger(part.tries),
                     static_cast<int>(part.state), asInteger(part.number), part.end, part.reason,
                     static_cast<int>(part.failure), part.cancel, part.host);
    keepBytes(part, bytes);
}

std::optional<Rollout> SqliteRolloutStore::rollout(const std::string& id) const {
    Statement found = database_.ask(kRolloutByName, id);
    if (!found.step()) return std::nullopt;
    return rolloutIn(found);
}

std::vector<Rollout> SqliteRolloutStore::rollouts(std::int64_t before, std::size_t most) const {
    return rowsOf(database_.ask(kRolloutsBefore, before, asInteger(most)), rolloutIn);
}

std::vector<Rollout> SqliteRolloutStore::running() const {
    return rowsOf(database_.ask(kRolloutsRunning), rolloutIn);
}

void SqliteRolloutStore::keep(const Rollout& rollout) {
    database_.change(kKeepRollout, static_cast<int>(rollout.state), static_cast<int>(rollout.cause),
                     rollout.reason, asInteger(rollout.since), asInteger(rollout.waves),
                     asInteger(rollout.wave), asInteger(rollout.began), asInteger(rollout.waveEnd),
                     rollout.row);
}

std::optional<Part> SqliteRolloutStore::part(std::int64_t row, const std::string& host) const {
    Statement found = database_.ask(kPartOfHost, host, row);
    if (!found.step()) return std::nullopt;
    return partIn(found);
}

void SqliteRolloutStore::keepPart(const Part& part) {
    database_.change(kKeepPart, asInteger(part.wave), part.order, asInteger(part.expires),
                     asInteger(part.tries), static_cast<int>(part.state), asInteger(part.number),
                     part.end, part.reason, static_cast<int>(part.failure), part.cancel,
                     part.rollout, asInteger(part.place));
    if (part.state != PartState::Waiting)
        database_.change(kDropWaitingOrder, part.rollout, asInteger(part.place));
}

std::string SqliteRolloutStore::bytesOf(const Part& part) const {
    return bytesIn(database_.ask(kWaitingOrder, part.rollout, asInteger(part.place)));
}

void SqliteRolloutStore::keepBytes(const Part& part, const std::string& bytes) {
    database_.change(kKeepWaitingOrder, part.rollout, asInteger(part.place), bytes);
}

void SqliteRolloutStore::release(const Part& part) {
    Part released = part;
    released.state = PartState::Released;
    keepPart(released);
    database_.change(kTellKnown, part.rollout, asInteger(part.place));
}

std::vector<Part> SqliteRolloutStore::waiting(std::int64_t row, std::size_t wave,
                                              std::size_t most) const {
    return rowsOf(database_.ask(kWaitingParts, row, asInteger(wave), asInteger(most)), partIn);
}

bool SqliteRolloutStore::hasWaiting(std::int64_t row) const {
    return database_.number(kHasWaiting, row) != 0;
}

std::size_t SqliteRolloutStore::countReleased(std::int64_t row, std::size_t wave) const {
    return static_cast<std::size_t>(database_.number(kCountReleased, row, asInteger(wave)));
}

bool SqliteRolloutStore::hasUnfinished(std::int64_t row, std::size_t wave) const {
    return database_.number(kHasUnfinished, row, asInteger(wave)) != 0;
}

bool SqliteRolloutStore::hasReleased(std::int64_t row) const {
    return database_.number(kHasReleased, row) != 0;
}

void SqliteRolloutStore::postponeWaiting(std::int64_t row, std::size_t wave) {
    database_.change(kPostponeWaiting, row, asInteger(wave));
}

void SqliteRolloutStore::cancelWaiting(std::int64_t row, const std::string& reason) {
    database_.change(kEndWaiting, kCancelled, reason, row);
    database_.change(kDropWaitingOrders, row);
}

bool SqliteRolloutStore::hasMoreFailures(std::int64_t row, std::size_t than) const {
    return database_.number(kHasMoreFailures, row, asInteger(than)) != 0;
}

void SqliteRolloutStore::forgiveFailures(std::int64_t row) {
    database_.change(kForgiveFailures, row);
}

std::vector<ToldPart> SqliteRolloutStore::told(std::size_t most) const {
    return rowsOf(database_.ask(kToldParts, asInteger(most)), toldIn);
}

void SqliteRolloutStore::forgetTold(const Part& part) {
    database_.change(kForgetTold, part.rollout, asInteger(part.place));
}

void SqliteRolloutStore::addCancel(const Part& part, const std::string& bytes) {
    database_.change(kAddCancel, part.rollout, asInteger(part.place), bytes);
}

std::vector<Part> SqliteRolloutStore::cancelsToRelease(std::size_t most) const {
    return rowsOf(database_.ask(kCancelsToRelease, asInteger(most)), partIn);
}

std::string SqliteRolloutStore::cancelBytesOf(const Part& part) const {
    return bytesIn(database_.ask(kCancelOrder, part.rollout, asInteger(part.place)));
}

void SqliteRolloutStore::forgetCancel(const Part& part) {
    database_.change(kForgetCancel, part.rollout, asInteger(part.place));
}

std::vector<Part> SqliteRolloutStore::expiringBy(std::int64_t row, Moment when,
                                                 std::size_t most) const {
    return rowsOf(database_.ask(kExpiringParts, row, asInteger(when), asInteger(most)), partIn);
}

std::vector<Part> SqliteRolloutStore::uncancelled(std::int64_t row, std::size_t most) const {
    return rowsOf(database_.ask(kUncancelledParts, row, kRefused, kExpired, asInteger(most)),
                  partIn);
}

std::vector<Part> SqliteRolloutStore::over(std::int64_t row) const {
    return rowsOf(database_.ask(kPartsOver, row), partIn);
}

std::vector<PartTally> SqliteRolloutStore::tallies(std::int64_t row) const {
    return rowsOf(database_.ask(kTallies, row), tallyIn);
}

std::size_t SqliteRolloutStore::countAway(std::int64_t row, Moment since) const {
    return static_cast<std::size_t>(database_.number(kCountAway, row, asInteger(since)));
}

std::size_t SqliteRolloutStore::countUnconfirmed(std::int64_t row, Moment now) const {
    return static_cast<std::size_t>(database_.number(
        kCountPastExpiry, row, static_cast<int>(PartState::Released), asInteger(now)));
}

std::size_t SqliteRolloutStore::countExpired(std::int64_t row, Moment now) const {
    return static_cast<std::size_t>(database_.number(
        kCountPastExpiry, row, static_cast<int>(PartState::Waiting), asInteger(now)));
}

std::vector<Part> SqliteRolloutStore::failures(std::int64_t row, std::size_t most) const {
    return rowsOf(database_.ask(kFailedParts, row, asInteger(most)), partIn);
}

std::vector<PartSight> SqliteRolloutStore::parts(std::int64_t row, std::size_t from,
                                                 std::size_t most) const {
    return rowsOf(database_.ask(kPartsFrom, row, asInteger(from), asInteger(most)), sightIn);
}

}  // namespace fleet
