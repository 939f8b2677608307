#include "ctl/console/browser_session.h"

#include <time.h>

#include <algorithm>
#include <utility>
#include <vector>

#include "ctl/console/secret.h"

namespace console {
namespace {

constexpr std::chrono::hours kLifetime{12};
/// Of other consoles, whose secrets share the cookie.
constexpr std::size_t kMostOthers = 7;
constexpr char kBetweenSecrets = '.';

/// Calls `use` with each part of a text between separators.
template <typename Use>
void eachPart(std::string_view text, char separator, Use use) {
    while (true) {
        const std::size_t end = text.find(separator);
        use(text.substr(0, end));
        if (end == std::string_view::npos) return;
        text.remove_prefix(end + 1);
    }
}

std::string_view withoutBlanks(std::string_view text) {
    text.remove_prefix(std::min(text.find_first_not_of(" \t"), text.size()));
    return text.substr(0, text.find_last_not_of(" \t") + 1);
}

/// All secrets in the console's cookie.
std::vector<std::string_view> secretsIn(std::string_view cookies) {
    std::vector<std::string_view> secrets;
    eachPart(cookies, ';', [&](std::string_view cookie) {
        cookie = withoutBlanks(cookie);
        const std::size_t equals = cookie.find('=');
        if (equals == std::string_view::npos || cookie.substr(0, equals) != kCookieName) return;
        eachPart(cookie.substr(equals + 1), kBetweenSecrets, [&](std::string_view secret) {
            if (isSecretText(secret)) secrets.push_back(secret);
        });
    });
    return secrets;
}

}  // namespace

BrowserSession::BrowserSession(Clock clock)
    : clock_(std::move(clock)), token_(newSecret()), secret_(newSecret()), made_(clock_()) {}

std::optional<std::string> BrowserSession::open(std::string_view token, std::string_view cookies) {
    if (opened_ || isOver(made_) || !isSameSecret(token, token_)) return std::nullopt;
    opened_ = clock_();
    const std::vector<std::string_view> others = secretsIn(cookies);
    const std::size_t kept = std::min(others.size(), kMostOthers);
    std::string value;
    for (std::size_t i = others.size() - kept; i < others.size(); ++i)
        value += std::string(others[i]) + kBetweenSecrets;
    return value + secret_;
}

bool BrowserSession::isIn(std::string_view cookies) const {
    if (!opened_ || isOver(*opened_)) return false;
    const std::vector<std::string_view> secrets = secretsIn(cookies);
    return std::any_of(secrets.begin(), secrets.end(),
                       [this](std::string_view secret) { return isSameSecret(secret, secret_); });
}

std::chrono::seconds BrowserSession::timeSinceBoot() {
    timespec now{};
    ::clock_gettime(CLOCK_BOOTTIME, &now);
    return std::chrono::seconds(now.tv_sec);
}

bool BrowserSession::isOver(std::chrono::seconds begin) const {
    return clock_() - begin >= kLifetime;
}

}  // namespace console
