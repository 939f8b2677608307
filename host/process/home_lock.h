/// Keeps a second host off a directory.
#pragma once

#include <string>

#include "host/process/start_error.h"
#include "system/file_descriptor.h"

namespace host {

/// Another process holds the lock.
class InUse : public StartError {
public:
    using StartError::StartError;
};

/// Two hosts on one home would overwrite each other's files and run commands at the same time. The
/// owner of a home holds a lock on the file .zavhost.lock in it, which contains its process id. The
/// lock ends with the process, however that ends; the file stays. Children do not inherit it. The
/// same goes for the directory of what a host itself keeps.
class HomeLock {
public:
    /// Who holds the lock of that directory: "the host with process id N" or, if it has not said
    /// so, "another host"; "" when nobody does. Takes the lock itself for an instant, which hosts
    /// that start wait for.
    static std::string ownerOf(const std::string& directory);

    /// Throws InUse when another process holds the lock, with that process's id, and StartError
    /// when the file cannot be made. `what` is the word for the directory in that sentence.
    explicit HomeLock(const std::string& directory, const std::string& what = "home");

private:
    sys::FileDescriptor file_;
};

}  // namespace host
