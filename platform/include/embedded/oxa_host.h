/// The agent framework as the host process sees it: the registered tables, queries and live
/// subscriptions. A library that offers tables never includes this header.
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/oxa.h"

namespace oxa {

/// One column of a table.
struct Column {
    std::string name;  ///< upper case
    int offset = 0;
    int length = 0;
    int type = OXA_TYPE_CHARACTER;
};

/// One registered table.
struct Table {
    std::string application;
    std::string name;
    std::vector<Column> columns;
    /// The column of exactly this name, or null. Owned by the table.
    const Column* find(const std::string& column) const;
};

/// One condition. The conditions of a request are combined with AND.
struct Predicate {
    std::string column;
    _IntfOper op = OPER_EQ;
    std::string value;
};

/// Rows of one table, `rowSize` bytes each, without gaps.
struct Rows {
    std::string bytes;
    unsigned rowSize = 0;
    std::size_t count() const { return rowSize == 0 ? 0 : bytes.size() / rowSize; }
    const char* row(std::size_t index) const { return bytes.data() + index * rowSize; }
};

/// Sets the name of the node that this process represents; it is the host name until then. Names
/// are cut to 64 bytes. Requests that are running meanwhile may see either name. Any thread.
void setOriginNode(const std::string& name);
std::string originNode();

/// The registered tables with their columns, in the order of their first registration. A table is
/// asked for its columns once, through an object that is never sampled.
std::vector<Table> tables();

/// Runs one plain query on the calling thread and blocks until the table has answered. Predicates
/// are passed on unchanged, even on unknown columns. Returns 0 or a status: OXA_GONE if there is no
/// such table, OXA_NO_MEMORY, OXA_FAILED if the table's code threw, or the table's own status.
/// `rows` holds what was collected until then. Any thread.
int query(const std::string& table, const std::vector<Predicate>& where, Rows& rows);

/// Judges rows by a request's conditions, exactly as the table itself does for its own requests.
/// For those who take a table's rows through one subscription and hand them on. One thread at a
/// time.
class Filter {
public:
    virtual ~Filter() = default;
    /// Whether the row, of the table's row size, satisfies every condition. Throws what the table's
    /// code throws.
    virtual bool takes(const char* row) = 0;
};

/// A filter on one table. Runs the table's code, but samples nothing. Null when there is no such
/// table or it could not make an object.
std::unique_ptr<Filter> makeFilter(const std::string& table, const std::vector<Predicate>& where);

/// Receives the rows of a subscription, on the thread that dispatches them and under the table's
/// lock. It must return quickly and must not call the framework. Returns 0, OXA_OVERFLOW or
/// OXA_GONE. If it throws, that counts as OXA_OVERFLOW: these rows are lost, later ones are still
/// delivered.
using Sink = std::function<int(const Rows& rows)>;

/// In a sink: has `call` run on this thread as soon as the thread has given the table's lock back;
/// at once when it holds none. The call may take as long as it likes and may use the framework.
/// Several run in the order in which they came. What a call throws ends the process. Throws
/// std::bad_alloc, and then `call` does not run.
void whenUnlocked(std::function<void()> call);

/// A live subscription. Its sink may be called as long as it exists; when the destructor returns,
/// the sink has been destroyed. The destructor waits for the table's lock: do not destroy a
/// subscription in a sink, nor while holding a lock that a sink takes.
class Subscription {
public:
    virtual ~Subscription() = default;
};

/// Opens a subscription, which is live when the function returns. Returns null if there is no such
/// table or if the table could not make an object. Any thread.
std::unique_ptr<Subscription> subscribe(const std::string& table,
                                        const std::vector<Predicate>& where, Sink sink);

}  // namespace oxa
