#include "ctl/verbs/agents.h"

#include <nlohmann/json.hpp>

#include "ctl/client/host_client.h"
#include "ctl/show/table.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kOnlyProduct =
    textOption("--product", "Only this product code").completedBy(Completion::Product);
constexpr Argument kPlatform = textOption("--platform", "Only this platform");
constexpr Argument kArguments[] = {kOnlyProduct, kPlatform};

ExitStatus run(const Invocation& invocation) {
    return print(showAgents(askAgents(invocation), invocation.format));
}

}  // namespace

constexpr Verb kAgentsVerb = {
    "agents",   "List the products installed on the host",
    kArguments, {"zavctl agents", "zavctl agents --product ux"},
    run,
};

json askAgents(const Invocation& invocation) {
    std::vector<Condition> where;
    if (const std::string& product = invocation.given.text(kOnlyProduct); !product.empty()) {
        where.push_back({"PRODUCT", "=", product});
    }
    if (const std::string& platform = invocation.given.text(kPlatform); !platform.empty()) {
        where.push_back({"PLATFORM", "=", platform});
    }
    return HostClient(invocation.host.socket).query("KINAGT", where, invocation.deadline());
}

Page showAgents(const json& rows, Format format) {
    if (format == Format::Json) return jsonPage({{"rows", rows}});
    if (rows.empty()) return {"No products are listed.\n", {}};
    return {tableText(rows, {{"PRODUCT", "PRODUCT"},
                             {"VERSION", "VERSION"},
                             {"RELEASE", "RELEASE"},
                             {"PLATFORM", "PLATFORM"},
                             {"HOSTTYPE", "SYSTEM"},
                             {"HOSTPC", "ARCHITECTURE"},
                             {"PRODDESC", "DESCRIPTION"}}),
            {}};
}

}  // namespace ctl
