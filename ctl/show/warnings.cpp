#include "ctl/show/warnings.h"

#include "ctl/client/row.h"
#include "ctl/show/page.h"
#include "ctl/show/tasks/command_report.h"

using nlohmann::json;

namespace ctl {

json answerDocument(const QueryAnswer& answer) {
    json document = {{"rows", answer.rows}};
    if (!answer.warnings.empty()) document["warnings"] = answer.warnings;
    if (!answer.full.empty()) document["full"] = answer.full;
    return document;
}

std::string warningsText(const json& warnings) {
    std::string text;
    for (const json& warning : warnings) {
        const std::string reason = textOf(warning, "text");
        text += complaint("warning: " + (reason.empty() ? "a program of the home failed" : reason));
        if (!textOf(warning, "command").empty()) text += commandReport(warning);
    }
    return text;
}

}  // namespace ctl
