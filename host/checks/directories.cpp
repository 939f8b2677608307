// The directories that the plug-in and the host write to.

#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <filesystem>
#include <optional>
#include <string>
#include <system_error>

#include "host/checks/check.h"
#include "host/checks/lossy_path.h"
#include "host/depot/depot_directory.h"
#include "host/home/temporary_directory.h"

namespace host {
namespace {

namespace fs = std::filesystem;

/// The directory itself, or the nearest one above it that exists.
std::string nearestExisting(const std::string& path) {
    fs::path at = fs::absolute(path).lexically_normal();
    std::error_code ignored;
    while (!fs::exists(fs::symlink_status(at, ignored)) && at.has_relative_path()) {
        at = at.parent_path();
    }
    return at.string();
}

std::string writeFault(const std::string& directory) {
    std::error_code error;
    if (!fs::is_directory(directory, error)) {
        return error && error.value() != ENOTDIR ? error.message() : "it is not a directory";
    }
    if (::access(directory.c_str(), W_OK | X_OK) == 0) return "";
    return std::generic_category().message(errno);
}

/// Whether files can be made in a directory, which is made first if it is not there.
Finding usable(const std::string& path, const std::string& purpose) {
    const std::string existing = nearestExisting(path);
    const std::string fault = writeFault(existing);
    const bool isThere = fs::absolute(path).lexically_normal() == existing ||
                         fs::absolute(path + "/").lexically_normal() == existing + "/";
    if (!fault.empty()) {
        return {Verdict::Error,
                path +
                    (isThere ? " cannot be used: " : " cannot be made below " + existing + ": ") +
                    fault + "; " + purpose,
                "make it a directory that the host's user may write to"};
    }
    return {Verdict::Ok, path + (isThere ? "" : " can be made"), ""};
}

std::optional<dev_t> deviceOf(const std::string& path) {
    struct stat found {};
    if (::stat(nearestExisting(path).c_str(), &found) != 0) return std::nullopt;
    return found.st_dev;
}

/// Free for this user, in MiB; none when the filesystem does not say.
std::optional<unsigned long long> freeMebibytes(const std::string& path) {
    struct statvfs found {};
    if (::statvfs(nearestExisting(path).c_str(), &found) != 0 || found.f_blocks == 0) {
        return std::nullopt;
    }
    return static_cast<unsigned long long>(found.f_bavail) * found.f_frsize >> 20U;
}

bool hasFewFilesLeft(const std::string& path) {
    constexpr fsfilcnt_t kFew = 1'000;
    struct statvfs found {};
    // Filesystems without a fixed number of files say 0.
    return ::statvfs(nearestExisting(path).c_str(), &found) == 0 && found.f_files != 0 &&
           found.f_favail < kFew;
}

}  // namespace

CheckFunction checkDepot, checkTemporary, checkState, checkFilesystem, checkSpace;

std::string depotOf(CheckSubject& subject) {
    const std::string named = subject.variable(kDepotVariable);
    return depotDirectoryOf(subject.options.home, named.empty() ? nullptr : named.c_str(),
                            subject.options.guarded)
        .path;
}

Finding checkDepot(CheckSubject& subject) {
    const std::string depot = depotOf(subject);
    Finding finding = usable(depot, "every command and every push would be refused");
    if (finding.verdict == Verdict::Ok) finding = lossOf(depot).value_or(finding);
    if (finding.verdict != Verdict::Ok) {
        finding.remedy += ", or name another one in ";
        finding.remedy += kDepotVariable;
    }
    return finding;
}

Finding checkTemporary(CheckSubject& subject) {
    return usable(temporaryDirectoryOf(subject.options.home), "pushed scripts could not be stored");
}

Finding checkState(CheckSubject& subject) {
    Finding finding = usable(subject.options.state, "the host could keep nothing there");
    if (finding.verdict != Verdict::Ok) finding.remedy += ", or name another one with --state";
    return finding;
}

/// A pushed script is converted in the temporary directory and then linked into the depot.
Finding checkFilesystem(CheckSubject& subject) {
    const std::string depot = depotOf(subject);
    const std::string temporary = temporaryDirectoryOf(subject.options.home);
    if (deviceOf(depot) == deviceOf(temporary)) {
        return {Verdict::Ok, "the depot and tmp are on one filesystem", ""};
    }
    return {Verdict::Warning,
            depot + " and " + temporary +
                " are on different filesystems; scripts that need their line ends converted "
                "cannot be pushed",
            "put both on one filesystem"};
}

Finding checkSpace(CheckSubject& subject) {
    constexpr unsigned long long kLittle = 64;
    std::optional<unsigned long long> least;
    for (const std::string& path : {depotOf(subject), temporaryDirectoryOf(subject.options.home),
                                    subject.options.state, subject.options.home}) {
        const auto free = freeMebibytes(path);
        if ((free && *free < kLittle) || hasFewFilesLeft(path)) {
            return {Verdict::Warning,
                    nearestExisting(path) + " has room for " +
                        (free && *free < kLittle ? std::to_string(*free) + " MiB"
                                                 : std::string("a few files")) +
                        " only",
                    "free some space"};
        }
        if (free && (!least || *free < *least)) least = free;
    }
    return {
        Verdict::Ok,
        least ? "at least " + std::to_string(*least) + " MiB are free" : "the space is unlimited",
        ""};
}

}  // namespace host
