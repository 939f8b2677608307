#include "host/process/system/user_name.h"

#include <pwd.h>

#include <vector>

namespace host {

std::string userName(uid_t user) {
    passwd entry{};
    passwd* found = nullptr;
    std::vector<char> buffer(16 * 1024);
    if (::getpwuid_r(user, &entry, buffer.data(), buffer.size(), &found) != 0 || found == nullptr) {
        return std::to_string(user);
    }
    return entry.pw_name;
}

}  // namespace host
