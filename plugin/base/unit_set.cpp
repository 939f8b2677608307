#include "base/unit_set.h"

#include <algorithm>
#include <cstddef>
#include <cstring>

namespace ZAV {
namespace {

using Block = unsigned short __attribute__((vector_size(16)));

// By reference: how a block is returned depends on the processor that is compiled for.
void load(const unsigned short* units, Block& block) {
    std::memcpy(&block, units, sizeof block);
}

/// The index of the first unit, in memory order, whose bits are set in a word of four units. The
/// word must not be 0.
unsigned firstSet(std::uint64_t word) {
    constexpr unsigned kUnitBits = 16;
#if __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__
    return static_cast<unsigned>(__builtin_ctzll(word)) / kUnitBits;
#else
    return static_cast<unsigned>(__builtin_clzll(word)) / kUnitBits;
#endif
}

}  // namespace

UnitSet::UnitSet(const unsigned short* units, std::uint32_t count)
    : few_(count > 0 && count <= kFew) {
    for (std::uint32_t i = 0; i < count; ++i) {
        if (units[i] < narrow_.size()) {
            narrow_[units[i]] = true;
        } else {
            wide_.push_back(units[i]);
        }
    }
    if (!few_) return;
    for (std::uint32_t i = 0; i < kFew; ++i) {
        std::fill_n(blocks_[i], kBlock, units[std::min(i, count - 1)]);
    }
}

bool UnitSet::holdsWide(unsigned short unit) const {
    return std::find(wide_.begin(), wide_.end(), unit) != wide_.end();
}

const unsigned short* UnitSet::findMember(const unsigned short* begin,
                                          const unsigned short* end) const {
    if (few_) {
        Block first, second, third, fourth;
        load(blocks_[0], first);
        load(blocks_[1], second);
        load(blocks_[2], third);
        load(blocks_[3], fourth);
        for (; end - begin >= std::ptrdiff_t{kBlock}; begin += kBlock) {
            Block block;
            load(begin, block);
            const auto found =
                (block == first) | (block == second) | (block == third) | (block == fourth);
            std::uint64_t words[2];
            static_assert(sizeof words == sizeof found);
            std::memcpy(words, &found, sizeof words);
            if (words[0] != 0) return begin + firstSet(words[0]);
            if (words[1] != 0) return begin + kBlock / 2 + firstSet(words[1]);
        }
    }
    while (begin != end && !holds(*begin))
        ++begin;
    return begin;
}

}  // namespace ZAV
