#include "ctl/client/tasks/install_outcome.h"

#include <nlohmann/json.hpp>
#include <optional>
#include <thread>

#include "ctl/client/failure.h"
#include "ctl/client/host_client.h"
#include "ctl/client/row.h"

using nlohmann::json;

namespace ctl {
namespace {

/// A host that restarts refuses connections for a while, and requests before that.
bool mayPass(const Failure& failure) {
    return failure.status() == kNoHost || failure.status() == kHostReportedFailure;
}

/// One reply; nothing when the host is not there.
std::optional<json> askOnce(const HostClient& client, Deadline deadline, const Ticker& tick) {
    try {
        json rows =
            client.query(completeInstallRequest(makeTransid()).query(), deadline, tick).rows;
        if (!rows.empty()) return std::move(rows.front());
    } catch (const Failure& failure) {
        if (!mayPass(failure)) throw;
    }
    return std::nullopt;
}

}  // namespace

bool restartsHost(const TaskRequest& request) {
    return request.command == "INSTALL" && request.optional == "REQUIRES_RESTART";
}

TaskRequest completeInstallRequest(const std::string& transid) {
    TaskRequest request;
    request.command = "COMPLETE_INSTALL";
    request.transid = transid;
    return request;
}

/// The install's wrapper script writes its result last.
bool isNotThereYet(const json& row) {
    const std::string parameter = textOf(row, "RETMSGPARM");
    const std::string ending = ",NOTFOUND";
    return parameter.size() >= ending.size() &&
           parameter.compare(parameter.size() - ending.size(), ending.size(), ending) == 0;
}

json fetchInstallOutcome(const std::string& socketPath, Deadline deadline, const Ticker& tick) {
    const HostClient client(socketPath);
    std::optional<json> last;
    while (std::chrono::steady_clock::now() < deadline) {
        std::optional<json> row = askOnce(client, deadline, tick);
        if (row) last = std::move(row);
        if (last && !isNotThereYet(*last)) break;
        if (tick) tick();
        std::this_thread::sleep_for(std::chrono::milliseconds(500));
    }
    if (!last) throw Failure(kNoOutcome, "the host did not come back within the time-out");
    return *last;
}

}  // namespace ctl
