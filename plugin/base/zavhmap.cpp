#include "base/zavhmap.h"

#include <new>
#include <utility>

#include "base/zavtrace.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavhmap"};

}  // namespace

template <typename Entry>
std::uint32_t ChainTable<Entry>::hashCode(const String& key) {
    std::uint32_t hash = 0;
    for (const unsigned short* unit = key.getData(); *unit != 0; ++unit)
        hash = hash * 33 + *unit;
    return hash % 0x7FFFFFFFu;
}

template <typename Entry>
template <typename Visit>
void ChainTable<Entry>::forEach(Visit visit) const {
    if (!table) return;
    for (std::uint32_t bucket = 0; bucket < capacity; ++bucket) {
        for (const Entry* at = table[bucket]; at != nullptr; at = at->next)
            visit(*at);
    }
}

template <typename Entry>
Array<String> ChainTable<Entry>::getKeys() const {
    const Trace trace(traceUnit);
    Array<String> keys;
    keys.reserveCapacity(count);
    forEach([&keys](const Entry& found) { keys.append(found.key); });
    return keys;
}

template <typename Entry>
Entry* ChainTable<Entry>::lookUp(const String& key, std::uint32_t hash) const {
    if (!table) return nullptr;
    Entry* at = table[bucketOf(hash, capacity)];
    while (at != nullptr && !(at->hash == hash && at->key == key))
        at = at->next;
    return at;
}

template <typename Entry>
void ChainTable<Entry>::rehash() {
    const std::uint32_t newCapacity = capacity * 2 + 1;
    std::unique_ptr<Entry*[]> newTable(new Entry*[newCapacity]());
    for (std::uint32_t bucket = capacity; bucket-- > 0;) {
        while (Entry* const moved = table[bucket]) {
            table[bucket] = moved->next;
            Entry*& head = newTable[bucketOf(moved->hash, newCapacity)];
            moved->next = std::exchange(head, moved);
        }
    }
    table = std::move(newTable);
    capacity = newCapacity;
    threshold = static_cast<std::uint32_t>(static_cast<float>(newCapacity) * loadFactor);
}

template <typename Entry>
void ChainTable<Entry>::link(std::unique_ptr<Entry> added) {
    if (!table) table.reset(new Entry*[capacity]());
    if (count >= threshold) rehash();
    Entry*& head = table[bucketOf(added->hash, capacity)];
    added->next = head;
    head = added.release();
    ++count;
}

template <typename Entry>
std::unique_ptr<Entry> ChainTable<Entry>::unlink(const String& key) {
    const Trace trace(traceUnit);
    if (!table) return nullptr;
    const std::uint32_t hash = hashCode(key);
    Entry** at = &table[bucketOf(hash, capacity)];
    while (*at != nullptr && !((*at)->hash == hash && (*at)->key == key))
        at = &(*at)->next;
    if (*at == nullptr) return nullptr;
    std::unique_ptr<Entry> taken(*at);
    *at = taken->next;
    --count;
    return taken;
}

template <typename Entry>
void ChainTable<Entry>::dropEntries() {
    if (!table) return;
    for (std::uint32_t bucket = 0; bucket < capacity; ++bucket) {
        while (table[bucket] != nullptr) {
            const std::unique_ptr<Entry> dropped(table[bucket]);
            table[bucket] = dropped->next;
        }
    }
    table.reset();
    count = 0;
}

template class ChainTable<StrStrEntry>;
template class ChainTable<StrPtrEntry>;

StrStrMap::StrStrMap(const StrStrMap& other) : ChainTable(other) {
    const Trace trace(traceUnit);
    other.forEach([this](const entry& found) { put(found.key, found.value); });
}

void StrStrMap::put(const String& key, const String& value) {
    const Trace trace(traceUnit);
    const std::uint32_t hash = hashCode(key);
    if (entry* const found = lookUp(key, hash)) {
        found->value = value;
    } else {
        link(std::unique_ptr<entry>(new entry{hash, key, value, nullptr}));
    }
}

bool StrStrMap::get(const String& key, String& value) const {
    Trace trace(traceUnit);
    const entry* const found = lookUp(key, hashCode(key));
    if (found != nullptr) value = found->value;
    return trace.exit(found != nullptr);
}

StrPtrMap::StrPtrMap(const StrPtrMap& other)
    : ChainTable(other), freeValueFunc(other.freeValueFunc) {
    const Trace trace(traceUnit);
    other.forEach([this](const entry& found) { put(found.key, found.value); });
}

void StrPtrMap::put(const String& key, void* value) {
    const Trace trace(traceUnit);
    const std::uint32_t hash = hashCode(key);
    if (entry* const found = lookUp(key, hash)) {
        discard(std::exchange(found->value, value));
    } else {
        link(std::unique_ptr<entry>(new entry{hash, key, value, nullptr}));
    }
}

bool StrPtrMap::get(const String& key, void** value) const {
    Trace trace(traceUnit);
    const entry* const found = lookUp(key, hashCode(key));
    if (found != nullptr) *value = found->value;
    return trace.exit(found != nullptr);
}

void StrPtrMap::remove(const String& key) {
    if (const std::unique_ptr<entry> taken = unlink(key)) discard(taken->value);
}

void StrPtrMap::removeAll() {
    const Trace trace(traceUnit);
    forEach([this](const entry& found) { discard(found.value); });
    dropEntries();
}

void StrPtrMap::setFreeValueFunc(void* fn) {
    freeValueFunc = reinterpret_cast<FreeValue>(fn);
}

void StrPtrMap::discard(void* value) const {
    if (!autoDeleteValues || value == nullptr) return;
    if (freeValueFunc != nullptr) {
        freeValueFunc(value);
    } else {
        ::operator delete(value);
    }
}

}  // namespace ZAV
