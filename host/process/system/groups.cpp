#include "host/process/system/groups.h"

#include <grp.h>

#include <cerrno>
#include <system_error>
#include <vector>

#include "host/process/start_error.h"

namespace host {

Group groupNamed(const std::string& option, const std::string& name) {
    constexpr std::size_t kMostBytes = std::size_t{16} << 20;
    std::vector<char> buffer(16 * 1024);
    group entry{};
    group* found = nullptr;
    int error = ::getgrnam_r(name.c_str(), &entry, buffer.data(), buffer.size(), &found);
    while (error == ERANGE && buffer.size() < kMostBytes) {  // a group with many members
        buffer.resize(buffer.size() * 2);
        error = ::getgrnam_r(name.c_str(), &entry, buffer.data(), buffer.size(), &found);
    }
    if (found != nullptr) return {name, entry.gr_gid};
    throw StartError(option + ": " +
                     (error == 0 ? "there is no group \"" + name + "\""
                                 : name + ": " + std::generic_category().message(error)));
}

}  // namespace host
