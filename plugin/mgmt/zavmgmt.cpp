#include "mgmt/zavmgmt.h"

#include "base/zavtrace.h"
#include "rpc/zavagts.h"
#include "tables/zav01agt.h"
#include "tables/zav02agt.h"
#include "tables/zav03agt.h"
#include "tasks/zavtasks.h"
#include "util/exceptions.h"

using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavmgmt"};

int startUp(const Trace& trace) {
    trace().detail("Calling ZAV Table initialization");
    zav_kagreqt_init();
    zav_kinagt_init();
    zav_kagdyst_init();
    trace().detail("Calling ZAV Task Manager initialization");
    zav_taskmgr_init();
    trace().detail("Calling ZAV RPC calls initialization");
    const int status = QVS_NCS_RegisterAgentInterface();
    trace().detail("Done calling ZAV initialization routines");
    return status;
}

}  // namespace

int Initialize_Mgmt_Functions() {
    Trace trace(traceUnit);
    try {
        return trace.exit(Initialize_Tovrin_Home() == nullptr ? 0 : startUp(trace));
    } catch (...) {
        ZAV::traceException(trace);
        return trace.exit<int>(OXA_FAILED);
    }
}
