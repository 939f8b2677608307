// Creates directory trees.
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "base/read_file.h"
#include "base/zavtrace.h"
#include "util/directory_tree.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavutil"};

constexpr mode_t kDirectoryMode = 0770;
constexpr int kNothingToCreate = 1;
constexpr int kNoMemory = 2;

class WholeSystem final : public DirectoryTree {
public:
    bool exists(const char* path) override { return ::access(path, F_OK) == 0; }
    int make(const char* path, mode_t mode) override { return ::mkdir(path, mode); }
};

/// Creates one directory. Returns 0, or the errno value after tracing it.
int makeTraced(Trace& trace, DirectoryTree& tree, const char* path) {
    if (tree.make(path, kDirectoryMode) == 0) return 0;
    const int failure = errno;
    trace().error("Failed to make directory %s, return code status", path);
    return failure;
}

/// Creates one of the parent directories unless it exists.
int makeAbove(Trace& trace, DirectoryTree& tree, const char* path) {
    if (tree.exists(path)) return 0;
    trace().detail("Making directory %s", path);
    if (tree.make(path, kDirectoryMode) == 0) return 0;
    const int failure = errno;
    // Another thread may have created it meanwhile, for a tree of its own below the same directory.
    if (failure == EEXIST && tree.exists(path)) return 0;
    trace().error("Failed to make directory %s, return code status", path);
    return failure;
}

/// Creates the missing parents of `path`. `rest` points behind its leading slashes.
int makeAllAbove(Trace& trace, DirectoryTree& tree, const char* path, const char* rest) {
    for (const char* slash = std::strchr(rest, '/'); slash != nullptr && slash[1] != '\0';
         slash = std::strchr(slash + 1, '/')) {
        const std::size_t length = static_cast<std::size_t>(slash - path);
        const MallocedText prefix(static_cast<char*>(std::malloc(length + 1)));
        if (prefix == nullptr) {
            trace().error("Malloc of %d bytes failed", length + 1);
            return kNoMemory;
        }
        std::memcpy(prefix.get(), path, length);
        prefix.get()[length] = '\0';
        const int rc = makeAbove(trace, tree, prefix.get());
        if (rc != 0) return rc;
    }
    return 0;
}

}  // namespace

int createDir(DirectoryTree& tree, const char* path) {
    Trace trace(traceUnit);
    const char* const rest = path + std::strspn(path, "/");
    if (*rest == '\0') {
        trace().error("Could not create directory %s, nothing to create", path);
        return trace.exit(kNothingToCreate);
    }
    const int rc = makeAllAbove(trace, tree, path, rest);
    if (rc != 0) return trace.exit(rc);
    trace().detail("Making final directory %s", path);
    return trace.exit(makeTraced(trace, tree, path));
}

int Util::createDir(const char* path) {
    WholeSystem everywhere;
    return ZAV::createDir(everywhere, path);
}

}  // namespace ZAV
