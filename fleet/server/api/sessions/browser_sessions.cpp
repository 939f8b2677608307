#include "fleet/server/api/sessions/browser_sessions.h"

#include <utility>

#include "fleet/bus/messages/invitation.h"

namespace fleet {

ConsoleLink BrowserSessions::makeLink(const std::string& key, Moment now) {
    const std::lock_guard lock(mutex_);
    const Moment expires = now + kLinkLifetime;
    return {add(links_, {key, expires}, kMostLinksOfKey, now), expires};
}

std::optional<std::string> BrowserSessions::open(std::string_view token, Moment now) {
    const std::optional<std::string> fingerprint = fingerprintOfToken(token);
    if (!fingerprint) return std::nullopt;
    const std::lock_guard lock(mutex_);
    const auto found = links_.find(*fingerprint);
    if (found == links_.end()) return std::nullopt;
    const Entry link = std::move(found->second);
    links_.erase(found);
    if (link.expires <= now) return std::nullopt;
    return add(sessions_, {link.key, now + kLifetime}, kMostOfKey, now);
}

std::optional<std::string> BrowserSessions::keyOf(std::string_view token, Moment now) const {
    const std::optional<std::string> fingerprint = fingerprintOfToken(token);
    if (!fingerprint) return std::nullopt;
    const std::lock_guard lock(mutex_);
    const auto found = sessions_.find(*fingerprint);
    if (found == sessions_.end() || found->second.expires <= now) return std::nullopt;
    return found->second.key;
}

/// Returns the token of the new entry.
std::string BrowserSessions::add(Entries& entries, const Entry& entry, std::size_t mostOfKey,
                                 Moment now) {
    std::size_t own = 0;
    auto oldest = entries.end();
    for (auto known = entries.begin(); known != entries.end();) {
        if (known->second.expires <= now) {
            known = entries.erase(known);
            continue;
        }
        if (known->second.key == entry.key) {
            ++own;
            const bool isOlder =
                oldest == entries.end() || known->second.expires < oldest->second.expires;
            if (isOlder) oldest = known;
        }
        ++known;
    }
    if (own >= mostOfKey) entries.erase(oldest);
    std::string token = makeJoinToken();
    entries[*fingerprintOfToken(token)] = entry;
    return token;
}

}  // namespace fleet
