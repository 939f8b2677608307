/// The framework seen from the process that serves requesters: which tables there are, queries on
/// them and live subscriptions. A host includes this header; a table's own library never does.
#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/oxa.h"

namespace oxa {

/// One column as requesters know it.
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
    /// The column of that exact name, or null.
    const Column* find(const std::string& column) const;
};

/// One condition; conditions of a request are combined with AND.
struct Predicate {
    std::string column;
    _IntfOper op = OPER_EQ;
    std::string value;
};

/// Rows of one table, one behind the other, `rowSize` bytes each.
struct Rows {
    std::string bytes;
    unsigned rowSize = 0;
    std::size_t count() const { return rowSize == 0 ? 0 : bytes.size() / rowSize; }
    const char* row(std::size_t index) const { return bytes.data() + index * rowSize; }
};

/// Names the node that this process stands for, until then the machine's host name. Longer than 64
/// bytes is cut. Requests that are being served meanwhile may see either name.
void setOriginNode(const std::string& name);
std::string originNode();

/// The registered tables in the order of their registration, with their columns. A table is asked
/// for its columns once, by way of an object that is never sampled.
std::vector<Table> tables();

/// Runs one plain query on the calling thread, for as long as the table takes. Predicates are
/// handed on as they are, unknown columns included. Returns 0, or a status: OXA_GONE when there is
/// no such table, OXA_NO_MEMORY, OXA_FAILED when the table's code threw, or what the table said.
/// `rows` holds what was collected up to then.
int query(const std::string& table, const std::vector<Predicate>& where, Rows& rows);

/// Takes rows as they come, on the thread that dispatches them and under the table's lock: it must
/// return at once and must not call back into the framework. Returns 0, OXA_OVERFLOW or OXA_GONE.
/// A sink that throws counts as one that answered OXA_OVERFLOW: these rows are lost, later ones
/// reach it again.
using Sink = std::function<int(const Rows& rows)>;

/// A live subscription. While it exists its sink may be called; once the destructor has returned
/// it is not called any more and has been destroyed. The destructor waits for a walk over the
/// table's live objects: it must not run under a lock that a sink takes, nor in a sink.
class Subscription {
public:
    virtual ~Subscription() = default;
};

/// Opens a subscription; it is live when the function returns. Null when there is no such table or
/// it could not make an object.
std::unique_ptr<Subscription> subscribe(const std::string& table,
                                        const std::vector<Predicate>& where, Sink sink);

}  // namespace oxa
