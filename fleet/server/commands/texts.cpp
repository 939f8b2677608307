#include "fleet/server/commands/texts.h"

#include <array>
#include <cstdlib>
#include <ctime>

#include "fleet/server/keys/files/keys_error.h"

namespace fleet {
namespace {

constexpr std::size_t kMostDigits = 6;
constexpr long long kMostDays = 36'500;

std::chrono::seconds unitOf(char letter) {
    switch (letter) {
        case 's':
            return std::chrono::seconds(1);
        case 'm':
            return std::chrono::minutes(1);
        case 'h':
            return std::chrono::hours(1);
        case 'd':
            return std::chrono::hours(24);
        default:
            return std::chrono::seconds(0);
    }
}

}  // namespace

std::chrono::milliseconds durationOf(const std::string& text) {
    const std::size_t digits = text.find_first_not_of("0123456789");
    const bool isForm = digits != std::string::npos && digits > 0 && digits <= kMostDigits &&
                        digits + 1 == text.size();
    const auto unit = isForm ? unitOf(text.back()) : std::chrono::seconds(0);
    if (unit.count() == 0) {
        throw KeysError("\"" + text + "\" is no time such as 90s, 10m, 1h or 30d");
    }
    return std::strtoll(text.c_str(), nullptr, 10) * unit;
}

std::chrono::milliseconds daysOf(long long days) {
    if (days < 1 || days > kMostDays) throw KeysError("these are no days from 1 to 36500");
    return std::chrono::hours(24) * days;
}

std::string textOfMoment(Moment moment) {
    const std::time_t seconds =
        static_cast<std::time_t>(std::chrono::duration_cast<std::chrono::seconds>(moment).count());
    std::tm parts{};
    ::gmtime_r(&seconds, &parts);
    std::array<char, 64> text{};
    std::strftime(text.data(), text.size(), "%Y-%m-%d %H:%M UTC", &parts);
    return text.data();
}

std::string joined(const std::vector<std::string>& texts) {
    std::string line;
    for (const std::string& text : texts)
        line += (line.empty() ? "" : ",") + text;
    return line.empty() ? "-" : line;
}

}  // namespace fleet
