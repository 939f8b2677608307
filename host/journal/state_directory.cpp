#include "host/journal/state_directory.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <system_error>

#include "host/process/start_error.h"
#include "host/process/system/trusted_file.h"

namespace host {
namespace {

namespace fs = std::filesystem;

constexpr const char* kClean = "/clean";
constexpr const char* kReserveFile = "/reserve";
constexpr const char* kIdentity = "/identity";

void makeDirectories(const fs::path& path) {
    if (path.has_relative_path() && path.parent_path() != path) {
        std::error_code ignored;
        if (!fs::exists(path.parent_path(), ignored)) makeDirectories(path.parent_path());
    }
    if (::mkdir(path.c_str(), 0700) != 0 && errno != EEXIST) {
        throw StartError("cannot make the state directory " + path.string(), errno);
    }
}

/// Whoever may write to it could put another journal in the place of this one.
void insistOnPrivacy(const std::string& path) {
    struct stat found {};
    if (::stat(path.c_str(), &found) != 0) throw StartError("state directory " + path, errno);
    if (!S_ISDIR(found.st_mode)) throw StartError("state directory " + path + " is a file");
    if (!isTrusted(found)) {
        throw StartError("state directory " + path +
                         " may be written to by others; make it the host's own, with mode 0700");
    }
}

void syncDirectory(const std::string& path) {
    const sys::FileDescriptor directory(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (directory) ::fsync(directory.get());
}

/// Removes the mark of a clean end; returns whether there was one.
bool takeMark(const std::string& directory) {
    const bool found = ::unlink((directory + kClean).c_str()) == 0;
    if (!found && errno != ENOENT) throw StartError("cannot remove " + directory + kClean, errno);
    syncDirectory(directory);
    return found;
}

std::string firstFreeName(const std::string& name) {
    for (int number = 1;; ++number) {
        const std::string candidate = name + ".damaged-" + std::to_string(number);
        std::error_code ignored;
        if (!fs::exists(fs::symlink_status(candidate, ignored))) return candidate;
    }
}

}  // namespace

void provideStateDirectory(const std::string& path) {
    makeDirectories(path);
    insistOnPrivacy(path);
}

StateDirectory::StateDirectory(const std::string& path)
    : path_(fs::path(path + "/").lexically_normal().parent_path().string()) {
    provideStateDirectory(path_);
    lock_.emplace(path_, "state directory");
    std::error_code ignored;
    endedCleanly_ = takeMark(path_) || !fs::exists(database(), ignored);
}

void StateDirectory::noteCleanEnd() const noexcept {
    const sys::FileDescriptor mark(
        ::open((path_ + kClean).c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (mark) ::fsync(mark.get());
    const sys::FileDescriptor directory(::open(path_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (directory) ::fsync(directory.get());
}

std::string StateDirectory::setAside() const {
    const std::string other = firstFreeName(database());
    if (::rename(database().c_str(), other.c_str()) != 0) {
        throw StartError("cannot set the damaged journal " + database() + " aside", errno);
    }
    // Changes that are not in the file yet. The index over them is made anew.
    ::rename((database() + "-wal").c_str(), (other + "-wal").c_str());
    ::unlink((database() + "-shm").c_str());
    // What it holds of requests may be secret.
    ::chmod(other.c_str(), 0600);
    ::chmod((other + "-wal").c_str(), 0600);
    syncDirectory(path_);
    return other;
}

std::string StateDirectory::notedIdentity() const {
    const sys::FileDescriptor file(
        ::open((path_ + kIdentity).c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
    char text[64];
    const ssize_t size = file ? ::read(file.get(), text, sizeof text) : 0;
    return std::string(text, size > 0 ? static_cast<std::size_t>(size) : 0);
}

void StateDirectory::noteIdentity(const std::string& identity) const noexcept {
    const sys::FileDescriptor file(::open(
        (path_ + kIdentity).c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!file) return;
    const ssize_t written = ::write(file.get(), identity.data(), identity.size());
    if (written > 0) ::fsync(file.get());
}

bool StateDirectory::takeReserve() const {
    const std::string name = path_ + kReserveFile;
    const sys::FileDescriptor file(
        ::open(name.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!file) return false;
    struct stat found {};
    if (::fstat(file.get(), &found) != 0) return false;
    if (static_cast<long long>(found.st_blocks) * 512 >= kReserve) return true;
    if (::posix_fallocate(file.get(), 0, static_cast<off_t>(kReserve)) == 0) return true;
    ::unlink(name.c_str());
    return false;
}

bool StateDirectory::freeReserve() const {
    return ::unlink((path_ + kReserveFile).c_str()) == 0;
}

}  // namespace host
