/// Whether a file can be trusted.
#pragma once

#include <sys/stat.h>
#include <unistd.h>

namespace host {

/// Whether only this process's user and root own the file and may write to it.
inline bool isTrusted(const struct stat& found) {
    return (found.st_uid == ::geteuid() || found.st_uid == 0) &&
           (found.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

}  // namespace host
