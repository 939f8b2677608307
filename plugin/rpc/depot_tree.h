/// The agent depot as a transfer may touch it.
#pragma once

#include <sys/types.h>

#include <string>
#include <utility>

#include "base/file_descriptor.h"
#include "util/directory_tree.h"

namespace ZAV {

/// Resolves paths that begin with the depot's beneath the depot (see openBeneath), so that neither
/// a link nor a rename at the wrong time leads out of it. The depot itself and what lies above it
/// are the administrator's, and found as the system finds them. One thread at a time.
class DepotTree final : public DirectoryTree {
public:
    /// `depot` is its path in the local code page and ends in "/".
    explicit DepotTree(std::string depot) : depot_(std::move(depot)) {}

    bool exists(const char* path) override;
    int make(const char* path, mode_t mode) override;

    /// Opens a file like openFile. EXDEV when the path leads out of the depot.
    FileDescriptor open(const char* path, int flags, mode_t mode = 0);

    /// Removes a file like unlink.
    int remove(const char* path);

    /// Gives the file `from`, which may lie anywhere, a second name, like link.
    int linkFrom(const char* from, const char* path);

private:
    /// The depot's descriptor, or -1 with errno set.
    int top();
    /// What follows the depot in a path; null for the depot itself and what lies above it.
    const char* relative(const char* path) const;

    /// The directory that a path's last component is in, for the calls that end in "at", none of
    /// which follows a link there.
    struct Place {
        int directory;     ///< -1, with errno set, when it cannot be reached
        std::string name;  ///< the last component
    };
    Place placeOf(const std::string& path);
    /// A directory below the depot, open. The one that was reached last is remembered until a file
    /// is opened, because a transfer asks for its file's directory more than once.
    const FileDescriptor& reach(const char* path, const std::string& directory);
    FileDescriptor openRelative(const char* path, const char* name, int flags, mode_t mode);

    const std::string depot_;
    FileDescriptor top_;
    std::string reachedName_;  ///< what `reached_` is called below the depot
    FileDescriptor reached_;
};

}  // namespace ZAV
