#include "ctl/client/transfer/arrival.h"

#include <nlohmann/json.hpp>

#include "ctl/client/depot_client.h"
#include "ctl/client/failure.h"
#include "ctl/client/row.h"

using nlohmann::json;

namespace ctl {
namespace {

void compare(const json& row, PushedFile& file) {
    file.arrived = textOf(row, "sha256");
    if (file.arrived == file.sha256) return;
    file.guard = "depot-verify";
    const std::string error = textOf(row, "error");
    file.problem = file.arrived.empty() ? "it cannot be verified: " +
                                              (error.empty() ? "the host gives no sum" : error)
                                        : "it is not in the depot as it was sent: SHA-256 " +
                                              file.arrived + " in place of " + file.sha256;
}

std::string mayBePartial(const PushedFile& file) {
    return file.name + " may be in the depot in part";
}

/// The host empties a file when its first batch comes, and no operation of the transfer renames
/// one, so what was there before cannot be had back. A half of each would be worse than nothing.
std::string lossOf(const PushedFile& file) {
    return file.replaces ? "; the file that was there before is gone" : "";
}

/// The host may have emptied the file for a first batch that it has not answered.
bool isFormerInDoubt(const PushedFile& file) {
    return file.replaces && file.unanswered > 0 && !file.isPartial();
}

bool isSilent(const Failure& failure) {
    return failure.status() == kNoHost || failure.status() == kNoOutcome;
}

std::string doubtAbout(const PushedFile& file) {
    return "the " + file.name + " that was there before may be gone";
}

}  // namespace

std::string verifyArrival(const HostAddress& host, std::vector<PushedFile>& files) {
    std::vector<PushedFile*> taken;
    std::vector<std::string> paths;
    for (PushedFile& file : files) {
        if (!file.wasTaken()) continue;
        taken.push_back(&file);
        paths.push_back(pathInDepot(file.name));
    }
    if (paths.empty()) return "";
    try {
        const json rows = DepotClient(host).sums(paths);
        if (rows.is_null()) return "the host cannot compute checksums";
        for (std::size_t i = 0; i < taken.size(); ++i)
            compare(rows[i], *taken[i]);
        return "";
    } catch (const Failure& failure) {
        return failure.what();
    }
}

std::vector<std::string> removePartialFiles(const HostAddress& host,
                                            const std::vector<PushedFile>& files) {
    std::vector<std::string> said;
    std::string whyGone;  // a host that is not there is asked once, not once for each file
    for (const PushedFile& file : files) {
        if (isFormerInDoubt(file)) said.push_back(doubtAbout(file));
        if (!file.isPartial()) continue;
        std::string problem = whyGone;
        if (problem.empty()) {
            try {
                DepotClient(host).remove(pathInDepot(file.name), false);
            } catch (const Failure& failure) {
                problem = failure.what();
                if (isSilent(failure)) whyGone = problem;
            }
        }
        said.push_back(problem.empty()
                           ? "what had arrived of " + file.name + " is removed"
                           : mayBePartial(file) + ", and cannot be removed: " + problem);
        said.back() += lossOf(file);
    }
    return said;
}

std::vector<std::string> namePartialFiles(const std::vector<PushedFile>& files) {
    std::vector<std::string> said;
    for (const PushedFile& file : files) {
        if (isFormerInDoubt(file)) said.push_back(doubtAbout(file));
        if (file.isPartial()) said.push_back(mayBePartial(file) + lossOf(file));
    }
    return said;
}

}  // namespace ctl
