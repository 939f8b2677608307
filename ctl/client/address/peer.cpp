#include "ctl/client/address/peer.h"

#include <pwd.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstring>
#include <system_error>

#include "ctl/client/address/user_name.h"

namespace ctl {
namespace {

constexpr uid_t kNobodyNamed = static_cast<uid_t>(-1);

uid_t namedUser = kNobodyNamed;

}  // namespace

void trustHostUser(const std::string& name) {
    if (const passwd* const entry = ::getpwnam(name.c_str())) {
        namedUser = entry->pw_uid;
        return;
    }
    const char* const end = name.data() + name.size();
    const auto [rest, error] = std::from_chars(name.data(), end, namedUser);
    if (error == std::errc() && rest == end && namedUser != kNobodyNamed) return;
    throw Failure(kWrongUsage, "there is no user " + name);
}

bool isTrusted(uid_t self, uid_t peer, uid_t named) {
    return self == 0 || peer == 0 || peer == self || (named != kNobodyNamed && peer == named);
}

void refuseStranger(int socket, const std::string& path) {
    ucred peer{};
    socklen_t length = sizeof peer;
    if (::getsockopt(socket, SOL_SOCKET, SO_PEERCRED, &peer, &length) != 0) {
        throw Failure(kNoHost,
                      "cannot find out who listens at " + path + ": " + std::strerror(errno));
    }
    if (isTrusted(::geteuid(), peer.uid, namedUser)) return;
    const std::string user = userName(peer.uid);
    throw Failure(kNoHost, "the host at " + path + " is run by " + user + ", not by you or root",
                  "If that is meant to be so, add --host-user " + user);
}

}  // namespace ctl
