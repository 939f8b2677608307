#include "tasks/translator.h"

#include "base/zavtrace.h"
#include "tasks/home.h"
#include "tasks/product_arch.h"
#include "tasks/task_state.h"
#include "util/zavutil.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

/// The depot's directory for a product. The common installer "ci" has one for all its versions.
String deployDirectory(const String& product, const String& version) {
    const String directory = depotDir + product;
    return product == "ci" ? directory : directory + "/" + version;
}

}  // namespace

bool getTwoWayTranslator(String& path) {
    Trace trace(traceUnit);
    const String candidate = getSharedLibArchDir() + "/" + "zav_xa";
    if (!ZAV::Util::pathExists(candidate)) {
        trace().error("No two-way translator found, default translator [%s] does not exist",
                      candidate);
        path.clear();
        return trace.exit(false);
    }
    trace().detail("Using default two-way translator [%s]", candidate);
    path = candidate;
    return trace.exit(true);
}

String replaceTokens(const String& text, const String& product, const String& version) {
    Trace trace(traceUnit);
    trace().detail("Received String is [%s]", text);
    String resolved = String::replace(text, "|DEPLOYDIR|", deployDirectory(product, version));
    resolved = String::replace(resolved, "|TOVRINHOME|", ZAV_TOVRINHOME);
    resolved = String::replace(resolved, "|DEPOTDIR|", depotDir);
    trace().detail("Resolved String is [%s]", resolved);
    return resolved;
}
