#include "ctl/verbs/config_get.h"

#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/client/task.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/running_clock.h"
#include "ctl/show/task_page.h"
#include "ctl/verbs/common_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kProduct, kTarget};

ExitStatus run(const Invocation& invocation) {
    const std::string& product = invocation.given.text(kProduct);
    const json row = askConfiguration(invocation.host, invocation.format, product,
                                      invocation.given.text(kTarget));
    return print(showConfiguration(product, row, invocation.format));
}

}  // namespace

constexpr Verb kConfigGetVerb = {
    "config get", "Print a configuration",
    kArguments,   {"zavctl config get ux", "zavctl config get ux --target db1:myhost:UX"},
    run,
};

json askConfiguration(const HostAddress& host, Format format, const std::string& product,
                      const std::string& target) {
    TaskRequest request;
    request.command = "GETCONFIG";
    request.product = product;
    request.targetmsn = target;
    RunningClock clock("config get " + product, format == Format::Text);
    return Task(host, request, [&clock] { clock.tick(); }).askNow();
}

Page showConfiguration(const std::string& product, const json& row, Format format) {
    if (format == Format::Json) return jsonPage(row, statusOf(row));
    if (returnCodeOf(row) != 0) return showNoConfiguration("config get " + product, row);
    std::string text = textOf(row, "CONTEXT");
    if (!text.empty() && text.back() != '\n') text += '\n';
    return {text, {}};
}

Page showNoConfiguration(const std::string& title, const json& row) {
    return {{}, complaint(title + ": failed; " + describeRow(row)), kHostReportedFailure};
}

}  // namespace ctl
