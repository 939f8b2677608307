#include "tables/zav01agt.h"

#include <cstring>

#include "tables/table_manager.h"
#include "tasks/zavtasks.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zav01agt"};

using Row = zav_kagreqt_data_t;
constexpr std::array columns{
    ZAV_COLUMN(Row, originnode), ZAV_COLUMN(Row, transid),  ZAV_COLUMN(Row, command),
    ZAV_COLUMN(Row, product),    ZAV_COLUMN(Row, context),  ZAV_COLUMN(Row, optional),
    ZAV_COLUMN(Row, uaconfig),   ZAV_COLUMN(Row, uascript), ZAV_COLUMN(Row, retval),
    ZAV_COLUMN(Row, version),    ZAV_COLUMN(Row, retmsgid), ZAV_COLUMN(Row, retmsgparm),
    ZAV_COLUMN(Row, targetmsn),
};
static_assert(coversRow(columns, sizeof(Row)), "every field of the row is a column");

const TableSchema schema{"zav_kagreqt_base", columns.data(), static_cast<int>(columns.size()),
                         sizeof(Row), &traceUnit};

/// The columns of the filter that make up a request.
constexpr struct {
    const char* column;
    void (TaskQueueElem::*set)(String value);
} requestValues[] = {
    {"TRANSID", &TaskQueueElem::setTransid},     {"COMMAND", &TaskQueueElem::setCommand},
    {"PRODUCT", &TaskQueueElem::setProduct},     {"CONTEXT", &TaskQueueElem::setContext},
    {"OPTIONAL", &TaskQueueElem::setOptional},   {"UACONFIG", &TaskQueueElem::setUaconfig},
    {"UASCRIPT", &TaskQueueElem::setUascript},   {"VERSION", &TaskQueueElem::setVersion},
    {"TARGETMSN", &TaskQueueElem::setTargetmsn},
};

}  // namespace

const char* const zav_kagreqt_application = "ZAV";
const char* const zav_kagreqt_table = "KAGREQT";
zav_kagreqt_manager* zav_kagreqt_static_manager = nullptr;

int zav_kagreqt_init() {
    Trace trace(traceUnit);
    return trace.exit(
        registerTable(zav_kagreqt_static_manager, zav_kagreqt_application, zav_kagreqt_table));
}

rtoxa* zav_kagreqt_manager::CreateRtoxa(RequestDetail* detail, ContextInfo* context) {
    Trace trace(traceUnit);
    return createRequest<zav_kagreqt_agent>(trace, detail, context, this);
}

int zav_kagreqt_manager::EventArrived(zav_kagreqt_data_t* rows, int count) {
    Trace trace(traceUnit);
    zav_kagreqt_manager* const manager = managerInForce(zav_kagreqt_static_manager);
    return trace.exit(manager == nullptr ? 0 : manager->AddDataToEvent(rows, count));
}

int zav_kagreqt_manager::AddDataToEvent(zav_kagreqt_data_t* rows, int count) {
    Trace trace(traceUnit);
    return trace.exit(addDataToEvent<zav_kagreqt_base>(trace, *this, rows, count));
}

zav_kagreqt_base::zav_kagreqt_base(RequestDetail* detail, ContextInfo* context,
                                   TableManager* manager)
    : TypedTableRequest(schema, detail, context, manager) {}

zav_kagreqt_agent::zav_kagreqt_agent(RequestDetail* detail, ContextInfo* context,
                                     TableManager* manager)
    : zav_kagreqt_base(detail, context, manager) {
    Trace trace(traceUnit);
    TakeSampleConstructor();
}

zav_kagreqt_agent::~zav_kagreqt_agent() {
    Trace trace(traceUnit);
    TakeSampleDestructor();
}

void zav_kagreqt_agent::TakeSampleConstructor() {
    Trace trace(traceUnit);
    task_.setOriginnode(OXA_GetOriginnode(this));
    FLT1_FILTERINFO entry;
    while (GetFilterInfo(&entry) == 0) {
        for (const auto& request : requestValues) {
            if (std::strcmp(entry.columnName, request.column) != 0) continue;
            (task_.*request.set)(String(entry.value, entry.valueLength));
        }
    }
}

void zav_kagreqt_agent::TakeSampleDestructor() {
    Trace trace(traceUnit);
}

int zav_kagreqt_agent::TakeSample() {
    Trace trace(traceUnit);
    return trace.exit(guarded(trace, [this] {
        runTask(task_);
        zav_kagreqt_data_t row = task_.getReturnResults();
        return AddData(&row, 1);
    }));
}
