#include "base/unit_set.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "support/units.h"

using ZAV::UnitSet;

namespace {

UnitSet setOf(const Units& units) {
    return UnitSet(units.data(), static_cast<std::uint32_t>(units.size()));
}

std::ptrdiff_t memberIn(const UnitSet& set, const Units& text) {
    return set.findMember(text.data(), text.data() + text.size()) - text.data();
}

std::ptrdiff_t otherIn(const UnitSet& set, const Units& text) {
    return set.findOther(text.data(), text.data() + text.size()) - text.data();
}

/// Sets of every size around the one up to which they are searched for in whole blocks, of narrow
/// and wide units.
const Units kSets[] = {
    {','},
    {0},
    {0xFFFF},
    {',', ' '},
    {',', 0x20AC},
    {255, 256, 0xFF00},
    {'a', 'b', 'c', 'd'},
    {'a', 'b', 'c', 'd', 'e'},
    {'a', 'a', 'a', 'a', 'a', 'a'},
    {0x100, 0x101, 0x102, 0x103, 0x104, 0x105},
};

TEST(UnitSet, HoldsItsUnitsAndNoOther) {
    for (const Units& units : kSets) {
        const UnitSet set = setOf(units);
        Units held;
        for (unsigned unit = 0; unit <= 0xFFFF; ++unit) {
            if (set.holds(static_cast<unsigned short>(unit))) {
                held.push_back(static_cast<unsigned short>(unit));
            }
        }
        Units expected(units);
        std::sort(expected.begin(), expected.end());
        expected.erase(std::unique(expected.begin(), expected.end()), expected.end());
        EXPECT_EQ(held, expected);
    }
}

TEST(UnitSet, FindsAMemberAtEveryPlaceOfTextsOfEveryLength) {
    for (const Units& units : kSets) {
        const UnitSet set = setOf(units);
        for (std::size_t length = 0; length <= 40; ++length) {
            const Units text(length, 'x');
            EXPECT_EQ(memberIn(set, text), static_cast<std::ptrdiff_t>(length));
            for (std::size_t at = 0; at < length; ++at) {
                for (const unsigned short unit : units) {
                    Units with(text);
                    with[at] = unit;
                    ASSERT_EQ(memberIn(set, with), static_cast<std::ptrdiff_t>(at)) << length;
                }
            }
        }
    }
}

TEST(UnitSet, FindsTheFirstOfSeveralMembers) {
    const UnitSet set = setOf({'a', 'b', 'c'});
    for (std::size_t at = 0; at < 20; ++at) {
        Units text(40, 'x');
        text[at] = 'b';
        std::fill(text.begin() + static_cast<std::ptrdiff_t>(at) + 1, text.end(), 'a');
        EXPECT_EQ(memberIn(set, text), static_cast<std::ptrdiff_t>(at));
    }
}

TEST(UnitSet, LooksNoFurtherThanTheEnd) {
    const UnitSet set = setOf({','});
    const Units text(40, ',');
    for (std::size_t length = 0; length < text.size(); ++length) {
        EXPECT_EQ(set.findOther(text.data(), text.data() + length), text.data() + length);
    }
    Units other(40, 'x');
    other[16] = ',';
    for (std::size_t length = 0; length <= 16; ++length) {
        EXPECT_EQ(set.findMember(other.data(), other.data() + length), other.data() + length);
    }
}

TEST(UnitSet, FindsTheFirstUnitThatIsNoMember) {
    const UnitSet set = setOf({',', 0x20AC});
    EXPECT_EQ(otherIn(set, {',', 0x20AC, ',', 'x', ','}), 3);
    EXPECT_EQ(otherIn(set, {'x', ','}), 0);
    EXPECT_EQ(otherIn(set, {0x20AD, ','}), 0);
    EXPECT_EQ(otherIn(set, {',', ','}), 2);
}

TEST(UnitSet, OfNoUnitsHoldsNothing) {
    const UnitSet set(nullptr, 0);
    EXPECT_FALSE(set.holds(0));
    EXPECT_EQ(memberIn(set, Units(20, 0)), 20);
    EXPECT_EQ(otherIn(set, Units(20, 0)), 0);
}

}  // namespace
