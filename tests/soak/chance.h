/// Reproducible choices.
#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <random>
#include <string>

namespace soak {

class Chance {
public:
    explicit Chance(std::uint64_t seed) : random_(seed) {}

    /// 0 to `limit` - 1; `limit` is above 0.
    std::size_t below(std::size_t limit) { return static_cast<std::size_t>(random_() % limit); }
    std::size_t between(std::size_t least, std::size_t most) {
        return least + below(most - least + 1);
    }
    bool oneIn(std::size_t count) { return below(count) == 0; }
    double seconds(double least, double most) {
        return least + (most - least) * static_cast<double>(below(1'000'000)) / 1e6;
    }
    std::string bytes(std::size_t length) {
        std::string made(length, '\0');
        for (char& byte : made)
            byte = static_cast<char>(random_() & 0xFFU);
        return made;
    }
    template <typename T>
    T of(std::initializer_list<T> choices) {
        return choices.begin()[below(choices.size())];
    }

private:
    std::mt19937_64 random_;
};

}  // namespace soak
