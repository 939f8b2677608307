/// What the managers of all tables share.
#pragma once

#include <memory>
#include <vector>

#include "base/zavtrace.h"
#include "platform/oxa.h"
#include "tables/table_request.h"

/// Holds a table's lock, which guards its list of live requests.
class TableLock {
public:
    explicit TableLock(TableManager& manager) : manager_(manager) { manager_.lock(); }
    ~TableLock() { manager_.unlock(); }
    TableLock(const TableLock&) = delete;
    TableLock& operator=(const TableLock&) = delete;

private:
    TableManager& manager_;
};

/// Keeps a live request from being destroyed.
class RequestUse {
public:
    explicit RequestUse(rtoxa& request) : request_(request) {
        request_.UseHandle(request_.Handle());
    }
    ~RequestUse() { request_.Drop(); }
    RequestUse(const RequestUse&) = delete;
    RequestUse& operator=(const RequestUse&) = delete;

private:
    rtoxa& request_;
};

/// Reads a table's global manager pointer, which is null before start-up. Atomic, because events
/// arrive on other threads while the table may be registered again.
template <typename Manager>
Manager* managerInForce(Manager* const& staticManager) {
    return __atomic_load_n(&staticManager, __ATOMIC_ACQUIRE);
}

/// Creates the table's manager and registers it in place of an earlier one. The manager lives until
/// the process ends. Returns the status of the registration, or OXA_NO_MEMORY when the manager
/// cannot be created. One thread at a time.
template <typename Manager>
int registerTable(Manager*& staticManager, const char* application, const char* table) {
    Manager* manager = nullptr;
    try {
        // Never destroyed, like the managers in it: earlier ones may still have live requests.
        static auto& made = *new std::vector<std::unique_ptr<Manager>>;
        made.push_back(std::make_unique<Manager>(application, table));
        manager = made.back().get();
    } catch (...) {
        return OXA_NO_MEMORY;
    }
    __atomic_store_n(&staticManager, manager, __ATOMIC_RELEASE);
    return manager->RegisterWithManager();
}

/// Gives the rows to every live request of a manager; each dispatches those that pass its filter.
/// All requests of the manager must be of class Request. Returns the last status other than 0, or
/// 0. A request that fails does not keep the rows from the others.
template <typename Request, typename Row>
int addDataToEvent(const ZAV::Trace& trace, TableManager& manager, Row* rows, int count) {
    int result = OXA_OK;
    const TableLock lock(manager);
    RtoxaListIter live(&manager);
    while (rtoxa* const object = live.Next()) {
        const RequestUse use(*object);
        const int status = guarded(trace, [&] {
            static_cast<Request*>(object)->AddData(rows, count);
            return object->Dispatch();
        });
        if (status != OXA_OK) result = status;
        object->ClearCount();
    }
    return result;
}

/// Creates the object of one request, which the framework then owns. Returns null on failure.
template <typename Request, typename Manager>
rtoxa* createRequest(const ZAV::Trace& trace, RequestDetail* detail, ContextInfo* context,
                     Manager* manager) {
    rtoxa* made = nullptr;
    guarded(trace, [&] {
        made = std::make_unique<Request>(detail, context, manager).release();
        return 0;
    });
    return made;
}
