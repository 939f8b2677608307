/// Hash maps keyed by text. The order in which they list their keys is part of their interface,
/// because callers write files and tables in that order.
#pragma once

#include <cstdint>
#include <memory>

#include "base/zavarryi.h"
#include "base/zavstr.h"

namespace ZAV {

/// The base of both maps: a table of chains; new entries go to the head of their chain. `Entry` has
/// the fields `hash` (the key's full hash code), `key`, `value` and `next`. Keys are
/// case-sensitive. One thread at a time.
template <typename Entry>
class ChainTable {
public:
    virtual ~ChainTable() { dropEntries(); }
    ChainTable& operator=(const ChainTable&) = delete;

    /// The keys, bucket by bucket, and within a bucket from the newest entry to the oldest.
    Array<String> getKeys() const;
    std::uint32_t getSize() const { return count; }
    /// The number of buckets.
    std::uint32_t getCapacity() const { return capacity; }
    /// The number of entries from which on a new key enlarges the table.
    std::uint32_t getThreshold() const { return threshold; }
    /// Whether there is a table; the first entry creates it.
    bool hasTable() const { return table != nullptr; }

    /// Computes h * 33 + unit over the key's units in 32 bits, modulo 2147483647.
    static std::uint32_t hashCode(const String& key);

protected:
    ChainTable() = default;
    /// Copies the sizes only. The maps copy the entries, because they know who owns the values.
    ChainTable(const ChainTable& other)
        : capacity(other.capacity), threshold(other.threshold), loadFactor(other.loadFactor) {}

    Entry* lookUp(const String& key, std::uint32_t hash) const;
    /// Adds an entry whose key is not in the map yet. Enlarges the table first if necessary.
    void link(std::unique_ptr<Entry> added);
    /// Removes the entry of `key` and returns it; null when there is none.
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

    std::unique_ptr<Entry*[]> table;  // heads of the chains, which it owns; null until needed
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
    /// Adds the other's entries in the order of its keys, which reverses the order in a bucket.
    StrStrMap(const StrStrMap& other);

    /// Adds the key or overwrites its value.
    void put(const String& key, const String& value);
    /// Stores the key's value in `value` and returns true; false when the key is missing.
    bool get(const String& key, String& value) const;
    void remove(const String& key) { unlink(key); }
    /// Empties the map; keeps the number of buckets.
    void removeAll() { dropEntries(); }
};

/// A map from text to untyped pointers. With auto-delete on, the map owns the values and frees each
/// that it discards: with the free-value function, or without one with scalar delete, which runs no
/// destructor. Null values are never freed.
class StrPtrMap : public ChainTable<StrPtrEntry> {
public:
    using entry = StrPtrEntry;

    StrPtrMap() = default;
    /// Shares the other's values without owning them; auto-delete is off in the copy. The order in
    /// a bucket is reversed, as in StrStrMap.
    StrPtrMap(const StrPtrMap& other);
    ~StrPtrMap() override { removeAll(); }

    /// Adds the key or overwrites its value. With auto-delete the old value is freed even when it
    /// is the same pointer as the new one, so never put an owned pointer twice.
    void put(const String& key, void* value);
    /// Stores the key's value in `*value` and returns true; false when the key is missing.
    bool get(const String& key, void** value) const;
    void remove(const String& key);
    void removeAll();

    void setAutoDeleteValues(bool on) { autoDeleteValues = on; }
    /// `fn` is null or a function of type `void (*)(void*)` that takes the value pointer.
    void setFreeValueFunc(void* fn);

private:
    using FreeValue = void (*)(void*);
    void discard(void* value) const;

    bool autoDeleteValues = false;
    FreeValue freeValueFunc = nullptr;
};

}  // namespace ZAV
