#include "fleet/link/files/spool.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <system_error>
#include <utility>

#include "fleet/bus/trust/checksum.h"
#include "fleet/files/file_error.h"
#include "system/file_descriptor.h"

namespace fs = std::filesystem;

namespace fleet {
namespace {

/// No order waits for longer.
constexpr Moment kKept = std::chrono::hours(24 * 8);

[[noreturn]] void failOn(const std::string& path) {
    throw FileError(path + ": " + std::generic_category().message(errno));
}

bool isFile(const std::string& path) {
    struct stat found {};
    return ::lstat(path.c_str(), &found) == 0 && S_ISREG(found.st_mode);
}

}  // namespace

Spool::Spool(std::string directory, Moment now) : directory_(std::move(directory)) {
    if (::mkdir(directory_.c_str(), 0700) != 0 && errno != EEXIST) failOn(directory_);
    sweep(now);
}

bool Spool::has(const std::string& sum) const {
    return isFile(pathOf(sum));
}

std::uint64_t Spool::partOf(const std::string& sum) const {
    struct stat found {};
    if (::lstat(partPath(sum).c_str(), &found) != 0 || !S_ISREG(found.st_mode)) return 0;
    return static_cast<std::uint64_t>(found.st_size);
}

bool Spool::hasRoomFor(std::uint64_t bytes) const {
    // That stays free: this share of the disk, and of a large one as many bytes.
    constexpr double kFreeShare = 0.1;
    constexpr double kFreeBytes = 1ULL << 30;
    struct statvfs disk {};
    if (::statvfs(directory_.c_str(), &disk) != 0) return false;
    const double free = static_cast<double>(disk.f_bavail) * static_cast<double>(disk.f_frsize);
    const double whole = static_cast<double>(disk.f_blocks) * static_cast<double>(disk.f_frsize);
    return free - static_cast<double>(bytes) >= std::min(kFreeShare * whole, kFreeBytes);
}

void Spool::sweep(Moment now) {
    constexpr Moment kSweepTime = std::chrono::hours(1);
    if (now - swept_ < kSweepTime) return;
    swept_ = now;
    forgetOld(now);
}

void Spool::append(const std::string& sum, std::string_view piece) {
    const std::string path = partPath(sum);
    const std::uint64_t before = partOf(sum);
    const sys::FileDescriptor part(
        ::open(path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!part) failOn(path);
    while (!piece.empty()) {
        const ssize_t put = ::write(part.get(), piece.data(), piece.size());
        if (put < 0 && errno == EINTR) continue;
        if (put < 0) {
            const int error = errno;
            // A disk that is full stays no fuller than it was.
            if (::ftruncate(part.get(), static_cast<off_t>(before)) != 0) forget(sum);
            errno = error;
            failOn(path);
        }
        piece.remove_prefix(static_cast<std::size_t>(put));
    }
}

bool Spool::complete(const std::string& sum) {
    const std::string path = partPath(sum);
    const sys::FileDescriptor part(
        ::open(path.c_str(), O_RDONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!part) failOn(path);
    if (checksumOfFile(part.get()) != sum) {
        static_cast<void>(::unlink(path.c_str()));
        return false;
    }
    // What has this name after a power cut has that sum.
    if (::fsync(part.get()) != 0) failOn(path);
    if (std::rename(path.c_str(), pathOf(sum).c_str()) != 0) failOn(path);
    return true;
}

void Spool::forget(const std::string& sum) {
    static_cast<void>(::unlink(pathOf(sum).c_str()));
    static_cast<void>(::unlink(partPath(sum).c_str()));
}

void Spool::forgetOld(Moment now) const {
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(directory_, error)) {
        struct stat found {};
        if (::lstat(entry.path().c_str(), &found) != 0) continue;
        if (now - std::chrono::seconds(found.st_mtim.tv_sec) > kKept) {
            static_cast<void>(::unlink(entry.path().c_str()));
        }
    }
}

}  // namespace fleet
