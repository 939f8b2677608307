#include "ctl/client/address/host_address.h"

#include <cstdlib>
#include <filesystem>
#include <system_error>

namespace ctl {
namespace {

std::string environment(const char* name) {
    const char* value = std::getenv(name);
    return value != nullptr ? value : "";
}

/// Where the service has its socket.
constexpr const char* kServiceSocket = "/run/zavhost/zavhost.sock";

bool isThere(const std::string& path) {
    std::error_code ignored;
    return std::filesystem::exists(path, ignored);
}

}  // namespace

std::string defaultSocket() {
    if (const std::string named = environment("ZAV_SOCKET"); !named.empty()) return named;
    const std::string dir = environment("XDG_RUNTIME_DIR");
    std::string own = (dir.empty() ? "/run" : dir) + "/zavhost.sock";
    return !isThere(own) && isThere(kServiceSocket) ? kServiceSocket : own;
}

}  // namespace ctl
