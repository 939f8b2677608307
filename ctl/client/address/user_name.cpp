#include "ctl/client/address/user_name.h"

#include <pwd.h>

namespace ctl {

std::string userName(uid_t user) {
    const passwd* const entry = ::getpwuid(user);
    return entry != nullptr ? entry->pw_name : std::to_string(user);
}

}  // namespace ctl
