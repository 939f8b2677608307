/// What endpoints work with.
#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/api/events/event_pump.h"
#include "host/checks/check.h"
#include "host/commands/ear.h"
#include "host/depot/depot.h"
#include "host/depot/transfers/transfer_gate.h"
#include "host/depot/transfers/transfer_rules.h"
#include "host/guard/guards.h"
#include "host/guard/parameter_keeper.h"
#include "host/journal/dispatcher.h"
#include "host/journal/journal.h"
#include "host/outcomes/outcome_feed.h"
#include "host/outcomes/task_list.h"
#include "host/outcomes/task_watch.h"
#include "host/process/children/leftovers.h"
#include "host/tables/code_page.h"
#include "host/tables/row_queue.h"
#include "host/tables/table_set.h"
#include "http/server_counts.h"
#include "http/worker_pool.h"
#include "metrics/by_label.h"
#include "metrics/counter.h"

namespace host {

/// Directories that need not be where the home would have them.
struct Places {
    std::string depot{};  ///< empty: the home itself
    std::string state{};  ///< empty: HOME/zavhost
};

struct Services;
/// See api/watched_query.h.
std::optional<Task> handOver(Services& services, const Task& task);
/// See api/restart_install.h.
Task endOfRestartInstall(Services& services, Task task);

/// Made once, after the plug-in has started, and shared by all requests. Any thread.
struct Services {
    static constexpr std::size_t kChecksumsAtOnce = 2;
    static constexpr std::size_t kWaitingChecksums = 128;

    Services(std::vector<oxa::Table> offered, CodePage localCodePage, std::string homeDirectory,
             RowQueue::Limits limits = {}, bool isGuarded = true, Places places = {},
             const Journal::Settings& journalSettings = {})
        : tables(std::move(offered)),
          codePage(std::move(localCodePage)),
          home(std::move(homeDirectory)),
          eventLimits(limits),
          guarded(isGuarded),
          depotFiles(places.depot.empty() ? home : std::move(places.depot),
                     {places.state.empty() ? home + "/zavhost" : std::move(places.state)}),
          journal(journalSettings) {
        hearCommands();
        countInterrupted();
    }

    const TableSet tables;
    const CodePage codePage;  ///< the one that tables speak
    const std::string home;   ///< in that code page
    const RowQueue::Limits eventLimits;
    const bool guarded;  ///< false: no guard looks at a request
    /// What the checks of GET /v1/doctor look at; main() sets it before it serves.
    std::function<CheckSubject()> checkSubject;
    const Depot depotFiles;
    const TransferRules transferRules{depotFiles, home, codePage, guarded};
    metrics::ByLabel<metrics::Counter> refusals{refusingGuards()};  ///< by the names of the guards
    TransferGate transfers{transferRules, &refusals};
    /// What the server of file transfers counts; main() sets it before it serves.
    std::function<ncs::Counts()> transferServer;
    const std::chrono::steady_clock::time_point started = std::chrono::steady_clock::now();
    http::ServerCounts counts;
    Journal journal;
    EventPump events{journal};
    OutcomeFeed outcomes{tables};
    TaskList tasks{tables, outcomes, journal, guarded};
    TaskWatch watch{tables, outcomes};
    Guards guards{{codePage, home, depotFiles.directory()}, tasks};  ///< asked if `guarded`
    ParameterKeeper startUpParameters{home, outcomes, tasks};              ///< asked if `guarded`
    int maxQueued = 1000;  ///< tasks that may wait in the journal
    Leftovers leftovers{journal.identity(), journal.run(), journal.recovered().formerIdentity};
    Dispatcher dispatcher{
        journal, tasks, [this](const Task& task) { return handOver(*this, task); },
        [this](Task task) { return endOfRestartInstall(*this, std::move(task)); }};
    http::WorkerPool checksums{kChecksumsAtOnce,
                               kWaitingChecksums};  ///< requests for checksums of files

private:
    /// The end that came with the last end of the host.
    void countInterrupted() {
        const Recovered& found = journal.recovered();
        if (found.interrupted.empty() || found.runsAgain) return;
        if (const auto task = journal.find(found.interrupted)) tasks.hasEnded(*task);
    }
};

}  // namespace host
