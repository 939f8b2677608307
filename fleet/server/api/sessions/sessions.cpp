#include "fleet/server/api/sessions/sessions.h"

#include <algorithm>

#include "fleet/bus/messages/invitation.h"

namespace fleet {

std::optional<OpenedSession> Sessions::open(const SessionRequest& request, Moment now) {
    if (request.time > now + kClockError || request.time < now - kClockError) return std::nullopt;
    if (request.time < begun_) return std::nullopt;
    const std::lock_guard lock(mutex_);
    forgetOld(now);
    // As long as its time would let it in again.
    std::map<std::string, Moment>& nonces = nonces_[request.key];
    if (nonces.size() >= kMostNonces) return std::nullopt;
    if (!nonces.emplace(request.nonce, request.time + kClockError).second) return std::nullopt;
    if (ofKey_[request.key].size() >= kMostOfKey) endOldestOf(request.key);
    const OpenedSession opened{makeJoinToken(), now + kLifetime};
    const std::string fingerprint = *fingerprintOfToken(opened.token);
    sessions_[fingerprint] = {request.key, opened.expires};
    ofKey_[request.key].push_back(fingerprint);
    return opened;
}

std::optional<std::string> Sessions::keyOf(std::string_view token, Moment now) const {
    const std::optional<std::string> fingerprint = fingerprintOfToken(token);
    if (!fingerprint) return std::nullopt;
    const std::lock_guard lock(mutex_);
    const auto found = sessions_.find(*fingerprint);
    if (found == sessions_.end() || found->second.expires <= now) return std::nullopt;
    return found->second.key;
}

std::size_t Sessions::count(Moment now) const {
    const std::lock_guard lock(mutex_);
    const auto isOpen = [now](const auto& session) { return session.second.expires > now; };
    return static_cast<std::size_t>(std::count_if(sessions_.begin(), sessions_.end(), isOpen));
}

void Sessions::forgetOld(Moment now) {
    for (auto& [key, nonces] : nonces_) {
        for (auto nonce = nonces.begin(); nonce != nonces.end();)
            nonce = nonce->second < now ? nonces.erase(nonce) : std::next(nonce);
    }
    for (auto& [key, fingerprints] : ofKey_) {
        while (!fingerprints.empty() && sessions_[fingerprints.front()].expires <= now)
            endOldestOf(key);
    }
}

void Sessions::endOldestOf(const std::string& key) {
    std::deque<std::string>& fingerprints = ofKey_[key];
    sessions_.erase(fingerprints.front());
    fingerprints.pop_front();
}

}  // namespace fleet
