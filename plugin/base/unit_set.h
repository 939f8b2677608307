/// Sets of code units, for searching a text for any of several units.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

namespace ZAV {

/// A set of code units, prepared so that testing each unit of a text is cheap. Immutable, so any
/// number of threads may use one.
class UnitSet {
public:
    /// Copies `count` units from `units`, which may contain duplicates.
    UnitSet(const unsigned short* units, std::uint32_t count);

    bool holds(unsigned short unit) const {
        return unit < narrow_.size() ? narrow_[unit] : holdsWide(unit);
    }
    /// The first unit in [begin, end) that is in the set, or `end`.
    const unsigned short* findMember(const unsigned short* begin, const unsigned short* end) const;
    /// The first unit in [begin, end) that is not in the set, or `end`.
    const unsigned short* findOther(const unsigned short* begin, const unsigned short* end) const {
        while (begin != end && holds(*begin))
            ++begin;
        return begin;
    }

private:
    bool holdsWide(unsigned short unit) const;

    /// The number of units compared at once.
    static constexpr unsigned kBlock = 8;
    /// Sets of at most this many units are compared with whole blocks of the text.
    static constexpr std::uint32_t kFew = 4;

    std::array<bool, 256> narrow_{};    // whether a unit below 256 is in the set
    std::vector<unsigned short> wide_;  // the other units of the set
    bool few_;
    unsigned short blocks_[kFew][kBlock];  // for small sets: each unit, repeated
};

}  // namespace ZAV
