/// The growable array of this library. A String stores its code units in one.
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <type_traits>
#include <utility>

#include "base/zavindex.h"

namespace ZAV {

/// Copies `count` elements by assignment, from first to last. The ranges must not overlap.
template <typename T>
void CopyMem(T* dest, const T* src, std::uint32_t count) {
    std::copy_n(src, count, dest);
}

/// Reports on standard output that a range is out of bounds, then throws.
[[noreturn]] void throwArrayIndexError(int line);
/// Throws std::length_error, because an array cannot hold that many elements.
[[noreturn]] void throwArrayTooLong();

/// A growable array. It grows to exactly the size that is needed; callers that append many elements
/// reserve room first. Elements must be default-constructible and are copied by assignment. A range
/// out of bounds throws IndexOutOfBoundsException and a failed allocation std::bad_alloc; both
/// leave the array unchanged. Sources may lie in the array itself. One thread at a time.
template <typename T>
class Array {
public:
    Array() : Array(0) {}
    /// An array of `n` elements, which are left as they are.
    explicit Array(std::uint32_t n)
        : data(nullptr), size(n), capacity(n > kInitialCapacity ? n : kInitialCapacity) {
        data = new T[capacity];
    }
    Array(const Array& other) : data(nullptr), size(0), capacity(0) { init(other); }
    /// Leaves `other` empty and without a block. It can still be used.
    Array(Array&& other) noexcept : data(nullptr), size(0), capacity(0) { swap(other); }
    ~Array() { delete[] data; }

    /// Copies `other`; the new block has its capacity. Does nothing on self-assignment.
    Array& operator=(const Array& other) {
        if (data != other.data) init(other);
        return *this;
    }
    Array& operator=(Array&& other) noexcept {
        Array taken(std::move(other));
        swap(taken);
        return *this;
    }

    /// Replaces the content by a copy of `other`, in a new block of the same capacity.
    void init(const Array& other) {
        Block block(other.capacity != 0 ? new T[other.capacity] : nullptr);
        CopyMem(block.get(), other.data, other.size);
        adopt(std::move(block), other.capacity);
        size = other.size;
    }

    void swap(Array& other) noexcept {
        std::swap(data, other.data);
        std::swap(size, other.size);
        std::swap(capacity, other.capacity);
    }

    std::uint32_t getSize() const { return size; }
    /// The number of elements for which there is room without reallocating.
    std::uint32_t getCapacity() const { return capacity; }
    /// The first element. Valid until the array grows, is cleared or is assigned to.
    T* getData() { return data; }
    const T* getData() const { return data; }

    T& operator[](std::uint32_t i) {
        if (i >= size) throwArrayIndexError(__LINE__);
        return data[i];
    }
    const T& operator[](std::uint32_t i) const {
        if (i >= size) throwArrayIndexError(__LINE__);
        return data[i];
    }

    void append(const T& value) { append(&value, 1); }
    /// Appends the `n` elements at `p`.
    void append(const T* p, std::uint32_t n) {
        const std::uint32_t newSize = sizeWith(n);
        if (newSize > capacity) {
            // Frees the old block last, because `p` may point into it.
            Block block(new T[newSize]);
            CopyMem(block.get() + size, p, n);
            relocate(block.get());
            adopt(std::move(block), newSize);
        } else {
            CopyMem(data + size, p, n);
        }
        size = newSize;
    }

    void insert(std::uint32_t pos, const T& value) { insert(pos, &value, 1); }
    /// Inserts the `n` elements at `p` before position `pos`, or at the end when `pos` is the size.
    void insert(std::uint32_t pos, const T* p, std::uint32_t n) {
        if (pos > size) throwArrayIndexError(__LINE__);
        const std::uint32_t newSize = sizeWith(n);
        if (n == 0) return;
        const std::unique_ptr<T[]> ownSource = copyIfOwn(p, n);
        reserveCapacity(newSize);
        shift(pos + n, pos, size - pos);
        CopyMem(data + pos, ownSource ? ownSource.get() : p, n);
        size = newSize;
    }

    void remove(std::uint32_t pos) { remove(pos, 1); }
    /// Removes `n` elements, starting at `pos`. The capacity stays.
    void remove(std::uint32_t pos, std::uint32_t n) {
        if (pos > size || n > size - pos) throwArrayIndexError(__LINE__);
        shift(pos, pos + n, size - pos - n);
        size -= n;
    }

    /// Makes the array `n` elements longer, without initialising them.
    void grow(std::uint32_t n) {
        const std::uint32_t newSize = sizeWith(n);
        if (newSize >= capacity) reserveCapacity(newSize);
        size = newSize;
    }

    /// Makes room for exactly `n` elements in total. Does nothing when there is enough.
    void reserveCapacity(std::uint32_t n) {
        if (n <= capacity) return;
        Block block(new T[n]);
        relocate(block.get());
        adopt(std::move(block), n);
    }

    /// Makes the array empty again, with the initial capacity.
    void clear() {
        adopt(Block(new T[kInitialCapacity]), kInitialCapacity);
        size = 0;
    }

    /// Moves `count` elements within the block from index `from` to index `to`. The ranges may
    /// overlap. The size stays.
    void shift(std::uint32_t to, std::uint32_t from, std::uint32_t count) {
        if (count > capacity || to > capacity - count || from > capacity - count) {
            throwArrayIndexError(__LINE__);
        }
        if (to > from) {
            std::copy_backward(data + from, data + from + count, data + to + count);
        } else if (to < from) {
            std::copy(data + from, data + from + count, data + to);
        }
    }

private:
    using Block = std::unique_ptr<T[]>;
    static constexpr std::uint32_t kInitialCapacity = 8;

    std::uint32_t sizeWith(std::uint32_t n) const {
        if (n > UINT32_MAX - size) throwArrayTooLong();
        return size + n;
    }

    /// Transfers the elements to a new block before the old one is freed. Moves them, unless a move
    /// could throw half way.
    void relocate(T* block) {
        if constexpr (std::is_nothrow_move_assignable_v<T>) {
            std::move(data, data + size, block);
        } else {
            CopyMem(block, data, size);
        }
    }

    void adopt(Block block, std::uint32_t newCapacity) noexcept {
        delete[] data;
        data = block.release();
        capacity = newCapacity;
    }

    /// Copies a source that lies in this array's own block, whose elements are about to move.
    Block copyIfOwn(const T* p, std::uint32_t n) const {
        const std::less<const T*> before;
        if (before(p, data) || !before(p, data + size)) return nullptr;
        Block copy(new T[n]);
        CopyMem(copy.get(), p, n);
        return copy;
    }

    T* data;             // owned, `capacity` elements
    std::uint32_t size;  // elements in use
    std::uint32_t capacity;
};

}  // namespace ZAV
