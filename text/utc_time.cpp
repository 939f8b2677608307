#include "text/utc_time.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>

#include "text/calendar.h"

namespace text {
namespace {

constexpr std::int64_t kMillisecondsOfDay = 24LL * 60 * 60 * 1000;

}  // namespace

std::string utcTime(std::chrono::milliseconds sinceEpoch) {
    const std::int64_t first = daysOf({0, 1, 1}) * kMillisecondsOfDay;
    const std::int64_t last = daysOf({10'000, 1, 1}) * kMillisecondsOfDay - 1;
    const std::int64_t count = std::clamp<std::int64_t>(sinceEpoch.count(), first, last);
    std::int64_t days = count / kMillisecondsOfDay;
    if (count % kMillisecondsOfDay < 0) --days;
    const Date date = dateOf(days);
    const int rest = static_cast<int>(count - days * kMillisecondsOfDay);
    char text[64];
    std::snprintf(text, sizeof text, "%04d-%02d-%02dT%02d:%02d:%02d.%03dZ",
                  static_cast<int>(date.year), date.month, date.day, rest / 3'600'000,
                  rest / 60'000 % 60, rest / 1000 % 60, rest % 1000);
    return text;
}

std::string utcTime(std::chrono::system_clock::time_point time) {
    return utcTime(std::chrono::floor<std::chrono::milliseconds>(time.time_since_epoch()));
}

}  // namespace text
