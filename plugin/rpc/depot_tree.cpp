#include "rpc/depot_tree.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>

#include "rpc/beneath.h"

namespace ZAV {

int DepotTree::top() {
    if (!top_.isOpen()) {
        top_ = takeDescriptor(::open(depot_.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    }
    return top_.get();
}

const char* DepotTree::relative(const char* path) const {
    if (std::strlen(path) < depot_.size()) return nullptr;
    const char* const name = path + depot_.size();
    return name + std::strspn(name, "/");
}

/// The whole path has a limit, as it has for the system, although only a part of it is passed on.
FileDescriptor DepotTree::openRelative(const char* path, const char* name, int flags, mode_t mode) {
    if (std::strlen(path) >= PATH_MAX) {
        errno = ENAMETOOLONG;
        return FileDescriptor();
    }
    const int depot = top();
    if (depot < 0) return FileDescriptor();
    return openBeneath(depot, *name != '\0' ? name : ".", flags, mode);
}

bool DepotTree::exists(const char* path) {
    const char* const name = relative(path);
    if (name == nullptr) return ::access(path, F_OK) == 0;
    return reach(path, name).isOpen();
}

int DepotTree::make(const char* path, mode_t mode) {
    if (relative(path) == nullptr) return ::mkdir(path, mode);
    std::string bare = path;
    bare.erase(bare.find_last_not_of('/') + 1);
    const Place place = placeOf(bare);
    if (place.directory < 0) return -1;
    return ::mkdirat(place.directory, place.name.c_str(), mode);
}

FileDescriptor DepotTree::open(const char* path, int flags, mode_t mode) {
    reached_.close();  // a process that is short of descriptors needs it for the file
    return openRelative(path, relative(path), flags, mode);
}

int DepotTree::remove(const char* path) {
    const Place place = placeOf(path);
    if (place.directory < 0) return -1;
    return ::unlinkat(place.directory, place.name.c_str(), 0);
}

int DepotTree::linkFrom(const char* from, const char* path) {
    const Place place = placeOf(path);
    if (place.directory < 0) return -1;
    return ::linkat(AT_FDCWD, from, place.directory, place.name.c_str(), 0);
}

DepotTree::Place DepotTree::placeOf(const std::string& path) {
    const std::string name = relative(path.c_str());
    const std::size_t slash = name.rfind('/');
    const std::string above = slash != std::string::npos ? name.substr(0, slash) : ".";
    return {reach(path.c_str(), above).get(),
            slash != std::string::npos ? name.substr(slash + 1) : name};
}

const FileDescriptor& DepotTree::reach(const char* path, const std::string& directory) {
    if (reached_.isOpen() && reachedName_ == directory) return reached_;
    reached_ = openRelative(path, directory.c_str(), O_PATH, 0);
    reachedName_ = directory;
    return reached_;
}

}  // namespace ZAV
