/// Days of the Gregorian calendar, also of the years before it began. In 64 bits, whatever the
/// width of the system's own times is.
#pragma once

#include <cstdint>

namespace text {

struct Date {
    std::int64_t year = 1970;
    int month = 1;  ///< from 1
    int day = 1;    ///< from 1
};

/// How many days the date is after 1970-01-01. A day that its month does not have is one of the
/// next month; the month must be from 1 to 12.
std::int64_t daysOf(const Date& date);

/// The date that many days after 1970-01-01, or before it.
Date dateOf(std::int64_t days);

}  // namespace text
