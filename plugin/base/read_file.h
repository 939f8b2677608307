/// Reading a whole file at once.
#pragma once

#include <cstdlib>
#include <memory>

namespace ZAV {

struct FreeDeleter {
    void operator()(void* memory) const { std::free(memory); }
};

/// Owns a text from malloc.
using MallocedText = std::unique_ptr<char, FreeDeleter>;

/// Reads a whole file. On 0 `*buf` is a malloc'ed buffer that holds the bytes and a terminating 0,
/// which the caller frees, or null when the file is empty. Any other result is an errno value, and
/// `*buf` is null. A path of null sets errno to EINVAL and gives that. What cannot tell its size, a
/// pipe say, and what cannot be read, such as a directory, fails.
int readFile(const char* path, char** buf);

}  // namespace ZAV
