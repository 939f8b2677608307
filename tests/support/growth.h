/// Checks that work grows with its input and not with its square.
#pragma once

#include <algorithm>
#include <ctime>

/// How many times as long `work(8 * size)` takes as `work(size)`: about 8 when the work is in
/// proportion to its size, about 64 when it is quadratic. The shortest of three runs counts, in
/// processor time, so that it does not matter what else the machine does.
template <typename Work>
double growthOverEightfold(unsigned size, Work work) {
    const auto shortest = [&work](unsigned n) {
        double best = 1e9;
        for (int run = 0; run < 3; ++run) {
            const std::clock_t start = std::clock();
            work(n);
            const auto taken = static_cast<double>(std::clock() - start);
            best = std::min(best, taken / CLOCKS_PER_SEC);
        }
        return best;
    };
    return shortest(8 * size) / std::max(shortest(size), 1e-6);
}

/// What growthOverEightfold stays below unless the work is quadratic.
constexpr double kProportionate = 28;
