/// Memory for requests. Large blocks are kept for the next call, so that a stream of large requests
/// needs no new memory.
#pragma once

#include <cstddef>

namespace ncs {

/// Returns a block of at least `bytes` bytes, aligned for any type, not cleared; null when memory
/// is short. Sets `*capacity` to its size. Any thread may return it with giveBlock().
void* takeBlock(std::size_t bytes, std::size_t* capacity);
/// Null is ignored.
void giveBlock(void* block);

/// Returns the kept blocks to the system. Called when there are no more callers.
void releaseKeptBlocks();
/// Bytes in kept blocks.
std::size_t keptBytes();

}  // namespace ncs
