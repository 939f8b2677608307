/// Users as people know them.
#pragma once

#include <sys/types.h>

#include <string>

namespace ctl {

/// The user's name, or the number of one that the system does not know.
std::string userName(uid_t user);

}  // namespace ctl
