// The line-end conversion of a file wherever it lies.
#include "rpc/line_ends.h"
#include "rpc/zavrpc.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavrpc"};

}  // namespace

int convertDOS2Unix(const char* path) {
    Trace trace(traceUnit);
    return trace.exit(convertLineEnds(trace, path));
}

}  // namespace ZAV
