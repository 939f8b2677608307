#include "ctl/show/time_text.h"

#include <algorithm>
#include <ctime>

#include "ctl/show/printable.h"

namespace ctl {
namespace {

std::tm localParts(WallTime time) {
    const std::time_t seconds = std::chrono::system_clock::to_time_t(time);
    std::tm parts{};
    ::localtime_r(&seconds, &parts);
    return parts;
}

std::string formatted(const std::tm& parts, const char* format) {
    char text[64];
    return std::string(text, std::strftime(text, sizeof text, format, &parts));
}

}  // namespace

std::optional<WallTime> parseTime(const std::string& text) {
    std::tm parts{};
    const char* const rest = ::strptime(text.c_str(), "%Y-%m-%dT%H:%M:%S", &parts);
    if (rest == nullptr || text.empty() || text.back() != 'Z') return std::nullopt;
    const std::string fraction(rest, text.c_str() + text.size() - 1);
    const bool isFraction =
        fraction.empty() || (fraction.size() > 1 && fraction[0] == '.' &&
                             fraction.find_first_not_of("0123456789", 1) == std::string::npos);
    if (!isFraction) return std::nullopt;
    // Where the clock's own numbers end; a host may say anything.
    constexpr int kFirstYear = 1700;
    constexpr int kLastYear = 2250;
    const int year = parts.tm_year + 1900;
    const std::time_t seconds = ::timegm(&parts);
    if (year < kFirstYear || year > kLastYear || seconds == -1) return std::nullopt;
    return std::chrono::system_clock::from_time_t(seconds);
}

std::string spanText(std::chrono::seconds span) {
    const long long seconds = std::max<long long>(span.count(), 0);
    if (seconds < 60) return std::to_string(seconds) + " s";
    if (seconds < 3600) return std::to_string(seconds / 60) + " min";
    if (seconds < 86400) return std::to_string(seconds / 3600) + " h";
    const long long days = seconds / 86400;
    return std::to_string(days) + (days == 1 ? " day" : " days");
}

std::string timeText(const std::string& text, WallTime now) {
    const std::optional<WallTime> time = parseTime(text);
    if (!time) return printable(text);
    const std::tm then = localParts(*time);
    const std::tm today = localParts(now);
    const bool isToday = then.tm_year == today.tm_year && then.tm_yday == today.tm_yday;
    return formatted(then, isToday ? "%H:%M:%S" : "%Y-%m-%d %H:%M:%S") + ", " +
           spanText(std::chrono::duration_cast<std::chrono::seconds>(now - *time)) + " ago";
}

}  // namespace ctl
