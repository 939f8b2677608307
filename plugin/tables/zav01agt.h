/// KAGREQT, the table through which requests come in. The values in a query's filter are the
/// request. The answer is one row that repeats them, with the result of checking or running the
/// command.
#pragma once

#include "tables/table_request.h"
#include "tasks/request_row.h"
#include "tasks/zavtqelm.h"

class zav_kagreqt_manager;

/// The table's names, and its manager, which is null until start-up.
[[gnu::visibility("default")]] extern const char* const zav_kagreqt_application;
[[gnu::visibility("default")]] extern const char* const zav_kagreqt_table;
[[gnu::visibility("default")]] extern zav_kagreqt_manager* zav_kagreqt_static_manager;

/// Creates the table's manager and registers it. Returns the status of the registration, or
/// OXA_NO_MEMORY.
int zav_kagreqt_init();

/// Offers the table to the framework. There is one from start-up until the process ends.
class zav_kagreqt_manager : public TableManager {
public:
    using TableManager::TableManager;
    ~zav_kagreqt_manager() override = default;

    /// Creates a zav_kagreqt_agent, which the caller owns. Returns null on failure.
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override;

    /// Gives `count` rows to the table's live requests. Returns 0 when there is no manager. Any
    /// thread.
    static int EventArrived(zav_kagreqt_data_t* rows, int count);
    /// Gives the rows to each live request, under the table's lock, and dispatches those that pass
    /// its filter. Returns the last status other than 0, or 0. Any thread.
    int AddDataToEvent(zav_kagreqt_data_t* rows, int count);
};

/// A request on the table, with access to its columns. The accessors return pointers into row
/// `row`, which the request must hold; they are valid until rows are next added or cleared.
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

/// One request. Its task record is filled from the filter when the request is created.
class zav_kagreqt_agent : public zav_kagreqt_base {
public:
    zav_kagreqt_agent(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    ~zav_kagreqt_agent() override;

    /// Runs or queues the command and adds the row that answers it. A command that runs at once
    /// blocks until it has ended.
    int TakeSample() override;

    /// Reads the request's values from the filter. When a column appears twice, the last value
    /// wins. Ignores unknown columns and those that are not part of a request.
    void TakeSampleConstructor();
    /// Only traces.
    void TakeSampleDestructor();

private:
    TaskQueueElem task_;
};
