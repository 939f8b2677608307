#include "rpc/transfer_path.h"

#include <sys/stat.h>

#include <algorithm>
#include <string>

namespace ZAV {
namespace {

bool isSymbolicLink(const std::string& path) {
    struct stat found {};
    return ::lstat(path.c_str(), &found) == 0 && S_ISLNK(found.st_mode);
}

std::string narrow(const String& text) {
    const CharStar bytes = text.c_str();
    return static_cast<const char*>(bytes);
}

}  // namespace

String transferName(const char* fileName) {
    String name = String::replace(String(fileName), String("\\"), String("/"));
    if (name.length() > 0 && name[0] == '/') name.erase(0, 1);
    return name;
}

bool leadsOutOfDepot(const String& depot, const String& name) {
    const std::string path = narrow(name);
    std::string prefix = narrow(depot);
    int depth = 0;
    for (std::size_t at = 0; at < path.size();) {
        const std::size_t end = std::min(path.find('/', at), path.size());
        const std::string component = path.substr(at, end - at);
        if (component == "..") {
            const std::size_t last = prefix.find_last_not_of('/');
            if (--depth < 0 || isSymbolicLink(prefix.substr(0, last + 1))) return true;
        } else if (!component.empty() && component != ".") {
            ++depth;
        }
        prefix += component + "/";
        at = end + 1;
    }
    return false;
}

}  // namespace ZAV
