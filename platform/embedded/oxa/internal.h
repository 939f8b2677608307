/// What the sources of the embedded agent framework share.
#pragma once

#include <atomic>
#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "embedded/oxa_host.h"
#include "platform/oxa.h"

/// What a request asks, as the framework hands it through a table's classes to the base class.
struct RequestDetail {
    const std::vector<oxa::Predicate>& where;
};

/// For whom it asks.
struct ContextInfo {
    int sampleType = 0;  ///< 0 = plain query, 1 = subscription
    int interval = 0;    ///< seconds
};

/// What the framework keeps of one table under its two names. Made when a manager of these names is
/// first made and never destroyed: subscriptions may outlive a manager, and threads the statics.
struct OxaTable {
    OxaTable(std::string applicationName, std::string tableName)
        : application(std::move(applicationName)), name(std::move(tableName)) {}

    const std::string application;
    const std::string name;

    std::mutex liveLock;  ///< guards the list: its two ends and the links in the objects
    rtoxa* first = nullptr;
    rtoxa* last = nullptr;

    // Guarded by the registry's lock:
    TableManager* manager = nullptr;  ///< null while nobody offers the table
    bool columnsKnown = false;        ///< of this manager
    std::vector<oxa::Column> columns;
};

struct rtoxa::State {
    State(OxaTable& ofTable, unsigned objectNumber) : table(ofTable), number(objectNumber) {}

    OxaTable& table;
    const unsigned number;
    int sampleType = 0;
    int interval = 0;

    std::vector<oxa::Predicate> filter;
    std::size_t nextEntry = 0;
    /// For each entry whether its column exists; empty until the first row is checked.
    std::vector<bool> restricts;

    oxa::Rows rows;
    unsigned allocationDefault = 1;
    std::size_t allocated = 0;  ///< rows

    // Guarded by the table's live lock:
    rtoxa* previous = nullptr;
    rtoxa* next = nullptr;

    std::mutex sinkLock;  ///< guards the sink and is held while it runs
    oxa::Sink sink;       ///< empty for plain queries and when the requester has gone

    /// Twice the number of uses, plus 1 while the framework keeps the object. 0 ends its life.
    std::atomic<unsigned> references{1};
};

/// The framework's way into the two classes.
struct OxaAccess {
    using State = rtoxa::State;
    static rtoxa::State& state(rtoxa& object) { return *object.state_; }
    static OxaTable& table(TableManager& manager) { return manager.table_; }
};

namespace oxa {

/// Lets an object go that the framework has kept: it is destroyed now, or by its last Drop().
struct Release {
    void operator()(rtoxa* object) const;
};
using OwnedObject = std::unique_ptr<rtoxa, Release>;

/// The table of these names; made when there is none yet.
OxaTable& tableNamed(const std::string& application, const std::string& table);

/// A table that somebody offers, and its manager; both null when nobody does.
struct Offer {
    OxaTable* table = nullptr;
    TableManager* manager = nullptr;
};
Offer offerOf(const std::string& table);

/// All tables that are offered, in the order of their registration.
std::vector<Offer> offers();

/// Keeps the columns of a table for the next asker, unless its manager has changed since.
void rememberColumns(const Offer& offer, const std::vector<Column>& columns);
/// True and the columns, if they are known.
bool recallColumns(const Offer& offer, std::vector<Column>& columns);

/// What an object says of its columns, names in upper case.
std::vector<Column> columnsOf(rtoxa& object);

}  // namespace oxa
