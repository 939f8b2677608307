/// Acting as the user to whom a directory belongs.
#pragma once

#include <sys/types.h>

#include <string>

namespace fleet {

/// Root enrols a host whose link runs as another user, the owner of the link's directory. As long
/// as this lives, the process has that user's rights: what it makes belongs to the user, and
/// nothing that the user has put into the directory can misuse root's rights. Without root's rights
/// it does nothing. It concerns the whole process; one at a time.
class OwnersRights {
public:
    /// Throws FileError.
    explicit OwnersRights(const std::string& directory);
    ~OwnersRights();
    OwnersRights(const OwnersRights&) = delete;
    OwnersRights& operator=(const OwnersRights&) = delete;

private:
    bool isChanged_ = false;
    gid_t group_;
};

}  // namespace fleet
