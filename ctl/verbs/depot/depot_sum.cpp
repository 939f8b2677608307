#include "ctl/verbs/depot/depot_sum.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "ctl/client/depot_client.h"
#include "ctl/client/row.h"
#include "ctl/client/transfer/pushed_file.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kFiles =
    positionals("FILE", "Files in the depot").required().completedBy(Completion::DepotFile);
constexpr Argument kArguments[] = {kFiles};

ExitStatus run(const Invocation& invocation) {
    std::vector<std::string> paths = invocation.given.texts(kFiles);
    std::transform(paths.begin(), paths.end(), paths.begin(), pathInDepot);
    const json rows = DepotClient(invocation.host).sums(paths);
    if (rows.is_null()) throw Failure(kHostReportedFailure, "the host cannot compute checksums");
    return print(showSums(rows, invocation.format));
}

}  // namespace

constexpr Verb kDepotSumVerb = {
    "depot sum", "Print the SHA-256 of files in the depot",
    kArguments,  {"zavctl depot sum package.tar", "zavctl depot sum ux/7.1/a ux/7.1/b"},
    run,
};

Page showSums(const json& rows, Format format) {
    Page page;
    for (const json& row : rows) {
        if (const std::string sum = textOf(row, "sha256"); !sum.empty()) {
            page.out += printable(sum) + "  " + printable(textOf(row, "path")) + "\n";
            continue;
        }
        const std::string error = textOf(row, "error");
        page.err += complaint(error.empty() ? "a file has no sum" : error);
        page.status = kHostReportedFailure;
    }
    if (format == Format::Json) return jsonPage({{"files", rows}}, page.status);
    return page;
}

}  // namespace ctl
