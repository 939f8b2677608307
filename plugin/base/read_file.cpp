#include "base/read_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>

#include "base/file_descriptor.h"
#include "base/zavtrace.h"

namespace ZAV {
namespace {

// Util::readFile is this function, so it traces under the unit of the utilities for every caller.
RAS1_UNIT traceUnit{"zavutil"};

/// The size of an open file, or -1 with errno set.
off_t sizeOf(const FileDescriptor& file) {
    struct stat info;
    if (::fstat(file.get(), &info) != 0) return -1;
    // On some file systems one can seek in a directory, but its end is not a size.
    if (S_ISDIR(info.st_mode)) {
        errno = EISDIR;
        return -1;
    }
    const off_t size = ::lseek(file.get(), 0, SEEK_END);
    if (size < 0 || ::lseek(file.get(), 0, SEEK_SET) != 0) return -1;
    return size;
}

/// Allocates `size` + 1 bytes; null, with errno set, when out of memory.
MallocedText allocate(off_t size) {
    if (static_cast<std::uintmax_t>(size) >= PTRDIFF_MAX) {
        errno = ENOMEM;
        return nullptr;
    }
    return MallocedText(static_cast<char*>(std::malloc(static_cast<std::size_t>(size) + 1)));
}

/// Reads up to `size` bytes, fewer when the file has shrunk meanwhile, and appends a 0.
int fill(const FileDescriptor& file, char* buffer, std::size_t size) {
    std::size_t filled = 0;
    while (filled < size) {
        const ssize_t got = readSome(file.get(), buffer + filled, size - filled);
        if (got < 0) return errno;
        if (got == 0) break;
        filled += static_cast<std::size_t>(got);
    }
    buffer[filled] = '\0';
    return 0;
}

}  // namespace

int readFile(const char* path, char** buf) {
    Trace trace(traceUnit);
    *buf = nullptr;
    if (path == nullptr) {
        errno = EINVAL;
        return trace.exit(EINVAL);
    }
    const FileDescriptor file = openFile(path, O_RDONLY);
    if (!file.isOpen()) return trace.exit(errno);
    const off_t size = sizeOf(file);
    if (size < 0) return trace.exit(errno);
    if (size == 0) return trace.exit(0);
    MallocedText text = allocate(size);
    if (text == nullptr) {
        const int failure = errno;
        trace().error("Unable to read file: %s", path);
        return trace.exit(failure);
    }
    const int rc = fill(file, text.get(), static_cast<std::size_t>(size));
    if (rc == 0) *buf = text.release();
    return trace.exit(rc);
}

}  // namespace ZAV
