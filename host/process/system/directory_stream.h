/// Ownership of an open directory.
#pragma once

#include <dirent.h>

#include <memory>

namespace host {

struct CloseDirectory {
    void operator()(DIR* directory) const { ::closedir(directory); }
};

/// Closes its directory; null stands for none.
using DirectoryStream = std::unique_ptr<DIR, CloseDirectory>;

}  // namespace host
