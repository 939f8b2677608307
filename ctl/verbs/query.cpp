#include "ctl/verbs/query.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/guarded.h"
#include "ctl/client/row.h"
#include "ctl/client/tasks/task_request.h"
#include "ctl/show/message_catalogue.h"
#include "ctl/show/shell_quoted.h"
#include "ctl/show/table.h"
#include "ctl/show/warnings.h"
#include "ctl/verbs/arguments/condition_text.h"
#include "ctl/verbs/invocation.h"
#include "ctl/verbs/verb_table.h"
#include "secrets/value_reader.h"

using nlohmann::json;

namespace ctl {
namespace {

constexpr Argument kTable =
    positional("TABLE", "KAGREQT, KINAGT or KAGDYST").required().completedBy(Completion::Table);
constexpr Argument kConditions =
    positionals("CONDITION", "COLUMN=VALUE; also !=, <, <=, > and >=, and ~ for a pattern with *");
constexpr Argument kYes = flag("--yes", "Send a query of KAGREQT, which carries out a command");
constexpr Argument kForceIt =
    flag("--force", "Send it although the inventory does not list the product").with("--yes");
constexpr Argument kArguments[] = {kTable, kConditions, kYes, kForceIt};

/// Where a verb takes the managed system name.
enum class TargetPlace { Nowhere, Option, Word };

struct CommandVerb {
    const char* command;
    const char* verb;
    TargetPlace target;
    const char* rest;  ///< of the arguments
};
constexpr CommandVerb kCommandVerbs[] = {
    {"START", "start PRODUCT", TargetPlace::Option, ""},
    {"STOP", "stop PRODUCT", TargetPlace::Option, ""},
    {"RESTART", "restart PRODUCT", TargetPlace::Option, ""},
    {"INSTALL", "install PRODUCT", TargetPlace::Nowhere, " VERSION -- COMMAND"},
    {"COMPLETE_INSTALL", "complete-install", TargetPlace::Nowhere, ""},
    {"UNINSTALL", "uninstall PRODUCT", TargetPlace::Nowhere, ""},
    {"REMOVEINSTANCE", "remove-instance PRODUCT", TargetPlace::Word, ""},
    {"GETCONFIG", "config get PRODUCT", TargetPlace::Option, ""},
    {"SETCONFIG", "config set PRODUCT", TargetPlace::Option, " --file FILE"},
};

std::string valueOf(const TableQuery& query, const char* column) {
    for (const Condition& condition : query.where) {
        if (condition.column == column) return condition.value;
    }
    return {};
}

/// A value of the query as a word of a command line, or the name of what is missing.
std::string wordOf(const TableQuery& query, const char* column, const char* name) {
    const std::string value = valueOf(query, column);
    return value.empty() ? name : shellQuoted(value);
}

/// Without its target the command would mean the default instance.
std::string targetWords(const TableQuery& query, TargetPlace place) {
    if (place == TargetPlace::Nowhere) return {};
    if (place == TargetPlace::Word) return " " + wordOf(query, "TARGETMSN", "TARGET");
    const std::string target = valueOf(query, "TARGETMSN");
    if (target.empty()) return {};
    const bool isInstance =
        valueOf(query, "COMMAND") == "START" && valueOf(query, "OPTIONAL") == "INSTANCE";
    return (isInstance ? " --instance " : " --target ") + shellQuoted(target);
}

TableQuery queryOf(const Values& given) {
    TableQuery query;
    query.table = given.text(kTable);
    query.isForced = given.flag(kForceIt);
    for (const std::string& text : given.texts(kConditions))
        query.where.push_back(parseCondition(text));
    return query;
}

/// A query looks harmless, so one that acts is sent only by somebody who knows.
void refuseToAct(const TableQuery& query) {
    const std::string verb = verbInPlaceOf(query);
    throw Failure(kWrongUsage,
                  "a query of KAGREQT carries out a command" +
                      (verb.empty() ? std::string() : "; the verb for it is: " + verb),
                  "Add --yes to send the query as it stands.");
}

/// The status of a reply. Another table's rows are no success where something failed while they
/// were collected: some may be missing.
ExitStatus statusOf(const TableQuery& query, const QueryAnswer& answer) {
    const json& rows = answer.rows;
    if (query.table != kRequestTable) {
        return answer.warnings.empty() ? kSuccess : kHostReportedFailure;
    }
    const bool isDone = !rows.empty() && std::all_of(rows.begin(), rows.end(), [](const json& row) {
        return returnCodeOf(row) == 0;
    });
    return isDone ? kSuccess : kHostReportedFailure;
}

/// The rows for people. What a configuration says is as secret as the passwords that may be in it;
/// config get shows it to those who ask for it.
json withoutConfigurations(json rows) {
    for (json& row : rows) {
        if (!row.is_object() || textOf(row, "CONTEXT").empty()) continue;
        const std::string command = textOf(row, "COMMAND");
        if (command == "GETCONFIG" || command == "SETCONFIG") row["CONTEXT"] = secrets::kMask;
    }
    return rows;
}

ExitStatus run(const Invocation& invocation) {
    return print(showQuery(queryOf(invocation.given), askQuery(invocation), invocation.format));
}

}  // namespace

constexpr Verb kQueryVerb = {
    "query",    "Query a table",
    kArguments, {"zavctl query KINAGT", "zavctl query KINAGT PRODUCT=ux 'VERSION>=01'"},
    run,
};

QueryAnswer askQuery(const Invocation& invocation) {
    const TableQuery query = queryOf(invocation.given);
    const Deadline deadline = invocation.deadline();
    const bool isAgreed = query.table != kRequestTable || invocation.given.flag(kYes);
    if (!isAgreed && isGuarded(invocation.host, deadline)) refuseToAct(query);
    return HostClient(invocation.host.socket).query(query, deadline);
}

Page showQuery(const TableQuery& query, const QueryAnswer& answer, Format format) {
    const json& rows = answer.rows;
    Page page{{}, {}, statusOf(query, answer)};
    if (format == Format::Json) {
        page.out = jsonText(answerDocument(answer));
        return page;
    }
    const std::string count = std::to_string(rows.size()) + (rows.size() == 1 ? " row" : " rows");
    page.out = recordsText(withoutConfigurations(rows)) + (rows.empty() ? "" : "\n") + count + "\n";
    page.err = warningsText(answer.warnings);
    if (page.status == kSuccess) return page;
    if (query.table != kRequestTable) {
        page.err += complaint("the rows could not be found out in full");
        return page;
    }
    page.err += complaint(rows.empty() ? "the host gave no reply, so it is not known what became "
                                         "of the command"
                                       : "the host refused: " + describeRow(rows.front()));
    return page;
}

std::string verbInPlaceOf(const TableQuery& query) {
    const std::string command = valueOf(query, "COMMAND");
    const std::string product = valueOf(query, "PRODUCT");
    const bool isUniversalAgent = product == "um" || product == "UM";
    if (command == "SETCONFIG" && isUniversalAgent) {
        return "zavctl ua-config --metafile " + wordOf(query, "UACONFIG", "FILE") +
               targetWords(query, TargetPlace::Option);
    }
    for (const CommandVerb& known : kCommandVerbs) {
        if (command != known.command) continue;
        std::string line = std::string("zavctl ") + known.verb;
        const std::size_t place = line.find("PRODUCT");
        if (place != std::string::npos) line.replace(place, 7, wordOf(query, "PRODUCT", "PRODUCT"));
        return line + targetWords(query, known.target) + known.rest;
    }
    return {};
}

}  // namespace ctl
