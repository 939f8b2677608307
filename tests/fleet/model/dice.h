/// Chance that can be thrown again: the same seed, the same schedule.
#pragma once

#include <cstddef>
#include <cstdint>
#include <random>

namespace model {

class Dice {
public:
    explicit Dice(std::uint64_t seed) : engine_(seed) {}

    /// True in `percent` of a hundred throws; never while faults are off.
    bool fault(unsigned percent) { return faults && below(100) < percent; }
    bool chance(unsigned percent) { return below(100) < percent; }
    std::size_t below(std::size_t count) { return static_cast<std::size_t>(engine_() % count); }

    bool faults = true;

private:
    std::mt19937_64 engine_;
};

/// A program was killed in the middle of what it did.
struct Killed {};

}  // namespace model
