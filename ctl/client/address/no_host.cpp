#include "ctl/client/address/no_host.h"

#include <grp.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>

#include "ctl/client/address/user_name.h"

namespace ctl {
namespace {

std::string groupName(gid_t group) {
    const struct group* const entry = ::getgrgid(group);
    return entry != nullptr ? entry->gr_name : std::to_string(group);
}

/// Empty if the socket cannot be seen.
std::string whoMayUse(const std::string& path) {
    struct stat found {};
    if (::stat(path.c_str(), &found) != 0)
        return "only its host's user and root may see the socket";
    const std::string owner = userName(found.st_uid);
    std::string who = owner == "root" ? "root" : "root and the user " + owner;
    if ((found.st_mode & S_IWGRP) != 0) who += " and the group " + groupName(found.st_gid);
    return "only " + who + " may use the socket";
}

/// The socket that a host is told of; that for file transfers is usually called after it.
std::string mainSocket(const std::string& path) {
    const std::string suffix = ".rpc";
    const bool isNamedAfter = path.size() > suffix.size() &&
                              path.compare(path.size() - suffix.size(), suffix.size(), suffix) == 0;
    return isNamedAfter ? path.substr(0, path.size() - suffix.size()) : path;
}

}  // namespace

Failure noHost(const std::string& path, int error) {
    std::string hint;
    if (error == ENOENT || error == ECONNREFUSED) {
        hint = "start one with: zavhost --home DIR --socket " + mainSocket(path);
    } else if (error == EACCES || error == EPERM) {
        hint = whoMayUse(path);
    }
    return {kNoHost, "no host reached at " + path + ": " + std::strerror(error), hint};
}

}  // namespace ctl
