/// The depot as its owner sees it: what it holds, and how to remove it.
///
/// Paths are relative to the depot and made of bytes, as the file system has them; one slash at the
/// start is dropped. No path and no link leads out of the depot.
#pragma once

#include <cstdint>
#include <ctime>
#include <string>
#include <vector>

#include "host/depot/checksum.h"
#include "system/file_descriptor.h"

namespace host {

struct DepotEntry {
    enum class Type { File, Directory, Link, Other };
    std::string name;
    Type type = Type::Other;
    std::uint64_t bytes = 0;  ///< 0 for all but files
    std::timespec modified{};
};

struct DepotListing {
    DepotEntry self;                  ///< what the path names
    std::vector<DepotEntry> entries;  ///< of a directory, in the order of their names
    bool complete = true;             ///< false when there are more than fit
};

/// Any thread. What goes wrong is thrown as DepotError.
class Depot {
public:
    /// `directory` need not exist yet. Nothing below the directories `keptOut` is shown, removed
    /// or measured: they are the host's own. A listing holds at most `mostEntries`.
    explicit Depot(std::string directory, std::vector<std::string> keptOut = {},
                   std::size_t mostEntries = 10'000);

    const std::string& directory() const { return directory_; }
    const std::vector<std::string>& keptOut() const { return keptOut_; }

    /// Follows a link if it stays inside; one that does not is listed as itself.
    DepotListing list(const std::string& path) const;
    /// Of a regular file.
    Checksum sum(const std::string& path) const;
    /// Removes a file or link, never what a link points to; a directory only with `recursive`, and
    /// never the depot itself.
    void remove(const std::string& path, bool recursive) const;

    /// Bytes that the host's user may still write.
    std::uint64_t freeBytes() const;

private:
    sys::FileDescriptor root() const;
    sys::FileDescriptor open(const sys::FileDescriptor& root, const std::string& path,
                             int flags) const;
    void refuseKept(const std::string& realPath, const std::string& path) const;

    const std::string directory_;
    const std::vector<std::string> keptOut_;
    const std::size_t mostEntries_;
};

}  // namespace host
