#include "host/api/tasks/restart_install.h"

#include <cerrno>
#include <system_error>

#include "host/api/tasks/interruption.h"
#include "host/commands/ear.h"
#include "host/depot/install_result.h"
#include "host/outcomes/shown_request.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/row_fields.h"

namespace host {
namespace {

InstallResult resultOf(const Services& services) {
    return InstallResult(services.depotFiles.directory());
}

Task ended(Task task, TaskState state, const std::string& reason) {
    task.state = state;
    task.reason = reason;
    task.ended = WallClock::now();
    return task;
}

std::string textIn(const oxa::Table& table, std::string_view column, RowView row) {
    const oxa::Column* const found = table.find(std::string(column));
    return found == nullptr ? std::string() : std::string(textField(*found, row));
}

/// What the plug-in says about the install that has ended.
Task complete(Services& services, Task task) {
    const oxa::Table* const table = services.tables.find(std::string(plugin::kRequestTable));
    const Query query{
        table,
        {{std::string(plugin::kCommandColumn), OPER_EQ, std::string(plugin::kCompleteInstall)},
         {std::string(plugin::kTransidColumn), OPER_EQ, task.transid}}};
    TaskWatch::Request watched(services.watch, *table);
    ThreadEar ear;
    const oxa::Rows rows = run(query);
    const std::optional<int> retval = ear.take().answer;
    if (!retval) {
        return ended(std::move(task), TaskState::Interrupted,
                     "the host ended in its midst, and the plug-in does not say how it ended");
    }
    if (*retval == plugin::kAccepted) return ended(std::move(task), TaskState::Done, "");
    std::string reason = "the install, which went on while the host was away, failed";
    if (rows.count() > 0) {
        const RowView row = rowOf(rows, 0);
        reason += ": " + textIn(*table, plugin::kMessageColumn, row) + ' ' +
                  textIn(*table, plugin::kMessageValuesColumn, row);
    }
    return ended(std::move(task), TaskState::Failed, reason);
}

}  // namespace

bool mayRestart(const Query& query) {
    return query.table->name == plugin::kRequestTable &&
           plugin::mayRestart(valueIn(query.where, plugin::kCommandColumn),
                              valueIn(query.where, plugin::kOptionalColumn));
}

std::string forgetOlderResult(const Services& services) {
    const InstallResult result = resultOf(services);
    if (result.remove()) return {};
    return "the result of an earlier install, " + result.path() +
           ", cannot be removed: " + std::generic_category().message(errno);
}

Task endOfRestartInstall(Services& services, Task task) {
    if (task.cancel) {
        return ended(std::move(task), TaskState::Cancelled,
                     "it was cancelled while it ran, and what it had started was ended");
    }
    const InstallResult result = resultOf(services);
    switch (result.look()) {
        case InstallResult::Content::Number:
            return complete(services, std::move(task));
        case InstallResult::Content::Other:
            return ended(std::move(task), TaskState::Failed,
                         result.path() + " holds no number, so the install's end is not known");
        case InstallResult::Content::Missing:
            break;
    }
    const bool bootedAnew = services.journal.recovered().bootedAnew;
    const std::string reason =
        std::string(bootedAnew ? "the machine was started anew" : "the host ended") +
        " while this install was in hand; nothing of it runs any more, and it left no result" +
        inventoryNow(services, task);
    return ended(std::move(task), TaskState::Interrupted, reason);
}

}  // namespace host
