/// How long something takes.
#pragma once

#include <algorithm>
#include <chrono>
#include <limits>

/// Starts when it is made.
class Stopwatch {
public:
    double seconds() const {
        return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
    }

private:
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
};

/// The seconds that the shortest of several runs takes: the one that other programs disturb least.
template <typename Work>
double shortestOf(int runs, Work work) {
    double shortest = std::numeric_limits<double>::max();
    for (int run = 0; run < runs; ++run) {
        const Stopwatch watch;
        work();
        shortest = std::min(shortest, watch.seconds());
    }
    return shortest;
}
