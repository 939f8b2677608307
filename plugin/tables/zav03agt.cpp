#include "tables/zav03agt.h"

#include "base/zavstr.h"
#include "tables/inventory.h"
#include "tables/table_manager.h"
#include "tasks/home.h"
#include "tasks/zavtqelm.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zav03agt"};

using Row = zav_kinagt_data_t;
constexpr std::array columns{
    ZAV_COLUMN(Row, originnode), ZAV_COLUMN(Row, tovrinhome), ZAV_COLUMN(Row, hosttype),
    ZAV_COLUMN(Row, hostpc),     ZAV_COLUMN(Row, product),    ZAV_COLUMN(Row, version),
    ZAV_COLUMN(Row, proddesc),   ZAV_COLUMN(Row, release),    ZAV_COLUMN(Row, platform),
};
static_assert(coversRow(columns, sizeof(Row)), "every field of the row is a column");

const TableSchema schema{"zav_kinagt_base", columns.data(), static_cast<int>(columns.size()),
                         sizeof(Row), &traceUnit};

template <unsigned Size>
void setField(char (&field)[Size], const String& value) {
    TaskQueueElem::SetValueAndPad(field, Size, value.c_str());
}

/// Runs a command of the home. Returns true, and what it printed, when it succeeded.
bool outputOf(const String& command, String& output) {
    Trace trace(traceUnit);
    int exitCode = 0;
    String errors;
    const bool ended = ZAV::Util::runCommand(command, exitCode, output, errors, "", false);
    return trace.exit(ended && exitCode == 0);
}

HostArchitecture probeArchitecture() {
    Trace trace(traceUnit);
    String output;
    if (!outputOf(architectureProbeCommand(ZAV_TOVRINHOME), output)) return {};
    return parseArchitectureProbe(output);
}

void setProduct(zav_kinagt_data_t& row, const InstalledProduct& product) {
    setField(row.product, product.code);
    setField(row.proddesc, product.description);
    setField(row.platform, product.platform);
    setField(row.version, product.version);
    setField(row.release, product.release);
}

}  // namespace

const char* const zav_kinagt_application = "ZAV";
const char* const zav_kinagt_table = "KINAGT";
zav_kinagt_manager* zav_kinagt_static_manager = nullptr;

int zav_kinagt_init() {
    Trace trace(traceUnit);
    return trace.exit(
        registerTable(zav_kinagt_static_manager, zav_kinagt_application, zav_kinagt_table));
}

rtoxa* zav_kinagt_manager::CreateRtoxa(RequestDetail* detail, ContextInfo* context) {
    Trace trace(traceUnit);
    return createRequest<zav_kinagt_agent>(trace, detail, context, this);
}

int zav_kinagt_manager::EventArrived(zav_kinagt_data_t* rows, int count) {
    Trace trace(traceUnit);
    zav_kinagt_manager* const manager = managerInForce(zav_kinagt_static_manager);
    return trace.exit(manager == nullptr ? 0 : manager->AddDataToEvent(rows, count));
}

int zav_kinagt_manager::AddDataToEvent(zav_kinagt_data_t* rows, int count) {
    Trace trace(traceUnit);
    return trace.exit(addDataToEvent<zav_kinagt_base>(trace, *this, rows, count));
}

zav_kinagt_base::zav_kinagt_base(RequestDetail* detail, ContextInfo* context, TableManager* manager)
    : TypedTableRequest(schema, detail, context, manager) {}

zav_kinagt_agent::zav_kinagt_agent(RequestDetail* detail, ContextInfo* context,
                                   TableManager* manager)
    : zav_kinagt_base(detail, context, manager) {
    Trace trace(traceUnit);
    TakeSampleConstructor();
}

zav_kinagt_agent::~zav_kinagt_agent() {
    Trace trace(traceUnit);
    TakeSampleDestructor();
}

void zav_kinagt_agent::TakeSampleConstructor() {
    Trace trace(traceUnit);
}

void zav_kinagt_agent::TakeSampleDestructor() {
    Trace trace(traceUnit);
}

int zav_kinagt_agent::TakeSample() {
    Trace trace(traceUnit);
    return trace.exit(guarded(trace, [this] { return addProducts(); }));
}

int zav_kinagt_agent::addProducts() {
    Trace trace(traceUnit);
    const HostArchitecture host = probeArchitecture();
    String inventory;
    if (!outputOf(inventoryCommand(ZAV_TOVRINHOME), inventory)) return trace.exit(0);

    zav_kinagt_data_t row{};
    TaskQueueElem::SetValueAndPad(row.originnode, sizeof row.originnode, OXA_GetOriginnode(this));
    TaskQueueElem::SetValueAndPad(row.tovrinhome, sizeof row.tovrinhome, ZAV_TOVRINHOME);
    setField(row.hosttype, host.os);
    setField(row.hostpc, host.architecture);
    return trace.exit(forEachProduct(inventory, [this, &row](const InstalledProduct& product) {
        setProduct(row, product);
        return AddData(&row, 1);
    }));
}
