#include "host/api/time_text.h"

#include <chrono>
#include <ctime>
#include <optional>

#include "host/api/schema.h"
#include "routes/bad_request.h"

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

}  // namespace

WallClock::time_point timeOf(const std::string& text) {
    const routes::BadRequest bad("\"" + text + "\" is no time in UTC like 2025-01-31T12:00:00Z");
    if (text.size() <= kWhole || !hasForm(text, "0000-00-00T00:00:00")) throw bad;
    const auto fraction = fractionOf(text);
    if (!fraction) throw bad;
    const auto number = [&text](std::size_t at, std::size_t length) {
        return std::stoi(text.substr(at, length));
    };
    std::tm parts{};
    parts.tm_year = number(0, 4) - 1900;
    parts.tm_mon = number(5, 2) - 1;
    parts.tm_mday = number(8, 2);
    parts.tm_hour = number(11, 2);
    parts.tm_min = number(14, 2);
    parts.tm_sec = number(17, 2);
    std::tm same = parts;
    const std::time_t seconds = ::timegm(&same);
    // A day that the month does not have becomes one of the next month.
    if (same.tm_mon != parts.tm_mon || same.tm_mday != parts.tm_mday ||
        same.tm_hour != parts.tm_hour || same.tm_min != parts.tm_min ||
        same.tm_sec != parts.tm_sec) {
        throw bad;
    }
    return WallClock::from_time_t(seconds) + *fraction;
}

nlohmann::ordered_json timeSchema(Components&) {
    return {{"title", "Time"},
            {"type", "string"},
            {"format", "date-time"},
            {"description", "A time in UTC, as RFC 3339 writes it, with Z at its end."}};
}

}  // namespace host
