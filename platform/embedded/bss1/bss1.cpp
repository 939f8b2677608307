#include "platform/bss1.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <limits>
#include <new>
#include <string>

const char* BSS1_GetEnv(const char* name, const char* fallback) {
    const char* value = std::getenv(name);
    return value != nullptr ? value : fallback;
}

int BSS1_PutEnv(const char* setting) {
    const char* equals = setting != nullptr ? std::strchr(setting, '=') : nullptr;
    if (equals == nullptr || equals == setting) return EINVAL;
    try {
        const std::string name(setting, equals);
        return ::setenv(name.c_str(), equals + 1, 1) == 0 ? 0 : errno;
    } catch (const std::bad_alloc&) {
        return ENOMEM;
    }
}

void BSS1_Sleep(unsigned seconds) {
    timespec wakeUp{};
    ::clock_gettime(CLOCK_MONOTONIC, &wakeUp);
    // With 32-bit times, the sum may exceed the clock's range.
    constexpr time_t kLatest = std::numeric_limits<time_t>::max();
    const bool fits = seconds <= static_cast<unsigned long long>(kLatest - wakeUp.tv_sec);
    wakeUp.tv_sec = fits ? wakeUp.tv_sec + static_cast<time_t>(seconds) : kLatest;
    while (::clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &wakeUp, nullptr) == EINTR) {
    }
}
