#include "host/api/time_text.h"

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <optional>

#include "host/api/schema.h"
#include "routes/bad_request.h"
#include "text/calendar.h"

namespace host {

Schema timeSchema;

namespace {

constexpr std::size_t kWhole = 19;  // up to the seconds

bool isDigit(char letter) {
    return letter >= '0' && letter <= '9';
}

bool hasForm(const std::string& text, const char* form) {
    for (std::size_t i = 0; form[i] != '\0'; ++i) {
        if (form[i] == '0' ? !isDigit(text[i]) : text[i] != form[i]) return false;
    }
    return true;
}

/// The fraction in text after the seconds, which ends with "Z".
std::optional<std::chrono::microseconds> fractionOf(const std::string& text) {
    if (text.back() != 'Z') return std::nullopt;
    const std::string part = text.substr(kWhole, text.size() - kWhole - 1);
    if (part.empty()) return std::chrono::microseconds{0};
    if (part.front() != '.' || part.size() < 2 || part.size() > 10) return std::nullopt;
    long long count = 0;
    for (std::size_t i = 1; i <= 6; ++i)
        count = count * 10 + (i < part.size() && isDigit(part[i]) ? part[i] - '0' : 0);
    for (std::size_t i = 1; i < part.size(); ++i) {
        if (!isDigit(part[i])) return std::nullopt;
    }
    return std::chrono::microseconds{count};
}

/// The clock counts so finely that it holds only some centuries.
WallClock::time_point nearestTime(std::chrono::microseconds sinceEpoch) {
    using Clock = WallClock::duration;
    constexpr auto least = std::chrono::duration_cast<std::chrono::microseconds>(Clock::min());
    constexpr auto most = std::chrono::duration_cast<std::chrono::microseconds>(Clock::max());
    return WallClock::time_point(
        std::chrono::duration_cast<Clock>(std::clamp(sinceEpoch, least, most)));
}

}  // namespace

WallClock::time_point timeOf(const std::string& text) {
    const routes::BadRequest bad("\"" + text + "\" is no time in UTC like 2025-01-31T12:00:00Z");
    if (text.size() <= kWhole || !hasForm(text, "0000-00-00T00:00:00")) throw bad;
    const auto fraction = fractionOf(text);
    if (!fraction) throw bad;
    const auto number = [&text](std::size_t at, std::size_t length) {
        return std::stoi(text.substr(at, length));
    };
    const text::Date date{number(0, 4), number(5, 2), number(8, 2)};
    const int hour = number(11, 2);
    const int minute = number(14, 2);
    const int second = number(17, 2);
    const bool isInYear = date.month >= 1 && date.month <= 12 && date.day >= 1;
    if (!isInYear || hour > 23 || minute > 59 || second > 59) throw bad;
    const std::int64_t days = text::daysOf(date);
    // A day that the month does not have becomes one of the next month.
    if (text::dateOf(days).month != date.month) throw bad;
    return nearestTime(std::chrono::seconds(((days * 24 + hour) * 60 + minute) * 60 + second) +
                       *fraction);
}

nlohmann::ordered_json timeSchema(Components&) {
    return {{"title", "Time"},
            {"type", "string"},
            {"format", "date-time"},
            {"description", "A time in UTC, as RFC 3339 writes it, with Z at its end."}};
}

}  // namespace host
