/// Shared by the sources of the embedded agent framework.
#pragma once

#include <atomic>
#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "embedded/oxa_host.h"
#include "platform/oxa.h"

/// A request's filter, on its way through a table's classes to the base class.
struct RequestDetail {
    const std::vector<oxa::Predicate>& where;
};

/// How the request is to be answered.
struct ContextInfo {
    int sampleType = 0;  ///< 0 = plain query, 1 = subscription
    int interval = 0;    ///< seconds
};

/// One table, known by its two names. Made together with the first manager of these names and never
/// destroyed: subscriptions may outlive managers, and threads may outlive static objects.
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
    bool columnsKnown = false;        ///< `columns` are those of this manager
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

    /// Twice the number of uses, plus 1 while the framework keeps the object. At 0 it is destroyed.
    std::atomic<unsigned> references{1};
};

/// Gives the framework access to private members of the two classes.
struct OxaAccess {
    using State = rtoxa::State;
    static rtoxa::State& state(rtoxa& object) { return *object.state_; }
    static OxaTable& table(TableManager& manager) { return manager.table_; }
};

namespace oxa {

/// Ends the framework's hold on an object, which is destroyed now or by its last Drop().
struct Release {
    void operator()(rtoxa* object) const;
};
using OwnedObject = std::unique_ptr<rtoxa, Release>;

/// The calling thread has taken the lock of a table, or has given it back; then what waits for that
/// runs.
void tableLocked();
void tableUnlocked() noexcept;

/// The table of these names, which is made if there is none yet.
OxaTable& tableNamed(const std::string& application, const std::string& table);

/// A registered table and its manager; both null if there is none.
struct Offer {
    OxaTable* table = nullptr;
    TableManager* manager = nullptr;
};
Offer offerOf(const std::string& table);

/// All registered tables, in the order of their first registration.
std::vector<Offer> offers();

/// Stores the columns of a table, unless its manager has changed since.
void rememberColumns(const Offer& offer, const std::vector<Column>& columns);
/// Fetches the stored columns; false if there are none.
bool recallColumns(const Offer& offer, std::vector<Column>& columns);

/// The columns that an object describes, with names in upper case.
std::vector<Column> columnsOf(rtoxa& object);

}  // namespace oxa
