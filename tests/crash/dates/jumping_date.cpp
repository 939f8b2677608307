// A library that is loaded before all others. The date of the process jumps by up to a day,
// forwards and backwards, twenty times a second; clocks that only measure time are as they are.

#include <dlfcn.h>
#include <sys/time.h>
#include <time.h>

namespace {

constexpr long kDay = 24 * 60 * 60;
constexpr long kJumpsPerSecond = 20;
constexpr long kNanoseconds = 1'000'000'000;

template <typename Function>
Function next(const char* name) {
    return reinterpret_cast<Function>(::dlsym(RTLD_NEXT, name));
}

int realTime(clockid_t clock, timespec* time) {
    static const auto real = next<decltype(&clock_gettime)>("clock_gettime");
    return real(clock, time);
}

/// In seconds. The same for all threads at a moment.
long jump() {
    timespec now{};
    if (realTime(CLOCK_MONOTONIC, &now) != 0) return 0;
    auto number = static_cast<unsigned long>(now.tv_sec * kJumpsPerSecond +
                                             now.tv_nsec / (kNanoseconds / kJumpsPerSecond));
    // Spreads numbers that follow each other (a step of a linear generator, twice).
    for (int i = 0; i < 2; ++i)
        number = number * 2862933555777941757UL + 3037000493UL;
    return static_cast<long>((number >> 20U) % (2 * kDay)) - kDay;
}

}  // namespace

extern "C" {

int clock_gettime(clockid_t clock, timespec* time) noexcept {
    const int result = realTime(clock, time);
    if (result == 0 && (clock == CLOCK_REALTIME || clock == CLOCK_REALTIME_COARSE)) {
        time->tv_sec += jump();
    }
    return result;
}

int gettimeofday(timeval* time, void*) noexcept {
    timespec now{};
    const int result = ::clock_gettime(CLOCK_REALTIME, &now);
    *time = {now.tv_sec, now.tv_nsec / 1000};
    return result;
}

time_t time(time_t* result) noexcept {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    if (result != nullptr) *result = now.tv_sec;
    return now.tv_sec;
}

}  // extern "C"
