/// Hash maps keyed by text. The order in which they list their keys is fixed: callers write files
/// and tables from it.
#pragma once

#include <cstdint>
#include <memory>

#include "base/zavarryi.h"
#include "base/zavstr.h"

namespace ZAV {

/// What both maps share: a table of chains whose entries are linked at the head. `Entry` has the
/// fields `hash` (the key's full hash code), `key`, `value` and `next`. Keys compare
/// case-sensitively. One thread at a time.
template <typename Entry>
class ChainTable {
public:
    virtual ~ChainTable() { dropEntries(); }
    ChainTable& operator=(const ChainTable&) = delete;

    /// The keys, bucket by bucket, within a bucket from its newest entry on.
    Array<String> getKeys() const;
    std::uint32_t getSize() const { return count; }
    /// The number of buckets.
    std::uint32_t getCapacity() const { return capacity; }
    /// The number of entries that makes the next new key enlarge the table.
    std::uint32_t getThreshold() const { return threshold; }
    /// Whether there is a table yet: the first entry makes it.
    bool hasTable() const { return table != nullptr; }

    /// h * 33 + unit over the key's units in 32 bits, modulo 2147483647.
    static std::uint32_t hashCode(const String& key);

protected:
    ChainTable() = default;
    /// Takes the sizes only; the entries are put by the map, which knows who owns their values.
    ChainTable(const ChainTable& other)
        : capacity(other.capacity), threshold(other.threshold), loadFactor(other.loadFactor) {}

    Entry* lookUp(const String& key, std::uint32_t hash) const;
    /// Adds an entry whose key is not in the map yet; enlarges the table first when it is due.
    void link(std::unique_ptr<Entry> added);
    /// Takes the entry of `key` out; null when there is none.
    std::unique_ptr<Entry> unlink(const String& key);
    /// Deletes all entries and the table.
    void dropEntries();
    /// Calls `visit(entry)` for each entry in the order of getKeys().
    template <typename Visit>
    void forEach(Visit visit) const;

private:
    static std::uint32_t bucketOf(std::uint32_t hash, std::uint32_t buckets) {
        return (hash & 0x7FFFFFFFu) % buckets;
    }
    void rehash();

    std::unique_ptr<Entry*[]> table;  // chain heads, which own their chains; null until needed
    std::uint32_t capacity = 11;
    std::uint32_t count = 0;
    std::uint32_t threshold = 8;
    float loadFactor = 0.75F;
};

struct StrStrEntry {
    std::uint32_t hash;
    String key;
    String value;
    StrStrEntry* next;
};

struct StrPtrEntry {
    std::uint32_t hash;
    String key;
    void* value;
    StrPtrEntry* next;
};

extern template class ChainTable<StrStrEntry>;
extern template class ChainTable<StrPtrEntry>;

/// A map from text to text.
class StrStrMap : public ChainTable<StrStrEntry> {
public:
    using entry = StrStrEntry;

    StrStrMap() = default;
    /// Puts the other's entries in its order, so entries of one bucket change places.
    StrStrMap(const StrStrMap& other);

    /// Adds the key or overwrites its value.
    void put(const String& key, const String& value);
    /// Assigns the key's value to `value` and returns true; false when the key is not there.
    bool get(const String& key, String& value) const;
    void remove(const String& key) { unlink(key); }
    /// Empties the map; the number of buckets stays for the next entries.
    void removeAll() { dropEntries(); }
};

/// A map from text to untyped pointers. With auto-delete on, it owns the values and frees one
/// whenever it discards it: with the free-value function, else with scalar delete, which runs no
/// destructor. Null values are never freed.
class StrPtrMap : public ChainTable<StrPtrEntry> {
public:
    using entry = StrPtrEntry;

    StrPtrMap() = default;
    /// Shares the other's values without owning them: auto-delete is off in the copy. Entries of
    /// one bucket change places, as in StrStrMap.
    StrPtrMap(const StrPtrMap& other);
    ~StrPtrMap() override { removeAll(); }

    /// Adds the key or overwrites its value. The old value is freed under auto-delete even when it
    /// is the new one too, so an owned pointer must not be put twice.
    void put(const String& key, void* value);
    /// Stores the key's value in `*value` and returns true; false when the key is not there.
    bool get(const String& key, void** value) const;
    void remove(const String& key);
    void removeAll();

    void setAutoDeleteValues(bool on) { autoDeleteValues = on; }
    /// `fn` is a function that takes the value pointer, `void (*)(void*)`, or null.
    void setFreeValueFunc(void* fn);

private:
    using FreeValue = void (*)(void*);
    void discard(void* value) const;

    bool autoDeleteValues = false;
    FreeValue freeValueFunc = nullptr;
};

}  // namespace ZAV
