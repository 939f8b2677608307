#include "ctl/verbs/agents.h"

#include <nlohmann/json.hpp>

#include "ctl/show/table.h"
#include "ctl/show/warnings.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kOnlyProduct =
    textOption("--product", "Only this product code").completedBy(Completion::Product);
constexpr Argument kPlatform = textOption("--platform", "Only this platform");
constexpr Argument kArguments[] = {kOnlyProduct, kPlatform};

std::string agentsText(const json& rows) {
    if (rows.empty()) return "No products are listed.\n";
    return tableText(rows, {{"PRODUCT", "PRODUCT"},
                            {"VERSION", "VERSION"},
                            {"RELEASE", "RELEASE"},
                            {"PLATFORM", "PLATFORM"},
                            {"HOSTTYPE", "SYSTEM"},
                            {"HOSTPC", "ARCHITECTURE"},
                            {"PRODDESC", "DESCRIPTION"}});
}

ExitStatus run(const Invocation& invocation) {
    return print(showAgents(askAgents(invocation), invocation.format));
}

}  // namespace

constexpr Verb kAgentsVerb = {
    "agents",   "List the products installed on the host",
    kArguments, {"zavctl agents", "zavctl agents --product ux"},
    run,
};

QueryAnswer askAgents(const Invocation& invocation) {
    std::vector<Condition> where;
    if (const std::string& product = invocation.given.text(kOnlyProduct); !product.empty()) {
        where.push_back({"PRODUCT", "=", product});
    }
    if (const std::string& platform = invocation.given.text(kPlatform); !platform.empty()) {
        where.push_back({"PLATFORM", "=", platform});
    }
    return HostClient(invocation.host.socket).query({"KINAGT", where}, invocation.deadline());
}

Page showAgents(const QueryAnswer& answer, Format format) {
    const bool isTaken = answer.warnings.empty();
    const ExitStatus status = isTaken ? kSuccess : kHostReportedFailure;
    if (format == Format::Json) return jsonPage(answerDocument(answer), status);
    Page page{agentsText(answer.rows), warningsText(answer.warnings), status};
    // Nothing listed means nothing installed only where the inventory was taken.
    if (!isTaken && answer.rows.empty()) page.out.clear();
    if (!isTaken) page.err += complaint("what is installed could not be found out in full");
    return page;
}

}  // namespace ctl
