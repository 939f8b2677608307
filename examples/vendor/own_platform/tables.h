/// The vendor's table framework as the agent sees it: tables are served from memory, to requesters
/// within the process.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/oxa.h"

namespace vendor {

/// One condition of a request; all of them must hold.
struct Condition {
    std::string column;
    _IntfOper op = OPER_EQ;
    std::string value;
};
using Conditions = std::vector<Condition>;

/// Rows in their tables' own layout.
using Rows = std::vector<std::string>;

/// A column; its name is in upper case.
struct Column {
    std::string name;
    int offset = 0;
    int length = 0;
    int type = OXA_TYPE_CHARACTER;
};

/// The columns of a registered table; none when there is no such table.
std::vector<Column> columnsOf(const std::string& table);

/// Runs one query. Returns the table's status, or OXA_GONE when there is no such table.
int query(const std::string& table, const Conditions& where, Rows& rows);

/// Takes the rows of a subscription, under the table's lock; returns what the table's dispatch is
/// to return.
using Sink = std::function<int(const Rows&)>;

/// A live subscription. Its destructor waits for a sink that is running; it must not be called by
/// one.
class Subscription {
public:
    virtual ~Subscription() = default;
};

/// Opens a subscription; null when there is no such table.
std::unique_ptr<Subscription> subscribe(const std::string& table, const Conditions& where,
                                        Sink sink);

}  // namespace vendor
