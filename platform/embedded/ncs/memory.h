/// Memory for requests: large blocks that are kept for the next call, so that a stream of large
/// requests runs in memory that is there already.
#pragma once

#include <cstddef>

namespace ncs {

/// A block of at least `bytes` bytes, aligned for any type, not cleared; null when there is none.
/// `*capacity` is what it really holds. Given back with giveBlock(), by any thread.
void* takeBlock(std::size_t bytes, std::size_t* capacity);
/// Null is ignored.
void giveBlock(void* block);

/// Returns the kept blocks to the system; for when no caller is left.
void releaseKeptBlocks();
/// Bytes in kept blocks.
std::size_t keptBytes();

}  // namespace ncs
