/// The growable array of this library; a String keeps its code units in one.
#pragma once

#include <algorithm>
#include <cstdint>
#include <memory>
#include <type_traits>
#include <utility>

#include "base/zavindex.h"

namespace ZAV {

/// Copies `count` elements by assignment, first to last. The ranges do not overlap.
template <typename T>
void CopyMem(T* dest, const T* src, std::uint32_t count) {
    std::copy_n(src, count, dest);
}

/// Says on standard output that an array was asked for a range it does not have, then throws.
[[noreturn]] void throwArrayIndexError(int line);
/// Throws std::length_error: an array cannot hold that many elements.
[[noreturn]] void throwArrayTooLong();

/// A growable array. It grows to exactly what is asked for, never beyond; whoever appends much asks
/// for the room first. Elements are default-constructible and copied by assignment. A bad range
/// leaves the array as it is and throws IndexOutOfBoundsException; so does a failing allocation,
/// with std::bad_alloc. Sources may lie in the array itself. One thread at a time.
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
    /// Leaves `other` empty and without a block; it may be used like any other array.
    Array(Array&& other) noexcept : data(nullptr), size(0), capacity(0) { swap(other); }
    ~Array() { delete[] data; }

    /// Takes a copy; the new block has the other's capacity. Nothing happens when both already
    /// share a block, that is when `other` is this array.
    Array& operator=(const Array& other) {
        if (data != other.data) init(other);
        return *this;
    }
    Array& operator=(Array&& other) noexcept {
        Array taken(std::move(other));
        swap(taken);
        return *this;
    }

    /// Replaces this array by a copy of `other` in a new block of the other's capacity.
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
    /// The number of elements that fit before the array reallocates.
    std::uint32_t getCapacity() const { return capacity; }
    /// The first element; valid until the array next grows, is cleared or assigned.
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
    /// Appends `n` elements that begin at `p`.
    void append(const T* p, std::uint32_t n) {
        const std::uint32_t newSize = sizeWith(n);
        if (newSize > capacity) {
            // The old block goes last: `p` may point into it.
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
    /// Inserts `n` elements that begin at `p` before the one at `pos`; at the end when `pos` is the
    /// size.
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
    /// Removes `n` elements from `pos` on; the block keeps its size.
    void remove(std::uint32_t pos, std::uint32_t n) {
        if (pos > size || n > size - pos) throwArrayIndexError(__LINE__);
        shift(pos, pos + n, size - pos - n);
        size -= n;
    }

    /// Makes the array `n` elements longer; the new ones are left as they are.
    void grow(std::uint32_t n) {
        const std::uint32_t newSize = sizeWith(n);
        if (newSize >= capacity) reserveCapacity(newSize);
        size = newSize;
    }

    /// Makes room for exactly `n` elements in all; does nothing when there is that much.
    void reserveCapacity(std::uint32_t n) {
        if (n <= capacity) return;
        Block block(new T[n]);
        relocate(block.get());
        adopt(std::move(block), n);
    }

    /// Back to an empty array of the initial capacity.
    void clear() {
        adopt(Block(new T[kInitialCapacity]), kInitialCapacity);
        size = 0;
    }

    /// Moves `count` elements from index `from` to index `to` within the block, in the order that
    /// keeps overlapping ranges whole. The size stays.
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

    /// Gives the elements to a new block. The old one is freed next, so they may be moved, unless
    /// a move could fail half way.
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

    /// A copy of a source that lies in this array's own block, which is about to move.
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
