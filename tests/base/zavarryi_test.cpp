#include "base/zavarryi.h"

#include <gtest/gtest.h>

#include <functional>
#include <numeric>

#include "base/zavstr.h"

using ZAV::Array;
using ZAV::CopyMem;
using ZAV::IndexOutOfBoundsException;
using ZAV::String;

namespace {

template <typename T>
std::vector<T> contents(const Array<T>& array) {
    return std::vector<T>(array.getData(), array.getData() + array.getSize());
}

using Longs = std::vector<long>;

Array<long> longs(const Longs& values) {
    Array<long> array;
    array.append(values.data(), static_cast<unsigned>(values.size()));
    return array;
}

TEST(Array, HasThreeFields) {
    struct Fields {
        void* data;
        std::uint32_t size, capacity;
    };
    static_assert(sizeof(Array<long>) == sizeof(Fields));
}

TEST(Array, IsEmptyWithRoomForEight) {
    const Array<String> array;
    EXPECT_EQ(array.getSize(), 0u);
    EXPECT_EQ(array.getCapacity(), 8u);
    EXPECT_EQ(array.getData()[7].length(), 0u);
}

TEST(Array, GrowsToExactlyWhatIsNeeded) {
    Array<long> array;
    for (long i = 0; i < 8; ++i)
        array.append(i);
    EXPECT_EQ(array.getCapacity(), 8u);
    array.append(8);
    EXPECT_EQ(array.getCapacity(), 9u);
    array.append(9);
    EXPECT_EQ(array.getCapacity(), 10u);
    EXPECT_EQ(contents(array), (Longs{0, 1, 2, 3, 4, 5, 6, 7, 8, 9}));
    const long more[] = {10, 11, 12};
    array.append(more, 3);
    EXPECT_EQ(array.getCapacity(), 13u);
}

TEST(Array, AppendTakesItsOwnElements) {
    Array<String> array;
    array.append("a text that needs a block of its own");
    while (array.getSize() < 8)
        array.append("x");
    array.append(array[0]);
    EXPECT_EQ(array[8], "a text that needs a block of its own");
    array.append(array.getData(), 9);
    EXPECT_EQ(array.getSize(), 18u);
    EXPECT_EQ(array[17], array[0]);
    EXPECT_EQ(array[9], "a text that needs a block of its own");
}

TEST(Array, AppendOfNothing) {
    Array<long> array = longs({1});
    array.append(nullptr, 0);
    EXPECT_EQ(contents(array), Longs({1}));
}

TEST(Array, Inserts) {
    Array<long> array = longs({1, 2, 3});
    array.insert(1, 9);
    EXPECT_EQ(contents(array), (Longs{1, 9, 2, 3}));
    array.insert(0, 7);
    EXPECT_EQ(contents(array), (Longs{7, 1, 9, 2, 3}));
    const long more[] = {4, 5, 6, 7, 8};
    array.insert(2, more, 5);
    EXPECT_EQ(contents(array), (Longs{7, 1, 4, 5, 6, 7, 8, 9, 2, 3}));
    EXPECT_EQ(array.getCapacity(), 10u);
    array.insert(3, more, 0);
    EXPECT_EQ(array.getSize(), 10u);
}

TEST(Array, InsertsAtTheEnd) {
    Array<long> array = longs({1, 2});
    array.insert(2, 3);
    EXPECT_EQ(contents(array), (Longs{1, 2, 3}));
}

TEST(Array, InsertTakesItsOwnElements) {
    Array<long> array = longs({1, 2, 3});
    array.insert(0, array.getData() + 1, 2);
    EXPECT_EQ(contents(array), (Longs{2, 3, 1, 2, 3}));
    array.insert(1, array[4]);
    EXPECT_EQ(contents(array), (Longs{2, 3, 3, 1, 2, 3}));
    array.insert(3, array.getData(), 6);
    EXPECT_EQ(contents(array), (Longs{2, 3, 3, 2, 3, 3, 1, 2, 3, 1, 2, 3}));
}

TEST(Array, Removes) {
    Array<long> array = longs({0, 1, 2, 3, 4, 5, 6, 7, 8, 9});
    array.remove(0);
    array.remove(8);
    array.remove(2, 4);
    EXPECT_EQ(contents(array), (Longs{1, 2, 7, 8}));
    EXPECT_EQ(array.getCapacity(), 10u);
    array.remove(4, 0);
    array.remove(0, 4);
    EXPECT_EQ(array.getSize(), 0u);
}

TEST(Array, GrowLeavesTheNewElementsAsTheyAre) {
    Array<long> array = longs({1, 2, 3});
    array.remove(0);
    array.grow(1);
    EXPECT_EQ(contents(array), (Longs{2, 3, 3}));
    Array<String> texts;
    texts.append("a");
    texts.append("b");
    texts.remove(0);
    texts.grow(1);
    EXPECT_EQ(contents(texts), (std::vector<String>{"b", "b"}));
}

TEST(Array, GrowReallocatesExactly) {
    Array<long> array;
    array.grow(8);
    EXPECT_EQ(array.getCapacity(), 8u);
    array.grow(1);
    EXPECT_EQ(array.getCapacity(), 9u);
    array.grow(5);
    EXPECT_EQ(array.getSize(), 14u);
    EXPECT_EQ(array.getCapacity(), 14u);
}

TEST(Array, ReservesExactlyAndNeverLess) {
    Array<long> array = longs({1, 2});
    array.reserveCapacity(20);
    EXPECT_EQ(array.getCapacity(), 20u);
    array.reserveCapacity(5);
    EXPECT_EQ(array.getCapacity(), 20u);
    EXPECT_EQ(contents(array), (Longs{1, 2}));
}

TEST(Array, ClearGoesBackToTheStart) {
    Array<long> array = longs(Longs(30, 1));
    array.clear();
    EXPECT_EQ(array.getSize(), 0u);
    EXPECT_EQ(array.getCapacity(), 8u);
}

TEST(Array, ShiftsOverlappingRanges) {
    Array<long> array = longs({0, 1, 2, 3, 4, 5, 6, 7});
    array.shift(2, 0, 5);
    EXPECT_EQ(contents(array), (Longs{0, 1, 0, 1, 2, 3, 4, 7}));
    array.shift(0, 2, 5);
    EXPECT_EQ(contents(array), (Longs{0, 1, 2, 3, 4, 3, 4, 7}));
    array.shift(3, 3, 5);
    array.shift(0, 7, 0);
    EXPECT_EQ(contents(array), (Longs{0, 1, 2, 3, 4, 3, 4, 7}));
}

TEST(Array, CopiesWithItsCapacity) {
    Array<String> original;
    original.append("a");
    original.reserveCapacity(30);
    Array<String> copy(original);
    EXPECT_EQ(copy.getCapacity(), 30u);
    copy[0].append('b');
    EXPECT_EQ(original[0], "a");
    Array<String> assigned;
    assigned.append("old");
    assigned = copy;
    EXPECT_EQ(assigned.getCapacity(), 30u);
    EXPECT_EQ(contents(assigned), std::vector<String>{"ab"});
    Array<String> initialized;
    initialized.init(copy);
    EXPECT_EQ(contents(initialized), std::vector<String>{"ab"});
}

TEST(Array, AssignmentToItselfChangesNothing) {
    Array<long> array = longs({1, 2});
    const long* const block = array.getData();
    const Array<long>& same = array;
    array = same;
    EXPECT_EQ(array.getData(), block);
    EXPECT_EQ(contents(array), (Longs{1, 2}));
}

TEST(Array, MovesLeaveAUsableArray) {
    Array<String> from;
    from.append("a");
    Array<String> to(std::move(from));
    EXPECT_EQ(contents(to), std::vector<String>{"a"});
    EXPECT_EQ(from.getSize(), 0u);  // NOLINT(bugprone-use-after-move): what is left is the subject
    Array<String> copyOfEmpty(from);
    EXPECT_EQ(copyOfEmpty.getSize(), 0u);
    from.append("b");
    from.append("c");
    to = std::move(from);
    EXPECT_EQ(contents(to), (std::vector<String>{"b", "c"}));
    to.clear();
    EXPECT_EQ(to.getCapacity(), 8u);
}

TEST(Array, HoldsPointers) {
    int a = 0, b = 0;
    Array<int*> array;
    array.append(&a);
    array.append(&b);
    EXPECT_EQ(array[1], &b);
    array.remove(0);
    EXPECT_EQ(array[0], &b);
}

/// Copies so often, then fails.
struct Fragile {
    static int copiesLeft;
    int value = 0;
    Fragile() = default;
    explicit Fragile(int v) : value(v) {}
    Fragile(const Fragile&) = default;
    Fragile& operator=(const Fragile& other) {
        if (copiesLeft-- <= 0) throw std::runtime_error("no more copies");
        value = other.value;
        return *this;
    }
};
int Fragile::copiesLeft = 0;

TEST(Array, AFailingCopyLeavesItAsItWas) {
    Fragile::copiesLeft = 1000;
    Array<Fragile> array;
    for (int i = 0; i < 8; ++i)
        array.append(Fragile(i));
    const Fragile* const block = array.getData();
    Fragile::copiesLeft = 4;
    EXPECT_THROW(array.append(Fragile(9)), std::runtime_error);
    Fragile::copiesLeft = 4;
    EXPECT_THROW(array.reserveCapacity(20), std::runtime_error);
    Fragile::copiesLeft = 4;
    EXPECT_THROW((Array<Fragile>(array)), std::runtime_error);
    Array<Fragile> other;
    Fragile::copiesLeft = 4;
    EXPECT_THROW(other = array, std::runtime_error);
    EXPECT_EQ(other.getSize(), 0u);
    EXPECT_EQ(other.getCapacity(), 8u);
    EXPECT_EQ(array.getSize(), 8u);
    EXPECT_EQ(array.getData(), block);
    for (int i = 0; i < 8; ++i)
        EXPECT_EQ(array[static_cast<unsigned>(i)].value, i);
}

TEST(Array, CopyMemAssignsOneByOne) {
    const String from[] = {"a", "b", "c"};
    String to[3];
    CopyMem(to, from, 2);
    EXPECT_EQ(to[0], "a");
    EXPECT_EQ(to[1], "b");
    EXPECT_EQ(to[2], "");
}

/// Each of these must say so, throw and leave the array {1, 2} alone.
struct BadCall {
    const char* name;
    std::function<void(Array<long>&)> call;
};

const long kValues[] = {5, 6};
constexpr std::uint32_t kHuge = 0xFFFFFFFFu;

const BadCall kBadCalls[] = {
    {"subscript", [](Array<long>& a) { a[2] = 1; }},
    {"subscriptHuge", [](Array<long>& a) { a[kHuge] = 1; }},
    {"subscriptConst", [](Array<long>& a) { static_cast<const Array<long>&>(a)[2]; }},
    {"insertBehindTheEnd", [](Array<long>& a) { a.insert(3, 9); }},
    {"insertFarAway", [](Array<long>& a) { a.insert(kHuge, kValues, 2); }},
    {"removeBehindTheEnd", [](Array<long>& a) { a.remove(2, 1); }},
    {"removeOneBehindTheEnd", [](Array<long>& a) { a.remove(2); }},
    {"removeTooMany", [](Array<long>& a) { a.remove(1, 2); }},
    {"removeWrapping", [](Array<long>& a) { a.remove(1, kHuge); }},
    {"removeFarAway", [](Array<long>& a) { a.remove(kHuge, 1); }},
    {"removeNothingFarAway", [](Array<long>& a) { a.remove(3, 0); }},
    {"shiftOutOfTheBlock", [](Array<long>& a) { a.shift(7, 0, 2); }},
    {"shiftFromOutside", [](Array<long>& a) { a.shift(0, kHuge, 2); }},
};

class ArrayBounds : public testing::TestWithParam<BadCall> {};

TEST_P(ArrayBounds, ArePrintedAndThrown) {
    Array<long> array = longs({1, 2});
    std::string message;
    testing::internal::CaptureStdout();
    try {
        GetParam().call(array);
    } catch (const IndexOutOfBoundsException& thrown) {
        message = thrown.getErrorMessage();
    }
    const std::string printed = testing::internal::GetCapturedStdout();
    int line = 0;
    ASSERT_EQ(std::sscanf(message.c_str(), "line: %d, file: zavarryi", &line), 1) << message;
    EXPECT_GT(line, 0);
    EXPECT_EQ(message, "line: " + std::to_string(line) + ", file: zavarryi");
    EXPECT_EQ(printed, "IndexOutOfBoundsException zavarryi:" + std::to_string(line) + "\n");
    EXPECT_EQ(contents(array), (Longs{1, 2}));
    EXPECT_EQ(array.getCapacity(), 8u);
}

INSTANTIATE_TEST_SUITE_P(All, ArrayBounds, testing::ValuesIn(kBadCalls),
                         [](const auto& bad) { return std::string(bad.param.name); });

TEST(Array, SizesThatWouldWrapAreRefused) {
    Array<long> array = longs({1, 2});
    EXPECT_THROW(array.append(kValues, kHuge), std::length_error);
    EXPECT_THROW(array.insert(0, kValues, kHuge - 1), std::length_error);
    EXPECT_THROW(array.grow(kHuge), std::length_error);
    EXPECT_EQ(contents(array), (Longs{1, 2}));
}

}  // namespace
