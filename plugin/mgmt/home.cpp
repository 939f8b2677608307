#include "base/zavtrace.h"
#include "mgmt/zavmgmt.h"
#include "platform/bss1.h"

using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavmgmt"};

constexpr const char* kHomeVariable = "TOVRINHOME";

}  // namespace

const char* ZAV_TOVRINHOME = nullptr;

const char* Initialize_Tovrin_Home() {
    Trace trace(traceUnit);
    ZAV_TOVRINHOME = BSS1_GetEnv(kHomeVariable, nullptr);
    if (ZAV_TOVRINHOME == nullptr) {
        trace().error("No value for %s - MANAGEMENT FUNCTIONS DISABLED", kHomeVariable);
    }
    return ZAV_TOVRINHOME;
}
