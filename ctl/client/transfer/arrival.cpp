#include "ctl/client/transfer/arrival.h"

#include <nlohmann/json.hpp>

#include "ctl/client/depot_client.h"
#include "ctl/client/failure.h"

using nlohmann::json;

namespace ctl {
namespace {

void compare(const json& row, PushedFile& file) {
    file.arrived = row.value("sha256", "");
    if (file.arrived == file.sha256) return;
    file.guard = "depot-verify";
    file.problem = file.arrived.empty()
                       ? "it cannot be verified: " + row.value("error", "the host gives no sum")
                       : "it is not in the depot as it was sent: SHA-256 " + file.arrived +
                             " in place of " + file.sha256;
}

std::string mayBePartial(const PushedFile& file) {
    return file.name + " may be in the depot in part";
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
    for (const PushedFile& file : files) {
        if (!file.isPartial()) continue;
        try {
            DepotClient(host).remove(pathInDepot(file.name), false);
            said.push_back("what had arrived of " + file.name + " is removed");
        } catch (const Failure& failure) {
            said.push_back(mayBePartial(file) + ", and cannot be removed: " + failure.what());
        }
    }
    return said;
}

std::vector<std::string> namePartialFiles(const std::vector<PushedFile>& files) {
    std::vector<std::string> said;
    for (const PushedFile& file : files) {
        if (file.isPartial()) said.push_back(mayBePartial(file));
    }
    return said;
}

}  // namespace ctl
