/// KINAGT, the table of the products that are installed under the home directory, one row each.
/// Every query runs the home's programs again.
#pragma once

#include <cstddef>

#include "tables/table_request.h"

/// All columns are padded with blanks and not 0-terminated. Requesters see this layout; it is the
/// same on 32 and 64 bits.
struct zav_kinagt_data_t {
    char originnode[64];
    char tovrinhome[512];
    char hosttype[5];
    char hostpc[10];
    char product[32];
    char version[12];
    char proddesc[80];
    char release[12];
    char platform[20];
};

static_assert(sizeof(zav_kinagt_data_t) == 747, "the row's size is fixed");
static_assert(offsetof(zav_kinagt_data_t, originnode) == 0, "column offsets are fixed");
static_assert(offsetof(zav_kinagt_data_t, tovrinhome) == 64, "column offsets are fixed");
static_assert(offsetof(zav_kinagt_data_t, hosttype) == 576, "column offsets are fixed");
static_assert(offsetof(zav_kinagt_data_t, hostpc) == 581, "column offsets are fixed");
static_assert(offsetof(zav_kinagt_data_t, product) == 591, "column offsets are fixed");
static_assert(offsetof(zav_kinagt_data_t, version) == 623, "column offsets are fixed");
static_assert(offsetof(zav_kinagt_data_t, proddesc) == 635, "column offsets are fixed");
static_assert(offsetof(zav_kinagt_data_t, release) == 715, "column offsets are fixed");
static_assert(offsetof(zav_kinagt_data_t, platform) == 727, "column offsets are fixed");

class zav_kinagt_manager;

/// The table's names, and its manager, which is null until start-up.
[[gnu::visibility("default")]] extern const char* const zav_kinagt_application;
[[gnu::visibility("default")]] extern const char* const zav_kinagt_table;
[[gnu::visibility("default")]] extern zav_kinagt_manager* zav_kinagt_static_manager;

/// Creates the table's manager and registers it. Returns the status of the registration, or
/// OXA_NO_MEMORY.
int zav_kinagt_init();

/// Offers the table to the framework. There is one from start-up until the process ends.
class zav_kinagt_manager : public TableManager {
public:
    using TableManager::TableManager;
    ~zav_kinagt_manager() override = default;

    /// Creates a zav_kinagt_agent, which the caller owns. Returns null on failure.
    rtoxa* CreateRtoxa(RequestDetail* detail, ContextInfo* context) override;

    /// Gives `count` rows to the table's live requests. Returns 0 when there is no manager. Any
    /// thread.
    static int EventArrived(zav_kinagt_data_t* rows, int count);
    /// Gives the rows to each live request, under the table's lock, and dispatches those that pass
    /// its filter. Returns the last status other than 0, or 0. Any thread.
    int AddDataToEvent(zav_kinagt_data_t* rows, int count);
};

/// A request on the table, with access to its columns. The accessors return pointers into row
/// `row`, which the request must hold; they are valid until rows are next added or cleared.
class zav_kinagt_base : public TypedTableRequest<zav_kinagt_data_t> {
public:
    zav_kinagt_base(RequestDetail* detail, ContextInfo* context, TableManager* manager);

    char* _get_value_originnode(int row) const { return GetRow(row)->originnode; }
    char* _get_value_tovrinhome(int row) const { return GetRow(row)->tovrinhome; }
    char* _get_value_hosttype(int row) const { return GetRow(row)->hosttype; }
    char* _get_value_hostpc(int row) const { return GetRow(row)->hostpc; }
    char* _get_value_product(int row) const { return GetRow(row)->product; }
    char* _get_value_version(int row) const { return GetRow(row)->version; }
    char* _get_value_proddesc(int row) const { return GetRow(row)->proddesc; }
    char* _get_value_release(int row) const { return GetRow(row)->release; }
    char* _get_value_platform(int row) const { return GetRow(row)->platform; }
};

/// One query.
class zav_kinagt_agent : public zav_kinagt_base {
public:
    zav_kinagt_agent(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    ~zav_kinagt_agent() override;

    /// Runs the architecture probe and the inventory program and adds a row for each product.
    /// Blocks until both have ended. What their output lacks is traced, and missing in the rows.
    /// Returns 0, or the status of an insert that failed, which ends the sample.
    int TakeSample() override;

    /// Both only trace; there is nothing to keep between samples.
    void TakeSampleConstructor();
    void TakeSampleDestructor();

private:
    int addProducts();
};
