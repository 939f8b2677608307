#include "ncs/memory.h"

#include <sys/mman.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "embedded/mutex.h"
#include "platform/ncs.h"

namespace ncs {
namespace {

/// The sizes of kept blocks are powers of two from 64 KiB to 8 MiB. Much smaller blocks come from
/// the allocator, larger ones from the system.
constexpr std::size_t kSmallest = std::size_t{64} << 10;
constexpr std::size_t kClasses = 8;
constexpr std::size_t kMostKept = std::size_t{16} << 20;
constexpr std::size_t kSmall = kClasses;
constexpr std::size_t kHuge = kClasses + 1;

/// Precedes every block.
struct alignas(std::max_align_t) Head {
    std::size_t sizeClass;
    std::size_t capacity;
    Head* next;  ///< in the list of kept blocks
};

std::size_t sizeOf(std::size_t sizeClass) {
    return kSmallest << sizeClass;
}

std::size_t classFor(std::size_t bytes) {
    if (bytes <= kSmallest / 2) return kSmall;
    for (std::size_t i = 0; i < kClasses; ++i) {
        if (bytes <= sizeOf(i)) return i;
    }
    return kHuge;
}

struct Kept {
    embedded::Mutex lock;
    /// Takes the latest one first, whose memory is still in the caches.
    std::array<Head*, kClasses> blocks ZAV_GUARDED_BY(lock){};
    std::size_t bytes ZAV_GUARDED_BY(lock) = 0;
};

Kept& kept() {
    static Kept& instance = *new Kept;  // never destroyed: threads use it until the end
    return instance;
}

Head* takeKept(std::size_t sizeClass) {
    Kept& pool = kept();
    const embedded::MutexLock lock(pool.lock);
    Head* const head = pool.blocks[sizeClass];
    if (head == nullptr) return nullptr;
    pool.blocks[sizeClass] = head->next;
    pool.bytes -= sizeOf(sizeClass);
    return head;
}

/// Keeps a block; false if enough blocks are kept already.
bool keep(Head* head) {
    Kept& pool = kept();
    const embedded::MutexLock lock(pool.lock);
    if (pool.bytes + head->capacity > kMostKept) return false;
    head->next = std::exchange(pool.blocks[head->sizeClass], head);
    pool.bytes += head->capacity;
    return true;
}

Head* mapBlock(std::size_t bytes) {
    if (bytes > static_cast<std::size_t>(-1) - sizeof(Head)) return nullptr;
    void* const mapped = ::mmap(nullptr, sizeof(Head) + bytes, PROT_READ | PROT_WRITE,
                                MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
    return mapped == MAP_FAILED ? nullptr : static_cast<Head*>(mapped);
}

void unmapBlock(Head* head) {
    ::munmap(head, sizeof(Head) + head->capacity);
}

}  // namespace

void* takeBlock(std::size_t bytes, std::size_t* capacity) {
    const std::size_t sizeClass = classFor(bytes);
    const bool isKeepable = sizeClass < kClasses;
    const std::size_t size = isKeepable ? sizeOf(sizeClass) : bytes;
    Head* head = isKeepable ? takeKept(sizeClass) : nullptr;
    if (sizeClass == kSmall) {
        head = static_cast<Head*>(std::malloc(sizeof(Head) + size));
    } else if (head == nullptr) {
        head = mapBlock(size);
    }
    if (head == nullptr) return nullptr;
    head->sizeClass = sizeClass;
    head->capacity = size;
    if (capacity != nullptr) *capacity = size;
    return head + 1;
}

void giveBlock(void* block) {
    if (block == nullptr) return;
    Head* const head = static_cast<Head*>(block) - 1;
    if (head->sizeClass == kSmall) {
        std::free(head);
    } else if (head->sizeClass == kHuge || !keep(head)) {
        unmapBlock(head);
    }
}

void releaseKeptBlocks() {
    std::array<Head*, kClasses> blocks{};
    {
        Kept& pool = kept();
        const embedded::MutexLock lock(pool.lock);
        blocks.swap(pool.blocks);
        pool.bytes = 0;
    }
    for (Head* head : blocks) {
        while (head != nullptr)
            unmapBlock(std::exchange(head, head->next));
    }
}

std::size_t keptBytes() {
    Kept& pool = kept();
    const embedded::MutexLock lock(pool.lock);
    return pool.bytes;
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
