/// KAGDYST, the table of outcomes. Its rows exist only as events: one for each queued command that
/// has ended, sent to those who are subscribed at that moment.
#pragma once

#include "tables/table_request.h"
#include "tasks/deploy_status.h"

class zav_kagdyst_manager;

/// The table's names, and its manager, which is null until start-up.
[[gnu::visibility("default")]] extern const char* const zav_kagdyst_application;
[[gnu::visibility("default")]] extern const char* const zav_kagdyst_table;
[[gnu::visibility("default")]] extern zav_kagdyst_manager* zav_kagdyst_static_manager;

/// Creates the table's manager and registers it. Returns the status of the registration, or
/// OXA_NO_MEMORY.
int zav_kagdyst_init();

/// Offers the table to the framework. There is one from start-up until the process ends.
class zav_kagdyst_manager : public TableManager {
public:
    using TableManager::TableManager;
    ~zav_kagdyst_manager() override = default;

    /// Creates a zav_kagdyst_agent, which the caller owns. Returns null on failure.
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override;

    /// Gives `count` rows to the table's live requests. Without a manager the rows are lost and the
    /// result is 0. Any thread; the executor calls it.
    static int EventArrived(zav_kagdyst_data_t* rows, int count);
    /// Gives the rows to each live request, under the table's lock, and dispatches those that pass
    /// its filter. Returns the last status other than 0, or 0. Any thread.
    int AddDataToEvent(zav_kagdyst_data_t* rows, int count);
};

/// A request on the table, with access to its columns. The accessors return pointers into row
/// `row`, which the request must hold; they are valid until rows are next added or cleared.
class zav_kagdyst_base : public TypedTableRequest<zav_kagdyst_data_t> {
public:
    zav_kagdyst_base(RequestDetail* detail, ContextInfo* context, TableManager* manager);

    char* _get_value_originnode(int row) const { return GetRow(row)->originnode; }
    char* _get_value_transid(int row) const { return GetRow(row)->transid; }
    char* _get_value_command(int row) const { return GetRow(row)->command; }
    int* _get_value_retval(int row) const { return &GetRow(row)->retval; }
    char* _get_value_retmsgid(int row) const { return GetRow(row)->retmsgid; }
    char* _get_value_retmsgparm(int row) const { return GetRow(row)->retmsgparm; }
    char* _get_value_targetmsn(int row) const { return GetRow(row)->targetmsn; }
};

/// One subscription, or one query, whose answer has no rows.
class zav_kagdyst_agent : public zav_kagdyst_base {
public:
    zav_kagdyst_agent(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    ~zav_kagdyst_agent() override;

    /// Adds no row.
    int TakeSample() override;

    /// Both only trace; there is nothing to keep between samples.
    void TakeSampleConstructor();
    void TakeSampleDestructor();
};
