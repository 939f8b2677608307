/// KAGDYST, the table of outcomes. Its rows exist as events only: one for each queued command that
/// has ended, given to whoever is subscribed at that moment.
#pragma once

#include "tables/table_request.h"
#include "tasks/deploy_status.h"

class zav_kagdyst_manager;

/// The table's names, and its manager since start-up, null before.
[[gnu::visibility("default")]] extern const char* const zav_kagdyst_application;
[[gnu::visibility("default")]] extern const char* const zav_kagdyst_table;
[[gnu::visibility("default")]] extern zav_kagdyst_manager* zav_kagdyst_static_manager;

/// Makes the table's manager and registers it. Returns the registration's status, or
/// OXA_NO_MEMORY.
int zav_kagdyst_init();

/// Offers the table to the framework. One lives from start-up to the end of the process.
class zav_kagdyst_manager : public TableManager {
public:
    using TableManager::TableManager;
    ~zav_kagdyst_manager() override = default;

    /// A new zav_kagdyst_agent, which the caller owns; null when it cannot be made.
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override;

    /// Gives `count` rows to the table's live requests; 0 when there is no manager, and then the
    /// rows are lost. Any thread; called by the executor.
    static int EventArrived(zav_kagdyst_data_t* rows, int count);
    /// Gives the rows to each live request, under the table's lock, and dispatches what its filter
    /// lets through. Returns the last status with which one refused, or 0. Any thread.
    int AddDataToEvent(zav_kagdyst_data_t* rows, int count);
};

/// A request on the table; knows its columns. The accessors point into row `row`, which must be
/// held, and are valid until rows are next added or cleared.
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

/// One query, which is answered without rows, or one subscription.
class zav_kagdyst_agent : public zav_kagdyst_base {
public:
    zav_kagdyst_agent(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    ~zav_kagdyst_agent() override;

    /// Adds no row.
    int TakeSample() override;

    /// Both only trace: nothing is kept between samples.
    void TakeSampleConstructor();
    void TakeSampleDestructor();
};
