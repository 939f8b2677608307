#include "text/calendar.h"

namespace text {
namespace {

// The calendar repeats itself every 400 years. Counted from a 1st of March, the day that a leap
// year has more is the last of its year.
constexpr std::int64_t kYearsOfEra = 400;
constexpr std::int64_t kDaysOfEra = 146'097;
/// From 0000-03-01 to 1970-01-01.
constexpr std::int64_t kDaysBefore1970 = 719'468;

/// Rounds down, also below 0.
std::int64_t eraOf(std::int64_t count, std::int64_t length) {
    return (count >= 0 ? count : count - length + 1) / length;
}

/// Days from the 1st of March to the 1st of the month that is `month` months later.
constexpr std::int64_t daysBefore(std::int64_t month) {
    return (153 * month + 2) / 5;
}

}  // namespace

std::int64_t daysOf(const Date& date) {
    const bool isBeforeMarch = date.month <= 2;
    const std::int64_t year = date.year - (isBeforeMarch ? 1 : 0);
    const std::int64_t month = date.month + (isBeforeMarch ? 9 : -3);
    const std::int64_t era = eraOf(year, kYearsOfEra);
    const std::int64_t yearOfEra = year - era * kYearsOfEra;
    const std::int64_t dayOfEra =
        yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + daysBefore(month) + date.day - 1;
    return era * kDaysOfEra + dayOfEra - kDaysBefore1970;
}

Date dateOf(std::int64_t days) {
    const std::int64_t count = days + kDaysBefore1970;
    const std::int64_t era = eraOf(count, kDaysOfEra);
    const std::int64_t dayOfEra = count - era * kDaysOfEra;
    // Without the leap days before it, the day tells the year: those of each 4 years, but for each
    // 100 years, and the last day of the era.
    const std::int64_t yearOfEra =
        (dayOfEra - dayOfEra / 1460 + dayOfEra / 36'524 - dayOfEra / 146'096) / 365;
    const std::int64_t dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    const std::int64_t month = (5 * dayOfYear + 2) / 153;
    Date date;
    date.day = static_cast<int>(dayOfYear - daysBefore(month) + 1);
    date.month = static_cast<int>(month < 10 ? month + 3 : month - 9);
    date.year = yearOfEra + era * kYearsOfEra + (date.month <= 2 ? 1 : 0);
    return date;
}

}  // namespace text
