#include "ncs/stub_buffer.h"

#include <algorithm>
#include <cstring>

#include "ncs/memory.h"

namespace ncs {

bool MemoryBudget::take(std::size_t bytes) {
    std::size_t left = left_.load(std::memory_order_relaxed);
    do {
        if (left < bytes) return false;
    } while (!left_.compare_exchange_weak(left, left - bytes, std::memory_order_relaxed));
    return true;
}

bool StubBuffer::reserve(std::size_t bytes, std::size_t expected) {
    const std::size_t needed = size_ + bytes;
    if (needed > charged_) {
        if (!budget_.take(needed - charged_)) return false;
        charged_ = needed;
    }
    if (needed <= capacity_) return true;
    return enlarge(std::max({needed, expected, capacity_ * 2}));
}

bool StubBuffer::enlarge(std::size_t wanted) {
    std::size_t capacity = 0;
    auto* const larger = static_cast<unsigned char*>(takeBlock(wanted, &capacity));
    if (larger == nullptr) return false;
    if (size_ > 0) std::memcpy(larger, data_, size_);
    giveBlock(data_);
    data_ = larger;
    capacity_ = capacity;
    return true;
}

void StubBuffer::release() {
    giveBlock(data_);
    budget_.give(charged_);
    data_ = nullptr;
    size_ = capacity_ = charged_ = 0;
}

}  // namespace ncs
