/// The directory of what the centre keeps.
#pragma once

#include <string>

namespace fleet {

/// Belongs to one process at a time, and to nobody but its user.
class CentreDirectory {
public:
    /// Makes the directory with mode 0700 if it is missing, and locks it. Throws StoreError when it
    /// cannot be made, when others may use it, or when another process does.
    explicit CentreDirectory(const std::string& path);
    ~CentreDirectory();
    CentreDirectory(const CentreDirectory&) = delete;
    CentreDirectory& operator=(const CentreDirectory&) = delete;

    std::string database() const { return databaseIn(path_); }
    /// The database of a directory that may be another process's.
    static std::string databaseIn(const std::string& path) { return path + "/centre.db"; }

private:
    const std::string path_;
    int lock_ = -1;
};

/// Makes durable what was made in, renamed in or removed from the directory of a file. Throws
/// StoreError.
void syncFolderOf(const std::string& file);

}  // namespace fleet
