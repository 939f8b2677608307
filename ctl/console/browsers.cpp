#include "ctl/console/browsers.h"

#include <pwd.h>
#include <unistd.h>

#include <charconv>
#include <cstdlib>
#include <string_view>
#include <utility>

#include "ctl/client/address/user_name.h"
#include "ctl/client/failure.h"
#include "system/loopback_peer.h"

namespace console {
namespace {

std::optional<uid_t> userNumber(std::string_view text) {
    uid_t user = 0;
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, user);
    if (error != std::errc() || rest != end || user == static_cast<uid_t>(-1)) return std::nullopt;
    return user;
}

bool isServed(uid_t user, const Browsers& browsers) {
    return user == ::geteuid() || user == 0 || user == browsers.other;
}

}  // namespace

uid_t browserUser(const std::string& name) {
    if (const passwd* const entry = ::getpwnam(name.c_str())) return entry->pw_uid;
    if (const auto number = userNumber(name)) return *number;
    throw ctl::Failure(ctl::kWrongUsage, "there is no user " + name);
}

std::optional<uid_t> userBehindSudo() {
    const char* const user = std::getenv("SUDO_UID");
    return user != nullptr && ::geteuid() == 0 ? userNumber(user) : std::nullopt;
}

http::Door doorFor(Browsers browsers) {
    if (!browsers.ownerOf) browsers.ownerOf = sys::ownerOfLoopbackPeer;
    std::string refusal = "this console serves the browser of " + ctl::userName(::geteuid()) +
                          (browsers.other ? " and of " + ctl::userName(*browsers.other) : "") +
                          "; \"zavctl console --browser-user NAME\" serves another user's";
    const auto peerOf = [browsers = std::move(browsers)](int accepted) {
        http::Peer peer{0, static_cast<uid_t>(-1), 0, http::Access::None, ""};
        const std::optional<uid_t> user = browsers.ownerOf(accepted);
        if (!user) return peer;
        peer.user = *user;
        if (!isServed(*user, browsers)) return peer;
        peer.access = http::Access::Act;
        peer.reason = "the cookie tells";
        return peer;
    };
    return {peerOf, std::move(refusal)};
}

}  // namespace console
