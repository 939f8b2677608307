#include "text/utc_time.h"

#include <cstdio>
#include <ctime>

namespace text {

std::string utcTime(std::chrono::system_clock::time_point time) {
    using std::chrono::milliseconds;
    const auto count = std::chrono::floor<milliseconds>(time.time_since_epoch()).count();
    const std::time_t seconds = static_cast<std::time_t>(count / 1000);
    std::tm parts{};
    ::gmtime_r(&seconds, &parts);
    char date[32];
    std::strftime(date, sizeof date, "%Y-%m-%dT%H:%M:%S", &parts);
    char text[48];
    std::snprintf(text, sizeof text, "%s.%03dZ", date, static_cast<int>(count % 1000));
    return text;
}

}  // namespace text
