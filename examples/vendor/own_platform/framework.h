/// Shared by the sources of the table framework: what it keeps of tables and requests.
#pragma once

#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "own_platform/tables.h"
#include "platform/oxa.h"

/// A request's filter and kind, on their way through the table's own classes.
struct RequestDetail {
    const vendor::Conditions& where;
};
struct ContextInfo {
    bool isSubscription;
};

/// A table, known by its two names, whoever manages it.
struct OxaTable {
    std::string application;
    std::string name;
    std::mutex lock;                  ///< guards the list
    std::vector<rtoxa*> live;         ///< in the order in which they came
    TableManager* manager = nullptr;  ///< guarded by the registry's lock; null if there is none
};

struct rtoxa::State {
    OxaTable* table = nullptr;
    unsigned number = 0;
    bool isSubscription = false;
    vendor::Conditions filter;
    std::size_t nextEntry = 0;

    unsigned rowSize = 0;
    unsigned allocationDefault = 1;
    std::string rows;  ///< without gaps

    std::mutex sinkLock;  ///< guards the sink and is held while it runs
    vendor::Sink sink;    ///< empty for plain queries and after the subscription's end

    std::mutex useLock;  ///< guards the two below
    unsigned uses = 0;
    bool isKept = true;  ///< by the framework
};

/// Gives the framework access to an object's private state.
struct OxaAccess {
    static rtoxa::State& state(rtoxa& object) { return *object.state_; }
    static const rtoxa::State& state(const rtoxa& object) { return *object.state_; }
};

namespace vendor {

/// The manager of a registered table, or null.
TableManager* managerOf(const std::string& table);

/// The columns that an object describes.
std::vector<Column> columnsOf(rtoxa& object);

/// Copies of the rows that an object holds.
Rows rowsOf(const rtoxa& object);

}  // namespace vendor
