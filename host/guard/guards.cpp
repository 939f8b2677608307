#include "host/guard/guards.h"

#include "host/guard/refusal.h"
#include "text/nearest_name.h"

namespace host {

/// Each family has a file of its own in this folder and its rows below.
using Check = void(CommandRequest& request, Machine& machine);
Check checkConditions, checkAscii, checkValues, checkImportNames;
Check checkProduct, checkDeployFolder, checkTarget, checkImport, checkRunAsList;
Check mendText;

const std::vector<Guard>& guards() {
    // clang-format off
    static const std::vector<Guard> table = {
        {"conditions",    Asks::Request, checkConditions},
        {"text",          Asks::Request, checkAscii},
        {"values",        Asks::Request, checkValues},
        {"import-names",  Asks::Request, checkImportNames},
        {"product",       Asks::Machine, checkProduct},
        {"deploy-folder", Asks::Machine, checkDeployFolder},
        {"target",        Asks::Machine, checkTarget},
        {"import",        Asks::Machine, checkImport},
        // Asked of every request: no task that waits is meant to mend the list.
        {"run-as",        Asks::Request, checkRunAsList},
        // Last, so that all others see what the client sent.
        {"text",          Asks::Request, mendText},
    };
    // clang-format on
    return table;
}

std::vector<std::string> refusingGuards() {
    // The others are not asked about conditions: about columns, the journal, what still runs, the
    // copy of a file that a task may rewrite, and files of the depot.
    std::vector<std::string> names = {"columns",     "journal",         "leftovers",
                                      "old-result",  "restart-turn",    "depot-conversion",
                                      "depot-names", "depot-transfers", "start-up-parameters"};
    for (const Guard& guard : guards())
        names.emplace_back(guard.name);
    return names;
}

void Guards::admit(CommandRequest& request) {
    const bool knows = lastLook_.take(request, LastLook::Clock::now());
    const bool leavesOut = knows || tasks_.mayChange(request.product());
    ask(request, leavesOut ? Machines::LeftOut : Machines::LookedAt);
}

void Guards::admitEarly(CommandRequest& request, bool mayChange) {
    const LastLook::Clock::time_point before = LastLook::Clock::now();
    const CommandRequest asked = request;
    const bool quiet = !tasks_.anyAtWork();
    if (mayChange || tasks_.mayChange(request.product())) {
        ask(request, Machines::LeftOut);
        return;
    }
    ask(request, Machines::LookedAt);
    if (quiet) lastLook_.keep(asked, before);
}

void Guards::ask(CommandRequest& request, Machines machines) const {
    Machine machine(site_);
    for (const Guard& guard : guards()) {
        if (guard.asks == Asks::Machine && machines == Machines::LeftOut) continue;
        guard.check(request, machine);
    }
}

void Guards::refuseUnknownColumn(const oxa::Table& table, const std::string& name) {
    std::vector<std::string> known;
    for (const oxa::Column& column : table.columns)
        known.push_back(column.name);
    const std::string nearest = text::nearestName(name, known);
    throw Refusal(
        "columns", "table " + table.name + " has no column \"" + name + "\"",
        nearest.empty() ? "GET /v1/tables lists the columns" : "did you mean " + nearest + "?",
        Refusal::Kind::Malformed);
}

}  // namespace host
