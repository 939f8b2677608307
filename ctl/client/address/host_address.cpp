#include "ctl/client/address/host_address.h"

#include <cstdlib>

namespace ctl {
namespace {

std::string environment(const char* name) {
    const char* value = std::getenv(name);
    return value != nullptr ? value : "";
}

}  // namespace

std::string defaultSocket() {
    if (const std::string named = environment("ZAV_SOCKET"); !named.empty()) return named;
    if (const std::string dir = environment("XDG_RUNTIME_DIR"); !dir.empty()) {
        return dir + "/zavhost.sock";
    }
    return "/run/zavhost.sock";
}

}  // namespace ctl
