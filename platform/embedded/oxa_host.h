/// The framework seen from the process that serves requesters: which tables there are, queries on
/// them and live subscriptions. A host includes this header; a table's own library never does.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/oxa.h"

namespace oxa {

/// One column as requesters know it.
struct Column {
    std::string name;   ///< upper case
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

/// Names the node that this process stands for; call before requests are served. Longer than 64
/// bytes is cut.
void setOriginNode(const std::string& name);
std::string originNode();

/// The registered tables in the order of their registration, with their columns.
std::vector<Table> tables();

/// Runs one plain query on the calling thread, for as long as the table takes. Predicates are
/// handed on as they are, unknown columns included. Returns 0 and the rows, or a status.
/// OXA_GONE: no such table.
int query(const std::string& table, const std::vector<Predicate>& where, Rows& rows);

/// Takes rows as they come, on the thread that dispatches them and under the table's lock: it must
/// return at once and must not call back into the framework. Returns 0, OXA_OVERFLOW or OXA_GONE.
using Sink = std::function<int(const Rows& rows)>;

/// A live subscription. While it exists its sink may be called; once the destructor has returned
/// it is not called any more.
class Subscription {
public:
    virtual ~Subscription() = default;
};

/// Opens a subscription; it is live when the function returns. Null when there is no such table.
std::unique_ptr<Subscription> subscribe(const std::string& table,
                                        const std::vector<Predicate>& where, Sink sink);

}  // namespace oxa
