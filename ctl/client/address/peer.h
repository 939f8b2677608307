/// Whom the program talks to.
#pragma once

#include <sys/types.h>

#include <string>

#include "ctl/client/failure.h"

namespace ctl {

/// Takes a host of this user for one to be trusted, besides those of one's own user and of root. To
/// be called before the first connection, at most once. Throws Failure(kWrongUsage) when there is
/// no such user; a number is one in any case.
void trustHostUser(const std::string& name);

/// Whether `self` may trust a host that `peer` runs, when `named` has been named besides. Root asks
/// nobody: who could harm it that way needs no socket.
bool isTrusted(uid_t self, uid_t peer, uid_t named);

/// Asks the kernel who listens at the other end of a connected Unix socket. Whoever may write where
/// a host's socket is expected could put one of his own there, and would get what is pushed and
/// set. Throws Failure(kNoHost) unless it is a user to be trusted.
void refuseStranger(int socket, const std::string& path);

}  // namespace ctl
