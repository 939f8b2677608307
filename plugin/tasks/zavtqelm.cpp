#include "tasks/zavtqelm.h"

#include <cstring>

#include "base/zavtrace.h"
#include "platform/bss1.h"
#include "tasks/deploy_status.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtqelm"};

constexpr unsigned kEventPacingSeconds = 1;

template <unsigned Size>
void setField(char (&field)[Size], const String& value) {
    TaskQueueElem::SetValueAndPad(field, Size, value.c_str());
}

}  // namespace

TaskQueueElem::TaskQueueElem(const String& originnode, const String& transid, const String& command,
                             const String& product, const String& context, const String& optional,
                             const String& uaconfig, const String& uascript, const String& version,
                             const String& targetmsn)
    : originnode_(originnode),
      transid_(transid),
      command_(command),
      product_(product),
      context_(context),
      optional_(optional),
      uaconfig_(uaconfig),
      uascript_(uascript),
      version_(version),
      targetmsn_(targetmsn) {}

void TaskQueueElem::SetValueAndPad(char* field, unsigned size, const char* value) {
    Trace trace(traceUnit);
    const std::size_t length = std::strlen(value);
    if (length > size) {
        std::memcpy(field, value, size);
        trace().error(
            "Result data \"%s\" was truncated to \"%s\" because it exceeded the maximum size of %d "
            "characters",
            value, std::string(value, size), size);
        return;
    }
    std::memcpy(field, value, length);
    std::memset(field + length, ' ', size - length);
}

void TaskQueueElem::ReturnStatus(int rc) {
    Trace trace(traceUnit);
    trace().detail("Returning status return code [%d], message id [%s] parms [%s]", rc, retmsgid_,
                   retmsgparm_);
    const auto row = std::make_shared<zav_kagreqt_data_t>();
    setField(row->originnode, originnode_);
    setField(row->transid, transid_);
    setField(row->command, command_);
    setField(row->product, product_);
    setField(row->context, context_);
    setField(row->optional, optional_);
    setField(row->uaconfig, uaconfig_);
    setField(row->uascript, uascript_);
    setField(row->version, version_);
    row->retval = rc;
    setField(row->retmsgid, retmsgid_);
    setField(row->retmsgparm, retmsgparm_);
    setField(row->targetmsn, targetmsn_);
    row_ = row;
}

void TaskQueueElem::returnAsyncStatus(int rc) {
    Trace trace(traceUnit);
    trace().detail("Returning aysnc status return code [%d], message id [%s] parms [%s]", rc,
                   retmsgid_, retmsgparm_);
    zav_kagdyst_data_t row{};
    setField(row.originnode, originnode_);
    setField(row.transid, transid_);
    setField(row.command, command_);
    setField(row.targetmsn, targetmsn_);
    setField(row.retmsgid, retmsgid_);
    setField(row.retmsgparm, retmsgparm_);
    row.retval = rc;
    BSS1_Sleep(kEventPacingSeconds);
    publishDeployStatus(&row, 1);
}
