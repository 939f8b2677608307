#include "platform/bss1.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>

const char* BSS1_GetEnv(const char* name, const char* fallback) {
    const char* value = std::getenv(name);
    return value != nullptr ? value : fallback;
}

int BSS1_PutEnv(const char* setting) {
    const char* equals = setting != nullptr ? std::strchr(setting, '=') : nullptr;
    if (equals == nullptr || equals == setting) return EINVAL;
    const std::string name(setting, equals);
    return ::setenv(name.c_str(), equals + 1, 1) == 0 ? 0 : errno;
}

void BSS1_Sleep(unsigned seconds) {
    timespec wakeUp{};
    ::clock_gettime(CLOCK_MONOTONIC, &wakeUp);
    wakeUp.tv_sec += static_cast<time_t>(seconds);
    while (::clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &wakeUp, nullptr) == EINTR) {
    }
}
