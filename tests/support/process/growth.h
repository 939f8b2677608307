/// Checks that work grows with its input and not with its square.
#pragma once

#include <sys/resource.h>

#include <algorithm>

/// The seconds of processor time that this process and its children that were waited for have used.
inline double processorSeconds() {
    double seconds = 0;
    for (const auto who : {RUSAGE_SELF, RUSAGE_CHILDREN}) {
        rusage use{};
        ::getrusage(who, &use);
        for (const timeval& time : {use.ru_utime, use.ru_stime}) {
            seconds += static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
        }
    }
    return seconds;
}

/// How many times as long `work(8 * size)` takes as `work(size)`: about 8 when the work is in
/// proportion to its size, about 64 when it is quadratic. The shortest of three runs counts, in
/// processor time, so that it matters little what else the machine does.
template <typename Work>
double growthOverEightfold(unsigned size, Work work) {
    const auto shortest = [&work](unsigned n) {
        double best = 1e9;
        for (int run = 0; run < 3; ++run) {
            const double start = processorSeconds();
            work(n);
            best = std::min(best, processorSeconds() - start);
        }
        return best;
    };
    return shortest(8 * size) / std::max(shortest(size), 1e-6);
}

/// What growthOverEightfold stays below unless the work is quadratic.
constexpr double kProportionate = 28;
