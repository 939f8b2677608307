/// Directories that are looked for and made in a place of the caller's choice.
#pragma once

#include <sys/types.h>

#include "base/zavstr.h"

namespace ZAV {

/// Resolves the paths that it is asked about in its own way. Paths are in the local code page.
class DirectoryTree {
public:
    /// Whether `path` names something that can be reached, like access.
    virtual bool exists(const char* path) = 0;
    /// Makes one directory like mkdir: returns 0, or -1 with errno set.
    virtual int make(const char* path, mode_t mode) = 0;

protected:
    ~DirectoryTree() = default;
};

/// Util::pathExists in `tree`, with the same trace.
bool pathExists(DirectoryTree& tree, const String& path);

/// Util::createDir in `tree`, with the same trace and results.
int createDir(DirectoryTree& tree, const char* path);

}  // namespace ZAV
