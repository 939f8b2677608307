#include "embedded/ncs_memory.h"

#include <sys/mman.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <utility>

#include "platform/ncs.h"

namespace ncs {
namespace {

/// Blocks hold powers of two from 64 KiB to 8 MiB; what is smaller or larger comes from the
/// allocator.
constexpr std::size_t kSmallest = std::size_t{64} << 10;
constexpr std::size_t kClasses = 8;
constexpr std::size_t kMostKept = std::size_t{16} << 20;
constexpr std::size_t kNoClass = kClasses;

/// Stands before every block.
struct alignas(std::max_align_t) Head {
    std::size_t sizeClass;
    Head* next;  ///< among the kept blocks
};

std::size_t sizeOf(std::size_t sizeClass) {
    return kSmallest << sizeClass;
}

std::size_t classFor(std::size_t bytes) {
    if (bytes <= kSmallest / 2) return kNoClass;
    for (std::size_t i = 0; i < kClasses; ++i) {
        if (bytes <= sizeOf(i)) return i;
    }
    return kNoClass;
}

struct Kept {
    std::mutex lock;
    std::array<Head*, kClasses> blocks{};  ///< the latest first, as its memory is warm
    std::size_t bytes = 0;
};

Kept& kept() {
    static Kept& instance = *new Kept;  // immortal: used by threads until the process ends
    return instance;
}

Head* takeKept(std::size_t sizeClass) {
    Kept& pool = kept();
    const std::lock_guard<std::mutex> lock(pool.lock);
    Head* const head = pool.blocks[sizeClass];
    if (head == nullptr) return nullptr;
    pool.blocks[sizeClass] = head->next;
    pool.bytes -= sizeOf(sizeClass);
    return head;
}

Head* mapBlock(std::size_t sizeClass) {
    void* const mapped = ::mmap(nullptr, sizeof(Head) + sizeOf(sizeClass), PROT_READ | PROT_WRITE,
                                MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    return mapped == MAP_FAILED ? nullptr : static_cast<Head*>(mapped);
}

void unmapBlock(Head* head) {
    ::munmap(head, sizeof(Head) + sizeOf(head->sizeClass));
}

}  // namespace

void* takeBlock(std::size_t bytes, std::size_t* capacity) {
    const std::size_t sizeClass = classFor(bytes);
    Head* head = nullptr;
    if (sizeClass == kNoClass) {
        if (bytes > static_cast<std::size_t>(-1) - sizeof(Head)) return nullptr;
        head = static_cast<Head*>(std::malloc(sizeof(Head) + bytes));
    } else {
        head = takeKept(sizeClass);
        if (head == nullptr) head = mapBlock(sizeClass);
    }
    if (head == nullptr) return nullptr;
    head->sizeClass = sizeClass;
    if (capacity != nullptr) *capacity = sizeClass == kNoClass ? bytes : sizeOf(sizeClass);
    return head + 1;
}

void giveBlock(void* block) {
    if (block == nullptr) return;
    Head* const head = static_cast<Head*>(block) - 1;
    if (head->sizeClass == kNoClass) {
        std::free(head);
        return;
    }
    {
        Kept& pool = kept();
        const std::lock_guard<std::mutex> lock(pool.lock);
        if (pool.bytes + sizeOf(head->sizeClass) <= kMostKept) {
            head->next = std::exchange(pool.blocks[head->sizeClass], head);
            pool.bytes += sizeOf(head->sizeClass);
            return;
        }
    }
    unmapBlock(head);
}

void releaseKeptBlocks() {
    std::array<Head*, kClasses> blocks{};
    {
        Kept& pool = kept();
        const std::lock_guard<std::mutex> lock(pool.lock);
        blocks.swap(pool.blocks);
        pool.bytes = 0;
    }
    for (Head* head : blocks) {
        while (head != nullptr)
            unmapBlock(std::exchange(head, head->next));
    }
}

std::size_t keptBytes() {
    const std::lock_guard<std::mutex> lock(kept().lock);
    return kept().bytes;
}

}  // namespace ncs

void* rpc__malloc(std::size_t bytes) {
    return ncs::takeBlock(bytes, nullptr);
}

void rpc__free(void* memory) {
    ncs::giveBlock(memory);
}

void rpc__block_copy(const void* from, void* to, std::size_t bytes) {
    std::memcpy(to, from, bytes);
}
