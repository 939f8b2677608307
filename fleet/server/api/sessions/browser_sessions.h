/// The browsers that look at the fleet.
#pragma once

#include <cstddef>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/messages/values.h"

namespace fleet {

/// What opens the console once.
struct ConsoleLink {
    std::string token;  ///< secret
    Moment expires{};
};

/// A link that works once makes a session. Only in memory, as fingerprints, and of no use to
/// anything but browsers: see Sessions for those who hold an operator's key. What the holder of the
/// key may see is not kept here, so that a revocation counts at once. Any thread.
class BrowserSessions {
public:
    static constexpr Moment kLinkLifetime = std::chrono::seconds(60);
    static constexpr Moment kLifetime = std::chrono::hours(8);
    /// Of one key; a further one ends the oldest of them.
    static constexpr std::size_t kMostLinksOfKey = 4;
    static constexpr std::size_t kMostOfKey = 8;

    /// A link in the name of that key. The caller has seen that it is certified: others cannot fill
    /// the list.
    ConsoleLink makeLink(const std::string& key, Moment now);

    /// Uses a link up: the token of the session that it has opened; nothing if there is no such
    /// link, or not any more.
    std::optional<std::string> open(std::string_view token, Moment now);

    /// The key in whose name the session was opened; nothing if there is none of this token.
    std::optional<std::string> keyOf(std::string_view token, Moment now) const;

private:
    struct Entry {
        std::string key;
        Moment expires{};
    };
    /// By fingerprints of their tokens, so that how long a look takes tells nothing.
    using Entries = std::map<std::string, Entry>;

    static std::string add(Entries& entries, const Entry& entry, std::size_t mostOfKey, Moment now);

    mutable std::mutex mutex_;
    Entries links_;
    Entries sessions_;
};

}  // namespace fleet
