#include "ctl/verbs/config/config_get.h"

#include <unistd.h>

#include "ctl/client/guarded.h"
#include "ctl/client/row.h"
#include "ctl/client/tasks/queried_task.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/printable.h"
#include "ctl/show/tasks/command_report.h"
#include "ctl/show/tasks/running_clock.h"
#include "ctl/show/tasks/task_page.h"
#include "ctl/verbs/arguments/common_arguments.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/tasks/waiting.h"
#include "ctl/verbs/verb_table.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kArguments[] = {kProduct, kTarget};

ExitStatus run(const Invocation& invocation) {
    const std::string& product = invocation.given.text(kProduct);
    const Configuration configuration = askConfiguration(invocation.host, invocation.format,
                                                         product, invocation.given.text(kTarget));
    Page page = showConfiguration(product, configuration, invocation.format);
    // A file or a program gets the text as it is; a terminal gets nothing that it would obey.
    if (::isatty(STDOUT_FILENO) == 1) page.out = printableLines(page.out);
    return print(page);
}

/// The text that the host gives beside its first row; null if it gives none.
const json* fullContext(const json& full) {
    for (const json& entry : full) {
        const bool isIt = entry.is_object() && entry.value("row", json()) == 0 &&
                          entry.value("column", json()) == "CONTEXT";
        if (isIt && entry.contains("text") && entry["text"].is_string()) return &entry;
    }
    return nullptr;
}

}  // namespace

constexpr Verb kConfigGetVerb = {
    "config get", "Print a configuration",
    kArguments,   {"zavctl config get ux", "zavctl config get ux --target db1:myhost:UX"},
    run,
};

Configuration configurationIn(const QueryAnswer& answer) {
    Configuration configuration{answer.rows.front(), answer.full, {}, true, nullptr};
    if (const json* const whole = fullContext(answer.full)) {
        configuration.text = (*whole)["text"].get<std::string>();
        configuration.isWhole = whole->value("complete", json()) == true;
    } else {
        // The host's own code page takes no more bytes for a text than UTF-8 does.
        configuration.text = textOf(configuration.row, "CONTEXT");
        configuration.isWhole = configuration.text.size() < kContextBytes;
    }
    return configuration;
}

Configuration askConfiguration(const HostAddress& host, Format format, const std::string& product,
                               const std::string& target) {
    TaskRequest request;
    request.command = "GETCONFIG";
    request.product = product;
    request.targetmsn = target;
    request.transid = makeTransid();
    const InterruptNote note = interruptNote(request.transid, format);
    RunningClock clock("config get " + product, format == Format::Text);
    Task task(host, request, [&clock] { clock.tick(); });
    Configuration configuration = configurationIn(task.askNow());
    if (returnCodeOf(configuration.row) != 0) configuration.record = task.record();
    if (!configuration.isWhole) configuration.isWhole = !isGuarded(host, task.deadline());
    return configuration;
}

Page showConfiguration(const std::string& product, const Configuration& configuration,
                       Format format) {
    const json& row = configuration.row;
    const bool isThere = returnCodeOf(row) == 0;
    Page page;
    page.status = isThere && configuration.isWhole ? kSuccess : kHostReportedFailure;
    if (isThere && !configuration.isWhole) {
        page.err = complaint("the configuration is not whole: the host gives no more than " +
                             std::to_string(configuration.text.size()) + " bytes of it as text");
    }
    if (format == Format::Json) {
        json document = row;
        if (!configuration.full.empty()) document["full"] = configuration.full;
        if (const json commands = commandsOf(configuration.record); !commands.empty()) {
            document["details"] = {{"commands", commands}};
        }
        page.out = jsonText(document);
        return page;
    }
    if (!isThere) return showNoConfiguration("config get " + product, configuration);
    page.isVerbatim = true;
    page.out = configuration.text;
    if (!page.out.empty() && page.out.back() != '\n') page.out += '\n';
    return page;
}

Page showNoConfiguration(const std::string& title, const Configuration& configuration) {
    const std::string reason = title + ": failed; " + describeRow(configuration.row);
    return {{},
            complaint(reason) + failureReport(commandsOf(configuration.record)),
            kHostReportedFailure};
}

}  // namespace ctl
