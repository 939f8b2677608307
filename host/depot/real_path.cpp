#include "host/depot/real_path.h"

#include <fcntl.h>
#include <limits.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>

#include "system/file_descriptor.h"

namespace host {

std::string pathOfDescriptor(int descriptor) {
    const std::string link = "/proc/self/fd/" + std::to_string(descriptor);
    char target[PATH_MAX];
    const ssize_t length = ::readlink(link.c_str(), target, sizeof target);
    if (length <= 0 || target[0] != '/') return "";
    return std::string(target, static_cast<std::size_t>(length));
}

std::string realPath(const std::string& path) {
    std::string existing = path;
    while (!existing.empty()) {
        const sys::FileDescriptor found(::open(existing.c_str(), O_PATH | O_CLOEXEC));
        if (found) {
            const std::string real = pathOfDescriptor(found.get());
            if (real.empty()) return "";
            const std::string missing = path.substr(existing.size());
            const std::string whole = (real + "/" + missing);
            std::string normal = std::filesystem::path(whole).lexically_normal().string();
            while (normal.size() > 1 && normal.back() == '/')
                normal.pop_back();
            return normal;
        }
        if (errno != ENOENT) return "";
        // One component less; "/" is always there.
        const std::size_t end = existing.find_last_not_of('/');
        const std::size_t slash = existing.rfind('/', end);
        if (slash == std::string::npos) return "";
        existing.resize(std::max<std::size_t>(slash, 1));
    }
    return "";
}

bool isWithin(const std::string& path, const std::string& directory) {
    if (directory.empty() || path.compare(0, directory.size(), directory) != 0) return false;
    return path.size() == directory.size() || directory == "/" || path[directory.size()] == '/';
}

}  // namespace host
