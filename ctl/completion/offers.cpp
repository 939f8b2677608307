#include "ctl/completion/offers.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>
#include <string>
#include <utility>

#include "ctl/client/address/peer.h"
#include "ctl/client/depot_client.h"
#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/instances.h"
#include "ctl/client/row.h"
#include "ctl/client/tasks/task_list.h"
#include "ctl/client/tasks/task_request.h"

namespace ctl {
namespace {

using nlohmann::json;
using Candidates = std::vector<Candidate>;

/// The newest ones are what somebody means who types.
constexpr std::size_t kTasksOffered = 50;

Candidates products(const Wanted& wanted, Deadline deadline) {
    Candidates found;
    const QueryAnswer answer = HostClient(wanted.host.socket).query({"KINAGT", {}}, deadline);
    for (const json& row : answer.rows)
        found.push_back({textOf(row, "PRODUCT"), textOf(row, "PRODDESC")});
    return found;
}

Candidates instances(const Wanted& wanted, Deadline deadline) {
    Candidates found;
    for (const json& instance : listInstances(HostClient(wanted.host.socket), deadline)) {
        if (!wanted.product.empty() && textOf(instance, "product") != wanted.product) continue;
        found.push_back({textOf(instance, "target"), textOf(instance, "state")});
    }
    return found;
}

/// By the names that users gave, else by the host's own.
Candidates transactions(const Wanted& wanted, Deadline deadline) {
    Candidates found;
    TaskFilter newest;
    newest.limit = kTasksOffered;
    const json list = listTasks(HostClient(wanted.host.socket), newest, deadline);
    for (const json& task : list.at("tasks")) {
        const std::string transid = textOf(task, "transid");
        const std::string help =
            textOf(task, "command") + " " + textOf(task, "product") + ", " + textOf(task, "state");
        found.push_back({isMadeUp(transid) ? textOf(task, "id") : transid, help});
    }
    return found;
}

/// What a folder of the depot holds, with that folder before it.
Candidates entries(const Wanted& wanted, const std::string& folder, bool foldersOnly) {
    Candidates found;
    const json listing = DepotClient(wanted.host).list(folder);
    const auto list = listing.find("entries");
    if (list == listing.end() || !list->is_array()) return found;
    for (const json& entry : *list) {
        const bool isFolder = textOf(entry, "type") == "directory";
        if (foldersOnly && !isFolder) continue;
        found.push_back({textOf(entry, "name") + (isFolder && !foldersOnly ? "/" : ""), {}});
    }
    return found;
}

Candidates depotFiles(const Wanted& wanted) {
    const std::size_t slash = wanted.typed.rfind('/');
    const std::string folder = slash == std::string::npos ? "" : wanted.typed.substr(0, slash);
    Candidates found = entries(wanted, folder, false);
    for (Candidate& candidate : found) {
        if (slash != std::string::npos) candidate.word.insert(0, folder + "/");
    }
    return found;
}

Candidates listOf(const char* const* first, const char* const* last) {
    Candidates found;
    for (; first != last; ++first)
        found.push_back({*first, {}});
    return found;
}

Candidates states() {
    return listOf(std::begin(kTaskStates), std::end(kTaskStates));
}

Candidates tables() {
    constexpr const char* kTables[] = {"KAGREQT", "KINAGT", "KAGDYST"};
    return listOf(std::begin(kTables), std::end(kTables));
}

Candidates ask(const Wanted& wanted, Deadline deadline) {
    switch (wanted.source) {
        case Completion::Product:
            return products(wanted, deadline);
        case Completion::Instance:
            return instances(wanted, deadline);
        case Completion::Transaction:
            return transactions(wanted, deadline);
        case Completion::DepotFile:
            return depotFiles(wanted);
        case Completion::DepotProduct:
            return entries(wanted, "", true);
        case Completion::DepotVersion:
            return entries(wanted, wanted.product, true);
        case Completion::State:
            return states();
        case Completion::Table:
            return tables();
        case Completion::Nothing:
        case Completion::LocalFile:
        case Completion::Verb:
            break;
    }
    return {};
}

bool isPlain(const std::string& word) {
    return !word.empty() && std::none_of(word.begin(), word.end(),
                                         [](unsigned char c) { return c < ' ' || c == 0x7f; });
}

}  // namespace

Candidates offersFor(const Wanted& wanted, Deadline deadline) {
    Candidates found;
    try {
        if (!wanted.hostUser.empty()) trustHostUser(wanted.hostUser);
        found = ask(wanted, deadline);
    } catch (const std::exception&) {
        return {};
    }
    std::set<std::string> offered;
    Candidates fitting;
    for (Candidate& candidate : found) {
        const std::string& word = candidate.word;
        if (word.compare(0, wanted.typed.size(), wanted.typed) != 0 || !isPlain(word)) continue;
        if (!isPlain(candidate.help)) candidate.help.clear();
        if (offered.insert(word).second) fitting.push_back(std::move(candidate));
    }
    return fitting;
}

}  // namespace ctl
