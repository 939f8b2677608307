/// Gives the including program its own operator new, which fails when the test wants it to. For one
/// source file of a program: the operators are the whole program's.
#pragma once

#include <cstdlib>
#include <new>

/// Memory for the operators, from the C library; nullptr is a failure. Defined by the program.
void* memoryForNew(std::size_t size) noexcept;

// Not inlined: the compiler would take the blocks for malloc's own and warn of the mismatch.
[[gnu::noinline]] void* operator new(std::size_t size) {
    void* const block = memoryForNew(size == 0 ? 1 : size);
    if (block == nullptr) throw std::bad_alloc();
    return block;
}
[[gnu::noinline]] void* operator new[](std::size_t size) {
    return operator new(size);
}
[[gnu::noinline]] void operator delete(void* block) noexcept {
    std::free(block);
}
[[gnu::noinline]] void operator delete[](void* block) noexcept {
    std::free(block);
}
[[gnu::noinline]] void operator delete(void* block, std::size_t) noexcept {
    std::free(block);
}
[[gnu::noinline]] void operator delete[](void* block, std::size_t) noexcept {
    std::free(block);
}
