#include "fleet/server/depot/file_depot.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <system_error>
#include <utility>

#include "fleet/bus/trust/checksum.h"
#include "system/file_descriptor.h"

namespace fs = std::filesystem;

namespace fleet {
namespace {

using Kind = DepotError::Kind;

/// Between two looks for files that nobody uses any more.
constexpr Moment kSweepTime = std::chrono::hours(1);

[[noreturn]] void fail(const std::string& path) {
    const int error = errno;
    const bool isFull = error == ENOSPC || error == EDQUOT;
    throw DepotError(isFull ? Kind::Full : Kind::Failed,
                     path + ": " + std::generic_category().message(error));
}

std::optional<std::uint64_t> sizeOf(const std::string& path) {
    struct stat found {};
    if (::stat(path.c_str(), &found) != 0 || !S_ISREG(found.st_mode)) return std::nullopt;
    return static_cast<std::uint64_t>(found.st_size);
}

/// Its time of change is when it was used last.
void touch(const std::string& path) {
    static_cast<void>(::utimensat(AT_FDCWD, path.c_str(), nullptr, 0));
}

/// What a file is to take once it is complete: a part says so in its name, "SUM.SIZE.part".
std::uint64_t declaredSize(const fs::path& path) {
    const std::string size = path.stem().extension().string();
    if (path.extension() != ".part" || size.size() < 2) return sizeOf(path).value_or(0);
    return std::strtoull(size.c_str() + 1, nullptr, 10);
}

sys::FileDescriptor opened(const std::string& path, int flags) {
    sys::FileDescriptor file(::open(path.c_str(), flags | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!file) fail(path);
    return file;
}

void writeAt(int descriptor, std::uint64_t from, std::string_view bytes, const std::string& path) {
    while (!bytes.empty()) {
        const ssize_t put =
            ::pwrite(descriptor, bytes.data(), bytes.size(), static_cast<off_t>(from));
        if (put < 0 && errno == EINTR) continue;
        if (put < 0) fail(path);
        bytes.remove_prefix(static_cast<std::size_t>(put));
        from += static_cast<std::uint64_t>(put);
    }
}

void makeDurable(const sys::FileDescriptor& file, const std::string& path) {
    if (::fsync(file.get()) != 0) fail(path);
}

/// The sum stays taken until this ends.
class Busy {
public:
    Busy(std::mutex& mutex, std::set<std::string>& busy, const std::string& sum)
        : mutex_(mutex), busy_(busy), sum_(sum) {
        const std::lock_guard lock(mutex_);
        isMine_ = busy_.insert(sum_).second;
    }
    ~Busy() {
        if (!isMine_) return;
        const std::lock_guard lock(mutex_);
        busy_.erase(sum_);
    }
    Busy(const Busy&) = delete;
    Busy& operator=(const Busy&) = delete;
    bool isMine() const { return isMine_; }

private:
    std::mutex& mutex_;
    std::set<std::string>& busy_;
    const std::string sum_;
    bool isMine_ = false;
};

}  // namespace

FileDepot::FileDepot(std::string directory, DepotLimits limits)
    : directory_(std::move(directory)), limits_(limits) {
    if (::mkdir(directory_.c_str(), 0700) != 0 && errno != EEXIST) fail(directory_);
}

std::optional<DepotFile> FileDepot::find(const std::string& sum, std::uint64_t size) const {
    if (!isChecksum(sum)) return std::nullopt;
    if (const auto whole = sizeOf(pathOf(sum))) return DepotFile{*whole, *whole};
    const auto have = sizeOf(partOf(sum, size));
    if (!have) return std::nullopt;
    return DepotFile{size, *have};
}

bool FileDepot::noteUse(const std::string& sum) const {
    if (!has(sum)) return false;
    touch(pathOf(sum));
    return true;
}

bool FileDepot::has(const std::string& sum) const {
    return isChecksum(sum) && sizeOf(pathOf(sum)).has_value();
}

DepotFile FileDepot::add(const std::string& sum, std::uint64_t size, std::uint64_t from,
                         std::string_view piece, Moment now) {
    if (!isChecksum(sum)) throw DepotError(Kind::Wrong, "a file is named by its SHA-256");
    if (size > limits_.fileBytes) throw DepotError(Kind::Full, "so large a file is not taken");
    forgetUnused(now);
    const Busy busy(mutex_, busy_, sum);
    const std::optional<DepotFile> known = find(sum, size);
    const std::uint64_t have = known ? known->have : 0;
    if (known && known->isComplete() && has(sum)) {
        touch(pathOf(sum));
        return *known;
    }
    if (!busy.isMine()) return {size, have};
    if (known && known->isComplete()) {
        // Somebody was killed before it had its name.
        complete(sum, size);
        return *known;
    }
    if (from != have) return {size, have};
    if (piece.size() > size - have) {
        throw DepotError(Kind::Wrong, "the file is longer than was said");
    }
    insistOnRoom(known ? 0 : size, piece.size());
    const DepotFile grown = append(sum, size, from, piece);
    if (grown.isComplete()) complete(sum, size);
    return grown;
}

DepotFile FileDepot::append(const std::string& sum, std::uint64_t size, std::uint64_t from,
                            std::string_view piece) const {
    const std::string path = partOf(sum, size);
    const sys::FileDescriptor part = opened(path, O_WRONLY | O_CREAT);
    try {
        writeAt(part.get(), from, piece, path);
    } catch (const DepotError&) {
        // What was written of the piece is of no use, and may be what fills the disk. If it cannot
        // be taken back, it is written over.
        if (::ftruncate(part.get(), static_cast<off_t>(from)) != 0) touch(path);
        throw;
    }
    return {size, from + piece.size()};
}

void FileDepot::complete(const std::string& sum, std::uint64_t size) const {
    const std::string path = partOf(sum, size);
    const sys::FileDescriptor part = opened(path, O_RDWR);
    if (checksumOfFile(part.get()) != sum) {
        static_cast<void>(::unlink(path.c_str()));
        throw DepotError(Kind::Wrong, "what was sent has another SHA-256 than was said");
    }
    makeDurable(part, path);
    if (std::rename(path.c_str(), pathOf(sum).c_str()) != 0) fail(path);
    makeDurable(opened(directory_, O_RDONLY | O_DIRECTORY), directory_);
}

std::optional<std::string> FileDepot::read(const std::string& sum, std::uint64_t from,
                                           std::size_t most) const {
    if (!has(sum)) return std::nullopt;
    const std::string path = pathOf(sum);
    const sys::FileDescriptor file = opened(path, O_RDONLY);
    touch(path);
    std::string bytes(most, '\0');
    std::size_t have = 0;
    while (have < most) {
        const ssize_t got =
            ::pread(file.get(), bytes.data() + have, most - have, static_cast<off_t>(from + have));
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) fail(path);
        if (got == 0) break;
        have += static_cast<std::size_t>(got);
    }
    bytes.resize(have);
    return bytes;
}

/// `more` is what a new file takes in the end, and `now` what is about to be written.
void FileDepot::insistOnRoom(std::uint64_t more, std::uint64_t now) const {
    std::uint64_t all = more;
    if (more > 0) {
        std::error_code error;
        for (const auto& entry : fs::directory_iterator(directory_, error))
            all += declaredSize(entry.path());
    }
    if (all > limits_.allBytes) {
        throw DepotError(Kind::Full,
                         "there is no room for more files; those that no order needs go "
                         "after a few days");
    }
    struct statvfs disk {};
    if (::statvfs(directory_.c_str(), &disk) != 0) fail(directory_);
    const double free = static_cast<double>(disk.f_bavail) * static_cast<double>(disk.f_frsize);
    const double whole = static_cast<double>(disk.f_blocks) * static_cast<double>(disk.f_frsize);
    const double kept = std::min(limits_.freeShare * whole, static_cast<double>(limits_.freeBytes));
    if (free - static_cast<double>(std::max(more, now)) < kept) {
        throw DepotError(Kind::Full, "the centre's disk would be too full with this file");
    }
}

void FileDepot::forgetUnused(Moment now) {
    {
        const std::lock_guard lock(mutex_);
        if (now - swept_ < kSweepTime) return;
        swept_ = now;
    }
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(directory_, error)) {
        struct stat found {};
        if (::stat(entry.path().c_str(), &found) != 0) continue;
        const Moment used = std::chrono::seconds(found.st_mtim.tv_sec);
        if (now - used > limits_.unusedTime) static_cast<void>(::unlink(entry.path().c_str()));
    }
}

}  // namespace fleet
