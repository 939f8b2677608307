// The plug-in as the soak loads it: all of the real one, but what it waits for is a hundredth as
// long, so that a run sees a hundred times as many tasks.

#include <cerrno>
#include <ctime>

extern "C" {

/// Called in the plug-in wherever it calls BSS1_Sleep.
[[gnu::visibility("hidden")]] void __wrap_BSS1_Sleep(
    unsigned seconds) {  // NOLINT: the linker's name
    constexpr long kNanosecondsPerSecond = 10'000'000;
    const long long length = static_cast<long long>(seconds) * kNanosecondsPerSecond;
    timespec left{static_cast<time_t>(length / 1'000'000'000),
                  static_cast<long>(length % 1'000'000'000)};
    while (::nanosleep(&left, &left) != 0 && errno == EINTR) {
    }
}

}  // extern "C"
