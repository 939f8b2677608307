/// Checks that work grows with its input and not with its square.
#pragma once

#include <algorithm>
#include <ctime>

/// Processor time of the calling thread, in seconds: what else the machine does is not counted.
inline double threadSeconds() {
    timespec time{};
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
}

/// How many times as long `work(8 * size)` takes as `work(size)`: about 8 when the work is in
/// proportion to its size, about 64 when it is quadratic. The shortest of five runs counts; the
/// work is done by the calling thread.
template <typename Work>
double growthOverEightfold(unsigned size, Work work) {
    const auto shortest = [&work](unsigned n) {
        double best = 1e9;
        for (int run = 0; run < 5; ++run) {
            const double start = threadSeconds();
            work(n);
            best = std::min(best, threadSeconds() - start);
        }
        return best;
    };
    return shortest(8 * size) / std::max(shortest(size), 1e-6);
}

/// What growthOverEightfold stays below unless the work is quadratic.
constexpr double kProportionate = 28;
