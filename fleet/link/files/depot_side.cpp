#include "fleet/link/files/depot_side.h"

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <optional>

#include "ctl/client/address/host_address.h"
#include "ctl/client/failure.h"
#include "ctl/client/transfer/arrival.h"
#include "ctl/client/transfer/push_check.h"
#include "ctl/client/transfer/pusher.h"

namespace fleet {
namespace {

constexpr std::chrono::seconds kTransferTime{60};
/// In a second, on a slow disk: the host answers with the sums of all files at once.
constexpr std::uint64_t kBytesSummed = 10'000'000;

std::chrono::seconds timeToSum(const std::vector<OrderFile>& files) {
    std::uint64_t bytes = 0;
    for (const OrderFile& file : files)
        bytes += file.size;
    constexpr std::uint64_t kLongest = 3600;  // the host's own patience
    return kTransferTime + std::chrono::seconds(std::min(bytes / kBytesSummed, kLongest));
}

std::vector<ctl::PushedFile> filesOf(const std::vector<OrderFile>& files, const Spool& spool) {
    std::vector<ctl::PushedFile> pushed;
    for (const OrderFile& file : files) {
        ctl::PushedFile one;
        one.source = spool.pathOf(file.sha256);
        one.name = file.path;
        one.size = file.size;
        pushed.push_back(std::move(one));
    }
    return pushed;
}

/// What the host, or the look before it was asked, has against one of the files.
std::optional<std::string> problemIn(const std::vector<ctl::PushedFile>& files) {
    for (const ctl::PushedFile& file : files) {
        if (!file.problem.empty()) return file.name + ": " + file.problem;
    }
    return std::nullopt;
}

bool wereTaken(const std::vector<ctl::PushedFile>& files) {
    for (const ctl::PushedFile& file : files) {
        if (!file.isComplete()) return false;
    }
    return true;
}

}  // namespace

PrepareAnswer DepotSide::place(const std::vector<OrderFile>& files, Spool& spool) const {
    const ctl::HostAddress host{hostSocket_, hostSocket_ + ".rpc", kTransferTime};
    try {
        std::vector<ctl::PushedFile> pushed = filesOf(files, spool);
        const ctl::PushCheck check = ctl::checkPush(host, pushed);
        if (!check.known) return NotNow{check.whyUnknown};
        if (!check.taken) {
            return Unacceptable{problemIn(pushed).value_or("the host takes no such files")};
        }
        ctl::Pusher pusher(host, {},
                           check.guarded ? ctl::Pusher::Sums::Yes : ctl::Pusher::Sums::No);
        for (ctl::PushedFile& file : pushed)
            pusher.push(file);
        pusher.finish();
        for (std::size_t i = 0; i < pushed.size(); ++i) {
            // What was read is what the operator has signed, unless it changed on its way.
            const bool isOther =
                check.guarded && !pushed[i].converted && pushed[i].sha256 != files[i].sha256;
            if (!isOther) continue;
            spool.forget(files[i].sha256);
            return NotNow{files[i].path + " is not what it was when it was fetched"};
        }
        if (!wereTaken(pushed)) {
            ctl::explainRefusals(host, pushed);
            return Unacceptable{problemIn(pushed).value_or("the host did not take all files")};
        }
        if (!check.guarded) return FilesPlaced{};
        ctl::HostAddress patient = host;
        patient.timeout = timeToSum(files);
        const std::string why = ctl::verifyArrival(patient, pushed);
        if (!why.empty()) return NotNow{why};
        if (const auto problem = problemIn(pushed)) return NotNow{*problem};
        return FilesPlaced{};
    } catch (const ctl::Failure& failure) {
        return NotNow{failure.what()};
    }
}

}  // namespace fleet
