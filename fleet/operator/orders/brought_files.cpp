#include "fleet/operator/orders/brought_files.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <nlohmann/json.hpp>
#include <system_error>
#include <thread>

#include "ctl/client/failure.h"
#include "ctl/client/transfer/pushed_file.h"
#include "fleet/bus/trust/checksum.h"
#include "fleet/operator/centre/answers.h"
#include "system/file_descriptor.h"

using nlohmann::json;

namespace fleet {
namespace {

/// A request to the centre has at most 1 MiB.
constexpr std::size_t kPieceBytes = std::size_t{1024} * 1024;
constexpr std::size_t kMostFilesOfAnOrder = 1'000;
/// For the sum of a file that is complete: ten minutes.
constexpr std::chrono::milliseconds kLookPause{500};
constexpr std::size_t kMostLooks = 1'200;

[[noreturn]] void failToRead(const std::string& path) {
    throw ctl::Failure(ctl::kWrongUsage,
                       path + ": cannot be read: " + std::generic_category().message(errno));
}

sys::FileDescriptor openedFile(const std::string& path) {
    sys::FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!file) failToRead(path);
    return file;
}

std::string sumOfFile(const std::string& path) {
    try {
        return checksumOfFile(openedFile(path).get());
    } catch (const std::system_error& error) {
        throw ctl::Failure(ctl::kWrongUsage, path + ": " + error.what());
    }
}

std::string pieceOf(int file, std::uint64_t from, std::uint64_t left, const std::string& path) {
    std::string bytes(static_cast<std::size_t>(std::min<std::uint64_t>(kPieceBytes, left)), '\0');
    std::size_t have = 0;
    while (have < bytes.size()) {
        const ssize_t got = ::pread(file, bytes.data() + have, bytes.size() - have,
                                    static_cast<off_t>(from + have));
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) failToRead(path);
        if (got == 0) {
            throw ctl::Failure(ctl::kWrongUsage, path + " has become shorter meanwhile");
        }
        have += static_cast<std::size_t>(got);
    }
    return bytes;
}

void bring(Centre& centre, const BroughtFile& one) {
    const OrderFile& file = one.file;
    const std::string target = "/v1/files/" + file.sha256 + "?size=" + std::to_string(file.size);
    const auto send = [&](std::uint64_t from, std::string piece) {
        return centre.postBytes(target + "&from=" + std::to_string(from), std::move(piece));
    };
    // An empty piece tells how far the file is there.
    json told = send(0, "");
    const sys::FileDescriptor here = openedFile(one.source);
    std::size_t looks = 0;
    while (!memberFlag(told, "complete")) {
        const std::uint64_t have = memberNumber(told, "have");
        if (have >= file.size) {
            // It computes the sum of a large one, perhaps for somebody else.
            if (++looks > kMostLooks) throw senseless("it has all of a file and does not have it");
            std::this_thread::sleep_for(kLookPause);
            told = send(file.size, "");
            continue;
        }
        told = send(have, pieceOf(here.get(), have, file.size - have, one.source));
        if (!memberFlag(told, "complete") && memberNumber(told, "have") <= have) {
            throw ctl::Failure(ctl::kHostReportedFailure,
                               "somebody else brings " + file.path + " to the centre right now",
                               "Try again in a minute.");
        }
    }
}

}  // namespace

std::vector<BroughtFile> filesToBring(const std::string& source, const std::string& destination,
                                      std::vector<std::string>& notes) {
    ctl::PushPlan plan = ctl::filesToPush(source, destination);
    notes.insert(notes.end(), plan.skipped.begin(), plan.skipped.end());
    if (plan.files.size() > kMostFilesOfAnOrder) {
        throw ctl::Failure(ctl::kWrongUsage, "an order has at most 1,000 files; pack them");
    }
    std::vector<BroughtFile> files;
    for (const ctl::PushedFile& pushed : plan.files) {
        const std::string path = ctl::pathInDepot(pushed.name);
        if (!isDepotPath(path)) {
            throw ctl::Failure(ctl::kWrongUsage, "\"" + path + "\" is no name for the depot");
        }
        files.push_back({pushed.source, {path, sumOfFile(pushed.source), pushed.size}});
    }
    return files;
}

void bringFiles(Centre& centre, const std::vector<BroughtFile>& files) {
    for (const BroughtFile& file : files)
        bring(centre, file);
}

}  // namespace fleet
