/// Who is logged in at the centre.
#pragma once

#include <cstddef>
#include <deque>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/messages/session.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

/// A session as its operator's zavctl gets it.
struct OpenedSession {
    std::string token;  ///< secret
    Moment expires{};
};

/// Only in memory: after a restart everybody opens a session anew. What the holder of a key may do
/// is not kept here, so that a revocation counts at once. Any thread.
class Sessions {
public:
    static constexpr Moment kLifetime = std::chrono::hours(8);
    /// `begun` is when this centre began to listen: what was signed before then may have come to it
    /// before its last end.
    explicit Sessions(Moment begun = {}) : begun_(begun) {}

    /// How far an operator's clock may be off.
    static constexpr Moment kClockError = std::chrono::minutes(5);
    /// Of one key; a further one ends the oldest of them.
    static constexpr std::size_t kMostOfKey = 32;
    /// That one key may open within some minutes.
    static constexpr std::size_t kMostNonces = 256;

    /// Nothing if the request is out of date, came before, or is one of very many. The caller has
    /// seen that its key is certified, and that the request is for this centre: others cannot fill
    /// the list.
    std::optional<OpenedSession> open(const SessionRequest& request, Moment now);

    /// The key that has opened the session; nothing if there is none of this token.
    std::optional<std::string> keyOf(std::string_view token, Moment now) const;

    /// How many are open.
    std::size_t count(Moment now) const;

private:
    struct Session {
        std::string key;
        Moment expires{};
    };
    void forgetOld(Moment now);
    void endOldestOf(const std::string& key);

    const Moment begun_;
    mutable std::mutex mutex_;
    /// By fingerprints of their tokens, so that how long a look takes tells nothing.
    std::map<std::string, Session> sessions_;
    std::map<std::string, std::deque<std::string>> ofKey_;  ///< fingerprints, the oldest first
    /// Of each key, and until when they are remembered.
    std::map<std::string, std::map<std::string, Moment>> nonces_;
};

}  // namespace fleet
