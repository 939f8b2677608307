/// The memory in which a request's stub data is assembled.
#pragma once

#include <atomic>
#include <cstddef>

namespace ncs {

/// Limits the memory of all requests in progress together. Any thread.
class MemoryBudget {
public:
    explicit MemoryBudget(std::size_t limit) : left_(limit) {}
    bool take(std::size_t bytes);
    void give(std::size_t bytes) { left_.fetch_add(bytes, std::memory_order_relaxed); }

private:
    std::atomic<std::size_t> left_;
};

/// Grows as fragments arrive. Only the filled part counts against the budget: what a client merely
/// announces costs address space and nothing else.
class StubBuffer {
public:
    explicit StubBuffer(MemoryBudget& budget) : budget_(budget) {}
    ~StubBuffer() { release(); }
    StubBuffer(const StubBuffer&) = delete;
    StubBuffer& operator=(const StubBuffer&) = delete;

    /// Makes sure that `bytes` more fit and are within the budget. When it has to grow, makes room
    /// for `expected` bytes in all. False if memory is short; the content is then unchanged.
    bool reserve(std::size_t bytes, std::size_t expected);
    /// Where the next byte goes.
    unsigned char* end() { return data_ + size_; }
    void grow(std::size_t bytes) { size_ += bytes; }

    const unsigned char* data() const { return data_; }
    std::size_t size() const { return size_; }
    void release();

private:
    bool enlarge(std::size_t wanted);

    MemoryBudget& budget_;
    unsigned char* data_ = nullptr;
    std::size_t size_ = 0;
    std::size_t capacity_ = 0;
    std::size_t charged_ = 0;
};

}  // namespace ncs
