/// Sets of code units, for texts that are searched for any of several.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

namespace ZAV {

/// A set of code units. Takes time to make, so that a look at each unit of a text costs next to
/// nothing. Immutable, so any number of threads may use one.
class UnitSet {
public:
    /// Copies `count` units from `units`; some may be the same.
    UnitSet(const unsigned short* units, std::uint32_t count);

    bool holds(unsigned short unit) const {
        return unit < narrow_.size() ? narrow_[unit] : holdsWide(unit);
    }
    /// The first unit in [begin, end) that is in the set, else `end`.
    const unsigned short* findMember(const unsigned short* begin, const unsigned short* end) const;
    /// The first unit in [begin, end) that is not in the set, else `end`.
    const unsigned short* findOther(const unsigned short* begin, const unsigned short* end) const {
        while (begin != end && holds(*begin))
            ++begin;
        return begin;
    }

private:
    bool holdsWide(unsigned short unit) const;

    /// Units that are compared at once.
    static constexpr unsigned kBlock = 8;
    /// A set of at most this many is compared with whole blocks of the text.
    static constexpr std::uint32_t kFew = 4;

    std::array<bool, 256> narrow_{};    // whether a unit below 256 is in the set
    std::vector<unsigned short> wide_;  // the other units of the set
    bool few_;
    unsigned short blocks_[kFew][kBlock];  // if there are few: each unit of the set, repeated
};

}  // namespace ZAV
