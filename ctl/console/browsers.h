/// Whose browsers the console serves.
#pragma once

#include <sys/types.h>

#include <functional>
#include <optional>
#include <string>

#include "http/door.h"

namespace console {

/// The link is no secret from other users of the machine: it stands in the command line of whatever
/// opens it. So the console asks the kernel whose process each connection comes from.
struct Browsers {
    std::optional<uid_t> other{};  ///< a user whose browser is served besides one's own and root's
    /// The user at the other end of an accepted connection; nothing if that is not known.
    std::function<std::optional<uid_t>(int accepted)> ownerOf = {};  ///< empty: asks the kernel
};

/// The user of that name or number. Throws ctl::Failure(kWrongUsage) if there is none.
uid_t browserUser(const std::string& name);

/// Whoever has run sudo, if this process is root's: it is their browser that the link is for.
std::optional<uid_t> userBehindSudo();

/// Lets in whom `browsers` names, and tells others so.
http::Door doorFor(Browsers browsers);

}  // namespace console
