// depot rm: removes files from the depot.

#include <nlohmann/json.hpp>

#include "ctl/client/depot_client.h"
#include "ctl/client/transfer/pushed_file.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kPaths = positionals("PATH", "Files in the depot, or folders with -r")
                                .required()
                                .completedBy(Completion::DepotFile);
constexpr Argument kRecursive = flag("-r", "Remove folders with everything in them");
constexpr Argument kArguments[] = {kPaths, kRecursive};

/// One that cannot be removed does not keep the others.
ExitStatus run(const Invocation& invocation) {
    const DepotClient depot(invocation.host);
    json removed = json::array(), failed = json::array();
    Page page;
    for (const std::string& given : invocation.given.texts(kPaths)) {
        try {
            depot.remove(pathInDepot(given), invocation.given.flag(kRecursive));
            removed.push_back(given);
        } catch (const Failure& failure) {
            if (failure.status() == kNoHost || failure.status() == kNoOutcome) throw;
            failed.push_back({{"path", given}, {"error", failure.what()}});
            page.err += failurePage(failure, Format::Text).err;
            // Of several the first, as if the others had not been asked for.
            if (page.status == kSuccess) page.status = failure.status();
        }
    }
    if (invocation.format == Format::Text) return print(page);
    return print(jsonPage({{"removed", removed}, {"failed", failed}}, page.status));
}

}  // namespace

constexpr Verb kDepotRmVerb = {
    "depot rm", "Remove files from the depot",
    kArguments, {"zavctl depot rm package.tar", "zavctl depot rm -r ux/7.1"},
    run,
};

}  // namespace ctl
