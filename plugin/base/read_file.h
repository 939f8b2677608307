/// Reads a whole file at once.
#pragma once

#include <cstdlib>
#include <memory>

namespace ZAV {

struct FreeDeleter {
    void operator()(void* memory) const { std::free(memory); }
};

/// Owns a text that was allocated with malloc.
using MallocedText = std::unique_ptr<char, FreeDeleter>;

/// Reads a whole file. Returns 0 and sets `*buf` to a malloc'ed buffer with the bytes and a
/// terminating 0, which the caller frees, or to null when the file is empty. On failure returns an
/// errno value and sets `*buf` to null. A null path gives EINVAL, and sets errno to it. Only
/// regular files can be read: directories give EISDIR, pipes and devices ESPIPE.
int readFile(const char* path, char** buf);

}  // namespace ZAV
