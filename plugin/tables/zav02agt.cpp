#include "tables/zav02agt.h"

#include "tables/table_manager.h"

using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zav02agt"};

using Row = zav_kagdyst_data_t;
constexpr std::array columns{
    ZAV_COLUMN(Row, originnode), ZAV_COLUMN(Row, transid),  ZAV_COLUMN(Row, command),
    ZAV_COLUMN(Row, retval),     ZAV_COLUMN(Row, retmsgid), ZAV_COLUMN(Row, retmsgparm),
    ZAV_COLUMN(Row, targetmsn),
};
static_assert(coversRow(columns, sizeof(Row)), "every field of the row is a column");

const TableSchema schema{"zav_kagdyst_base", columns.data(), static_cast<int>(columns.size()),
                         sizeof(Row), &traceUnit};

}  // namespace

const char* const zav_kagdyst_application = "ZAV";
const char* const zav_kagdyst_table = "KAGDYST";
zav_kagdyst_manager* zav_kagdyst_static_manager = nullptr;

int zav_kagdyst_init() {
    Trace trace(traceUnit);
    return trace.exit(
        registerTable(zav_kagdyst_static_manager, zav_kagdyst_application, zav_kagdyst_table));
}

int publishDeployStatus(zav_kagdyst_data_t* rows, int count) {
    return zav_kagdyst_manager::EventArrived(rows, count);
}

rtoxa* zav_kagdyst_manager::CreateRtoxa(RequestDetail* detail, ContextInfo* context) {
    Trace trace(traceUnit);
    return createRequest<zav_kagdyst_agent>(trace, detail, context, this);
}

int zav_kagdyst_manager::EventArrived(zav_kagdyst_data_t* rows, int count) {
    Trace trace(traceUnit);
    zav_kagdyst_manager* const manager = managerInForce(zav_kagdyst_static_manager);
    return trace.exit(manager == nullptr ? 0 : manager->AddDataToEvent(rows, count));
}

int zav_kagdyst_manager::AddDataToEvent(zav_kagdyst_data_t* rows, int count) {
    Trace trace(traceUnit);
    return trace.exit(addDataToEvent<zav_kagdyst_base>(trace, *this, rows, count));
}

zav_kagdyst_base::zav_kagdyst_base(RequestDetail* detail, ContextInfo* context,
                                   TableManager* manager)
    : TypedTableRequest(schema, detail, context, manager) {}

zav_kagdyst_agent::zav_kagdyst_agent(RequestDetail* detail, ContextInfo* context,
                                     TableManager* manager)
    : zav_kagdyst_base(detail, context, manager) {
    Trace trace(traceUnit);
    TakeSampleConstructor();
}

zav_kagdyst_agent::~zav_kagdyst_agent() {
    Trace trace(traceUnit);
    TakeSampleDestructor();
}

void zav_kagdyst_agent::TakeSampleConstructor() {
    Trace trace(traceUnit);
}

void zav_kagdyst_agent::TakeSampleDestructor() {
    Trace trace(traceUnit);
}

int zav_kagdyst_agent::TakeSample() {
    Trace trace(traceUnit);
    return trace.exit(0);
}
