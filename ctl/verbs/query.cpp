#include "ctl/verbs/query.h"

#include <nlohmann/json.hpp>

#include "ctl/client/host_client.h"
#include "ctl/show/table.h"
#include "ctl/verbs/condition_text.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kTable =
    positional("TABLE", "KAGREQT, KINAGT or KAGDYST").required().completedBy(Completion::Table);
constexpr Argument kConditions =
    positionals("CONDITION", "COLUMN=VALUE; also !=, <, <=, > and >=, and ~ for a pattern with *");
constexpr Argument kArguments[] = {kTable, kConditions};

ExitStatus run(const Invocation& invocation) {
    return print(showQuery(askQuery(invocation), invocation.format));
}

}  // namespace

constexpr Verb kQueryVerb = {
    "query",    "Query a table",
    kArguments, {"zavctl query KINAGT", "zavctl query KINAGT PRODUCT=ux 'VERSION>=01'"},
    run,
};

json askQuery(const Invocation& invocation) {
    std::vector<Condition> where;
    for (const std::string& text : invocation.given.texts(kConditions))
        where.push_back(parseCondition(text));
    return HostClient(invocation.host.socket)
        .query(invocation.given.text(kTable), where, invocation.deadline());
}

Page showQuery(const json& rows, Format format) {
    if (format == Format::Json) return jsonPage({{"rows", rows}});
    const std::string count = std::to_string(rows.size()) + (rows.size() == 1 ? " row" : " rows");
    return {recordsText(rows) + (rows.empty() ? "" : "\n") + count + "\n", {}};
}

}  // namespace ctl
