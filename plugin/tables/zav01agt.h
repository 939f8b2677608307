/// KAGREQT, the table by which requests come in. The values of a query's filter are the request;
/// the answer is one row that repeats them with the outcome of checking or running the command.
#pragma once

#include "tables/table_request.h"
#include "tasks/request_row.h"
#include "tasks/zavtqelm.h"

class zav_kagreqt_manager;

/// The table's names, and its manager since start-up, null before.
[[gnu::visibility("default")]] extern const char* const zav_kagreqt_application;
[[gnu::visibility("default")]] extern const char* const zav_kagreqt_table;
[[gnu::visibility("default")]] extern zav_kagreqt_manager* zav_kagreqt_static_manager;

/// Makes the table's manager and registers it. Returns the registration's status, or
/// OXA_NO_MEMORY.
int zav_kagreqt_init();

/// Offers the table to the framework. One lives from start-up to the end of the process.
class zav_kagreqt_manager : public TableManager {
public:
    using TableManager::TableManager;
    ~zav_kagreqt_manager() override = default;

    /// A new zav_kagreqt_agent, which the caller owns; null when it cannot be made.
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override;

    /// Gives `count` rows to the table's live requests; 0 when there is no manager. Any thread.
    static int EventArrived(zav_kagreqt_data_t* rows, int count);
    /// Gives the rows to each live request, under the table's lock, and dispatches what its filter
    /// lets through. Returns the last status with which one refused, or 0. Any thread.
    int AddDataToEvent(zav_kagreqt_data_t* rows, int count);
};

/// A request on the table; knows its columns. The accessors point into row `row`, which must be
/// held, and are valid until rows are next added or cleared.
class zav_kagreqt_base : public TypedTableRequest<zav_kagreqt_data_t> {
public:
    zav_kagreqt_base(RequestDetail* detail, ContextInfo* context, TableManager* manager);

    char* _get_value_originnode(int row) const { return GetRow(row)->originnode; }
    char* _get_value_transid(int row) const { return GetRow(row)->transid; }
    char* _get_value_command(int row) const { return GetRow(row)->command; }
    char* _get_value_product(int row) const { return GetRow(row)->product; }
    char* _get_value_context(int row) const { return GetRow(row)->context; }
    char* _get_value_optional(int row) const { return GetRow(row)->optional; }
    char* _get_value_uaconfig(int row) const { return GetRow(row)->uaconfig; }
    char* _get_value_uascript(int row) const { return GetRow(row)->uascript; }
    int* _get_value_retval(int row) const { return &GetRow(row)->retval; }
    char* _get_value_version(int row) const { return GetRow(row)->version; }
    char* _get_value_retmsgid(int row) const { return GetRow(row)->retmsgid; }
    char* _get_value_retmsgparm(int row) const { return GetRow(row)->retmsgparm; }
    char* _get_value_targetmsn(int row) const { return GetRow(row)->targetmsn; }
};

/// One request: its record is filled from the filter when the request is made.
class zav_kagreqt_agent : public zav_kagreqt_base {
public:
    zav_kagreqt_agent(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    ~zav_kagreqt_agent() override;

    /// Runs or queues the command and adds the row that answers it. Blocks for as long as a command
    /// that runs at once takes.
    int TakeSample() override;

    /// Takes the request's values from the filter. A column named twice keeps the last value; names
    /// of columns that say nothing about a request, and unknown ones, are passed over.
    void TakeSampleConstructor();
    /// Only traces.
    void TakeSampleDestructor();

private:
    TaskQueueElem task_;
};
