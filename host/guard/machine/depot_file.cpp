#include "host/guard/machine/depot_file.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

#include "system/file_descriptor.h"

namespace fs = std::filesystem;

namespace host {
namespace {

DepotFile kindOf(const struct stat& status) {
    return S_ISREG(status.st_mode) ? DepotFile::There : DepotFile::Missing;
}

/// For kernels that cannot resolve a name beneath a directory themselves.
DepotFile findByResolving(const std::string& depot, const std::string& name) {
    std::error_code error;
    const fs::path root = fs::canonical(depot, error);
    if (error) return DepotFile::Missing;
    const fs::path file = fs::weakly_canonical(root / name, error);
    if (error) return DepotFile::Missing;
    const fs::path relative = file.lexically_relative(root);
    if (relative.empty() || *relative.begin() == "..") return DepotFile::Outside;
    struct stat status {};
    return ::stat(file.c_str(), &status) == 0 ? kindOf(status) : DepotFile::Missing;
}

}  // namespace

DepotFile findInDepot(const std::string& depot, const std::string& name) {
    const sys::FileDescriptor root(::open(depot.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (!root) return DepotFile::Missing;
    open_how how{};
    how.flags = O_PATH | O_CLOEXEC;
    how.resolve = RESOLVE_BENEATH | RESOLVE_NO_MAGICLINKS;
    // The plug-in appends the name to the depot's, so slashes at its beginning mean nothing.
    const std::string relative = name.substr(std::min(name.find_first_not_of('/'), name.size()));
    const sys::FileDescriptor file(
        static_cast<int>(::syscall(SYS_openat2, root.get(), relative.c_str(), &how, sizeof how)));
    if (!file) {
        if (errno == ENOSYS || errno == EPERM) return findByResolving(depot, relative);
        return errno == EXDEV || errno == ELOOP ? DepotFile::Outside : DepotFile::Missing;
    }
    struct stat status {};
    return ::fstat(file.get(), &status) == 0 ? kindOf(status) : DepotFile::Missing;
}

}  // namespace host
