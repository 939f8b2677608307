/// The one browser that the console talks to.
#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace console {

/// The name of the cookie.
inline constexpr std::string_view kCookieName = "zav_console";

/// A link that works once makes a session, which a cookie carries. Both end after twelve hours. One
/// thread at a time.
class BrowserSession {
public:
    /// The time since some moment; it goes on while the machine sleeps.
    using Clock = std::function<std::chrono::seconds()>;

    /// Throws std::runtime_error, see newSecret().
    explicit BrowserSession(Clock clock = timeSinceBoot);

    /// What the link holds.
    const std::string& token() const { return token_; }

    /// Takes the token of a link: what the cookie is to hold from now on, or nothing if the token
    /// is wrong, used or too old. `cookies` is what the browser sends now: cookies know no ports,
    /// so that other consoles on this machine have theirs under the same name, and keep them.
    std::optional<std::string> open(std::string_view token, std::string_view cookies);

    /// Whether a field Cookie has the session's.
    bool isIn(std::string_view cookies) const;

    static std::chrono::seconds timeSinceBoot();

private:
    bool isOver(std::chrono::seconds begin) const;

    const Clock clock_;
    const std::string token_;
    const std::string secret_;
    const std::chrono::seconds made_;
    std::optional<std::chrono::seconds> opened_;
};

}  // namespace console
