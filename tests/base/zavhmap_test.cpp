#include "base/zavhmap.h"

#include <gtest/gtest.h>

#include "support/units.h"

using ZAV::Array;
using ZAV::String;
using ZAV::StrPtrMap;
using ZAV::StrStrMap;

namespace {

std::vector<std::string> keysOf(const Array<String>& keys) {
    std::vector<std::string> found;
    for (unsigned i = 0; i < keys.getSize(); ++i)
        found.push_back(narrow(keys[i]));
    return found;
}

template <typename Map>
std::vector<std::string> keysOf(const Map& map) {
    return keysOf(map.getKeys());
}

using Keys = std::vector<std::string>;

String key(int number) {
    return String(("key" + std::to_string(number)).c_str());
}

TEST(HashCode, IsOver33ModuloTheLargestInt) {
    EXPECT_EQ(StrStrMap::hashCode(""), 0u);
    EXPECT_EQ(StrStrMap::hashCode("a"), 97u);
    EXPECT_EQ(StrStrMap::hashCode("ab"), 3299u);
    EXPECT_EQ(StrPtrMap::hashCode("ab"), 3299u);
    EXPECT_EQ(StrStrMap::hashCode(fromUnits({0x20AC})), 0x20ACu);
}

TEST(HashCode, WrapsIn32Bits) {
    // One unit after another, worked out apart.
    const char* const text = "a longer key whose code has wrapped several times";
    std::uint64_t expected = 0;
    for (const char* c = text; *c != '\0'; ++c) {
        expected = (expected * 33 + static_cast<unsigned char>(*c)) % 4294967296u;
    }
    EXPECT_EQ(StrStrMap::hashCode(text), expected % 2147483647u);
    EXPECT_LT(StrStrMap::hashCode(text), 2147483647u);
}

TEST(HashCode, StopsAtAZero) {
    EXPECT_EQ(StrStrMap::hashCode(fromUnits({'a', 0, 'b'})), 97u);
}

template <typename Map>
class EveryMap : public testing::Test {
protected:
    void put(Map& map, const String& name) {
        if constexpr (std::is_same_v<Map, StrStrMap>) {
            map.put(name, name);
        } else {
            map.put(name, &value_);
        }
    }
    int value_ = 0;
};

using MapTypes = testing::Types<StrStrMap, StrPtrMap>;
TYPED_TEST_SUITE(EveryMap, MapTypes);

TYPED_TEST(EveryMap, StartsWithoutATable) {
    TypeParam map;
    EXPECT_EQ(map.getSize(), 0u);
    EXPECT_EQ(map.getCapacity(), 11u);
    EXPECT_EQ(map.getThreshold(), 8u);
    EXPECT_EQ(keysOf(map), Keys());
    map.remove("x");
    map.removeAll();
    EXPECT_FALSE(map.hasTable());
    EXPECT_EQ(map.getSize(), 0u);
}

TYPED_TEST(EveryMap, RehashesBeforeTheNinthKey) {
    TypeParam map;
    for (int i = 0; i < 8; ++i)
        this->put(map, key(i));
    EXPECT_EQ(map.getCapacity(), 11u);
    this->put(map, key(0));
    EXPECT_EQ(map.getCapacity(), 11u) << "an old key needs no room";
    this->put(map, key(8));
    EXPECT_EQ(map.getCapacity(), 23u);
    EXPECT_EQ(map.getSize(), 9u);
}

TYPED_TEST(EveryMap, GrowsInTheGivenSteps) {
    TypeParam map;
    struct Step {
        std::uint32_t size, capacity, threshold;
    };
    const Step steps[] = {{8, 11, 8}, {17, 23, 17}, {35, 47, 35}, {71, 95, 71}, {143, 191, 143}};
    int next = 0;
    for (const Step& step : steps) {
        while (map.getSize() < step.size)
            this->put(map, key(next++));
        EXPECT_EQ(map.getCapacity(), step.capacity);
        EXPECT_EQ(map.getThreshold(), step.threshold);
    }
    EXPECT_EQ(map.getKeys().getSize(), 143u);
}

TYPED_TEST(EveryMap, ListsKeysByBucketAndNewestFirst) {
    TypeParam map;
    // 'a' is 97: buckets of 11 are 97 -> 9, 98 -> 10, 99 -> 0, 108 -> 9, 119 -> 9.
    for (const char* name : {"a", "b", "c", "l", "w"})
        this->put(map, name);
    EXPECT_EQ(keysOf(map), (Keys{"c", "w", "l", "a", "b"}));
}

TYPED_TEST(EveryMap, MovesChainsFromTheirHeadOnWhenItRehashes) {
    TypeParam map;
    // Of 23 buckets, 'n' (110), 'W' (87) and '@' (64) share number 18; of 11, they have 0, 10, 9.
    for (const char* name : {"n", "W", "@", "1", "2", "3", "4", "5"})
        this->put(map, name);
    // By bucket of 11: n 0, 3 (51) 7, 4 (52) 8, 5 (53) 9, @ 9, 1 (49) 5, 2 (50) 6, W 10.
    EXPECT_EQ(keysOf(map), (Keys{"n", "1", "2", "3", "4", "5", "@", "W"}));
    this->put(map, "6");
    // The last old bucket went first, so that of the lowest ends at the head. By bucket of 23:
    // 1 3, 2 4, 3 5, 4 6, 5 7, 6 8, and 18.
    EXPECT_EQ(keysOf(map), (Keys{"1", "2", "3", "4", "5", "6", "n", "@", "W"}));
}

TYPED_TEST(EveryMap, ReversesEntriesOfOneBucketWhenItRehashes) {
    TypeParam map;
    // 253 * k apart, keys share a bucket of 11 and one of 23.
    const String low = fromUnits({100}), middle = fromUnits({353}), high = fromUnits({606});
    for (const String& name : {low, middle, high})
        this->put(map, name);
    const auto order = [&map, &low, &middle, &high] {
        std::string found;
        const Array<String> keys = map.getKeys();
        for (unsigned i = 0; i < keys.getSize(); ++i) {
            if (keys[i] == low) found += 'l';
            if (keys[i] == middle) found += 'm';
            if (keys[i] == high) found += 'h';
        }
        return found;
    };
    EXPECT_EQ(order(), "hml");
    for (const char* name : {"1", "2", "3", "4", "5", "6"})
        this->put(map, name);
    ASSERT_EQ(map.getCapacity(), 23u);
    EXPECT_EQ(order(), "lmh");
    const TypeParam copy(map);
    EXPECT_EQ(copy.getCapacity(), 23u);
    EXPECT_EQ(copy.getThreshold(), 17u);
    EXPECT_EQ(copy.getSize(), 9u);
    map.remove(middle);
    EXPECT_EQ(order(), "lh");
    map.remove(low);
    EXPECT_EQ(order(), "h");
}

TYPED_TEST(EveryMap, CopiesPutEntriesInOrder) {
    TypeParam map;
    for (const char* name : {"a", "b", "c", "l", "w"})
        this->put(map, name);
    const TypeParam copy(map);
    EXPECT_EQ(keysOf(copy), (Keys{"c", "a", "l", "w", "b"}));
    EXPECT_EQ(copy.getSize(), 5u);
    const TypeParam empty{TypeParam()};
    EXPECT_FALSE(empty.hasTable());
}

TYPED_TEST(EveryMap, RemovesFromEveryPlaceOfAChain) {
    for (const char* name : {"a", "l", "w"}) {
        TypeParam map;
        for (const char* each : {"a", "l", "w"})
            this->put(map, each);
        map.remove(name);
        Keys expected{"w", "l", "a"};
        expected.erase(std::find(expected.begin(), expected.end(), name));
        EXPECT_EQ(keysOf(map), expected);
        EXPECT_EQ(map.getSize(), 2u);
        map.remove(name);
        EXPECT_EQ(map.getSize(), 2u);
    }
}

TYPED_TEST(EveryMap, RemoveAllKeepsTheSizes) {
    TypeParam map;
    for (int i = 0; i < 9; ++i)
        this->put(map, key(i));
    map.removeAll();
    EXPECT_EQ(map.getSize(), 0u);
    EXPECT_EQ(map.getCapacity(), 23u);
    EXPECT_EQ(map.getThreshold(), 17u);
    EXPECT_FALSE(map.hasTable());
    this->put(map, "again");
    EXPECT_EQ(keysOf(map), Keys{"again"});
}

TYPED_TEST(EveryMap, ARemovedKeyMayBeTheEntrysOwn) {
    TypeParam map;
    for (int i = 0; i < 20; ++i)
        this->put(map, key(i));
    const Array<String> keys = map.getKeys();
    for (unsigned i = 0; i < keys.getSize(); ++i)
        map.remove(keys[i]);
    EXPECT_EQ(map.getSize(), 0u);
}

TEST(StrStrMap, GetsWhatWasPut) {
    StrStrMap map;
    String value("untouched");
    EXPECT_FALSE(map.get("a", value));
    EXPECT_FALSE(map.hasTable());
    map.put("a", "1");
    map.put("b", "2");
    map.put("a", "3");
    EXPECT_EQ(map.getSize(), 2u);
    EXPECT_TRUE(map.get("a", value));
    EXPECT_EQ(value, "3");
    EXPECT_TRUE(map.get("b", value));
    EXPECT_EQ(value, "2");
    EXPECT_FALSE(map.get("A", value));
    EXPECT_EQ(value, "2");
}

TEST(StrStrMap, TellsKeysOfOneHashCodeApart) {
    // 98 * 33 + 66 and 97 * 33 + 99 are the same.
    StrStrMap map;
    map.put("bB", "1");
    map.put("ac", "2");
    ASSERT_EQ(StrStrMap::hashCode("bB"), StrStrMap::hashCode("ac"));
    String value;
    EXPECT_TRUE(map.get("bB", value));
    EXPECT_EQ(value, "1");
    EXPECT_TRUE(map.get("ac", value));
    EXPECT_EQ(value, "2");
    map.remove("bB");
    EXPECT_FALSE(map.get("bB", value));
    EXPECT_TRUE(map.get("ac", value));
}

TEST(StrStrMap, CopiesAreIndependent) {
    StrStrMap map;
    map.put("a", "1");
    StrStrMap copy(map);
    copy.put("a", "2");
    map.remove("a");
    String value;
    EXPECT_TRUE(copy.get("a", value));
    EXPECT_EQ(value, "2");
}

int freed = 0;

void freeCounted(void* value) {
    ++freed;
    delete static_cast<int*>(value);
}

void* freeFunction() {
    return reinterpret_cast<void*>(&freeCounted);
}

class StrPtrMapOwnership : public testing::Test {
protected:
    void SetUp() override { freed = 0; }
    static void fill(StrPtrMap& map) {
        map.put("a", new int(1));
        map.put("b", new int(2));
        map.put("none", nullptr);
    }
};

TEST_F(StrPtrMapOwnership, GetStoresThePointer) {
    int value = 0;
    StrPtrMap map;
    void* found = this;
    EXPECT_FALSE(map.get("a", &found));
    EXPECT_FALSE(map.hasTable());
    map.put("a", &value);
    EXPECT_FALSE(map.get("b", &found));
    EXPECT_EQ(found, this);
    EXPECT_TRUE(map.get("a", &found));
    EXPECT_EQ(found, &value);
    map.put("null", nullptr);
    EXPECT_TRUE(map.get("null", &found));
    EXPECT_EQ(found, nullptr);
}

TEST_F(StrPtrMapOwnership, IsOffByDefault) {
    int value = 0;
    {
        StrPtrMap map;
        map.setFreeValueFunc(freeFunction());
        map.put("a", &value);
        map.put("a", &value);
        map.remove("a");
        map.put("b", &value);
    }
    EXPECT_EQ(freed, 0);
}

TEST_F(StrPtrMapOwnership, FreesWhateverIsDiscarded) {
    StrPtrMap map;
    map.setAutoDeleteValues(true);
    map.setFreeValueFunc(freeFunction());
    fill(map);
    map.put("a", new int(3));
    EXPECT_EQ(freed, 1);
    map.put("none", nullptr);
    EXPECT_EQ(freed, 1) << "null is never freed";
    map.remove("b");
    EXPECT_EQ(freed, 2);
    map.remove("b");
    map.remove("none");
    EXPECT_EQ(freed, 2);
    map.removeAll();
    EXPECT_EQ(freed, 3);
}

TEST_F(StrPtrMapOwnership, FreesOnDestruction) {
    {
        StrPtrMap map;
        map.setAutoDeleteValues(true);
        map.setFreeValueFunc(freeFunction());
        fill(map);
    }
    EXPECT_EQ(freed, 2);
}

TEST_F(StrPtrMapOwnership, DeletesWithoutAFunction) {
    // The address sanitizer sees a leak or a mismatch.
    StrPtrMap map;
    map.setAutoDeleteValues(true);
    fill(map);
    map.put("a", new int(3));
    map.remove("b");
}

TEST_F(StrPtrMapOwnership, FreesTheOldPointerEvenWhenItIsTheNewOne) {
    static int value = 0;
    StrPtrMap map;
    map.setAutoDeleteValues(true);
    map.setFreeValueFunc(reinterpret_cast<void*>(+[](void*) { ++freed; }));
    map.put("a", &value);
    map.put("a", &value);
    EXPECT_EQ(freed, 1);
    EXPECT_EQ(map.getSize(), 1u);
}

TEST_F(StrPtrMapOwnership, CopiesShareWithoutOwning) {
    StrPtrMap map;
    map.setAutoDeleteValues(true);
    map.setFreeValueFunc(freeFunction());
    fill(map);
    {
        StrPtrMap copy(map);
        void* own = nullptr;
        void* shared = nullptr;
        EXPECT_TRUE(map.get("a", &own));
        EXPECT_TRUE(copy.get("a", &shared));
        EXPECT_EQ(shared, own);
        copy.remove("a");
    }
    EXPECT_EQ(freed, 0);
    // The function went along: switched on, the copy frees with it.
    StrPtrMap heir(map);
    map.setAutoDeleteValues(false);
    heir.setAutoDeleteValues(true);
    heir.removeAll();
    EXPECT_EQ(freed, 2);
}

}  // namespace
