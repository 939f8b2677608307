#include "host/depot/depot.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <system_error>
#include <utility>

#include "host/depot/beneath.h"
#include "host/depot/depot_error.h"
#include "host/depot/real_path.h"
#include "host/depot/remove_tree.h"
#include "host/process/system/directory_stream.h"

namespace host {
namespace {

using Kind = DepotError::Kind;

std::string withoutSlashes(const std::string& path) {
    const std::size_t begin = std::min(path.find_first_not_of('/'), path.size());
    return path.substr(begin);
}

Kind kindOf(int error) {
    switch (error) {
        case ENOENT:
            return Kind::NotThere;
        case EXDEV:
            return Kind::LeadsOut;
        case EACCES:
        case EPERM:
        case EROFS:
            return Kind::Forbidden;
        case ENOTDIR:
        case EISDIR:
        case ELOOP:
        case ENXIO:
        case ENAMETOOLONG:
            return Kind::WrongKind;
        default:
            return Kind::Failed;
    }
}

DepotError errorAbout(const std::string& path, int error) {
    const Kind kind = kindOf(error);
    if (kind == Kind::LeadsOut) return {kind, path + " leads out of the depot"};
    if (kind == Kind::NotThere) return {kind, "the depot holds no " + path};
    return {kind, path + ": " + std::strerror(error)};
}

DepotEntry entryOf(std::string name, const struct stat& found) {
    DepotEntry entry;
    entry.name = std::move(name);
    entry.modified = found.st_mtim;
    if (S_ISREG(found.st_mode)) {
        entry.type = DepotEntry::Type::File;
        entry.bytes = static_cast<std::uint64_t>(found.st_size);
    } else if (S_ISDIR(found.st_mode)) {
        entry.type = DepotEntry::Type::Directory;
    } else if (S_ISLNK(found.st_mode)) {
        entry.type = DepotEntry::Type::Link;
    }
    return entry;
}

/// The first `most` names in a directory; false if there are more.
bool readNames(sys::FileDescriptor opened, std::size_t most, std::vector<std::string>& names) {
    const DirectoryStream directory(::fdopendir(opened.get()));
    if (!directory) throw std::system_error(errno, std::generic_category(), "fdopendir");
    opened.release();
    while (const dirent* const entry = ::readdir(directory.get())) {
        const std::string name = entry->d_name;
        if (name == "." || name == "..") continue;
        if (names.size() == most) return false;
        names.push_back(name);
    }
    return true;
}

std::vector<DepotEntry> entriesOf(const sys::FileDescriptor& directory,
                                  std::vector<std::string> names) {
    std::sort(names.begin(), names.end());
    std::vector<DepotEntry> entries;
    for (std::string& name : names) {
        struct stat found {};
        // What has gone meanwhile is not there.
        if (::fstatat(directory.get(), name.c_str(), &found, AT_SYMLINK_NOFOLLOW) != 0) continue;
        entries.push_back(entryOf(std::move(name), found));
    }
    return entries;
}

/// The directory part and the last component of a path.
std::pair<std::string, std::string> split(std::string path) {
    while (!path.empty() && path.back() == '/')
        path.pop_back();
    const std::size_t slash = path.rfind('/');
    if (slash == std::string::npos) return {"", path};
    return {path.substr(0, slash), path.substr(slash + 1)};
}

}  // namespace

Depot::Depot(std::string directory, std::vector<std::string> keptOut, std::size_t mostEntries)
    : directory_(std::move(directory)), keptOut_(std::move(keptOut)), mostEntries_(mostEntries) {}

sys::FileDescriptor Depot::root() const {
    sys::FileDescriptor opened(
        ::open(directory_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NONBLOCK));
    if (opened) return opened;
    throw DepotError(Kind::Failed,
                     "the depot " + directory_ + " cannot be opened: " + std::strerror(errno));
}

sys::FileDescriptor Depot::open(const sys::FileDescriptor& root, const std::string& path,
                                int flags) const {
    sys::FileDescriptor opened = openBeneath(root.get(), path, flags);
    if (!opened) throw errorAbout(path, errno);
    refuseKept(pathOfDescriptor(opened.get()), path);
    return opened;
}

void Depot::refuseKept(const std::string& real, const std::string& path) const {
    for (const std::string& kept : keptOut_) {
        if (isWithin(real, realPath(kept))) {
            throw DepotError(Kind::Forbidden, path + " is the host's own");
        }
    }
}

DepotListing Depot::list(const std::string& given) const {
    const std::string path = withoutSlashes(given);
    const sys::FileDescriptor top = root();
    sys::FileDescriptor found = openBeneath(top.get(), path, O_PATH);
    if (!found) found = open(top, path, O_PATH | O_NOFOLLOW);
    refuseKept(pathOfDescriptor(found.get()), path);
    struct stat status {};
    if (::fstat(found.get(), &status) != 0) throw errorAbout(path, errno);
    DepotListing listing;
    listing.self = entryOf(split(path).second, status);
    if (listing.self.type != DepotEntry::Type::Directory) return listing;
    sys::FileDescriptor directory(
        ::openat(found.get(), ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC | O_NONBLOCK));
    if (!directory) throw errorAbout(path, errno);
    std::vector<std::string> names;
    listing.complete = readNames(std::move(directory), mostEntries_, names);
    listing.entries = entriesOf(found, std::move(names));
    return listing;
}

Checksum Depot::sum(const std::string& given) const {
    const std::string path = withoutSlashes(given);
    const sys::FileDescriptor top = root();
    // Without waiting for the other end of what may be a pipe.
    const sys::FileDescriptor file = open(top, path, O_RDONLY | O_NONBLOCK | O_NOCTTY);
    struct stat found {};
    if (::fstat(file.get(), &found) != 0) throw errorAbout(path, errno);
    if (!S_ISREG(found.st_mode)) throw DepotError(Kind::WrongKind, path + " is no regular file");
    try {
        return checksumOf(file.get());
    } catch (const std::system_error& error) {
        throw errorAbout(path, error.code().value());
    }
}

void Depot::remove(const std::string& given, bool recursive) const {
    const std::string path = withoutSlashes(given);
    const auto [above, name] = split(path);
    if (name.empty() || name == "." || name == "..") {
        throw DepotError(Kind::WrongKind, "the name of a file in the depot is missing");
    }
    const sys::FileDescriptor top = root();
    const sys::FileDescriptor parent = open(top, above, O_PATH | O_DIRECTORY);
    const std::string real = pathOfDescriptor(parent.get()) + "/" + name;
    refuseKept(real, path);
    struct stat found {};
    if (::fstatat(parent.get(), name.c_str(), &found, AT_SYMLINK_NOFOLLOW) != 0) {
        throw errorAbout(path, errno);
    }
    if (!S_ISDIR(found.st_mode)) {
        if (::unlinkat(parent.get(), name.c_str(), 0) != 0) throw errorAbout(path, errno);
        return;
    }
    if (!recursive) throw DepotError(Kind::WrongKind, path + " is a directory");
    for (const std::string& kept : keptOut_) {
        if (isWithin(realPath(kept), real)) {
            throw DepotError(Kind::Forbidden, path + " holds what is the host's own");
        }
    }
    if (const int reason = removeTree(parent.get(), name)) throw errorAbout(path, reason);
}

std::uint64_t Depot::freeBytes() const {
    struct statvfs found {};
    if (::statvfs(directory_.c_str(), &found) != 0) {
        throw DepotError(Kind::Failed,
                         "the depot " + directory_ + " cannot be used: " + std::strerror(errno));
    }
    return std::uint64_t{found.f_bavail} * found.f_frsize;
}

}  // namespace host
