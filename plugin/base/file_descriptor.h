/// File descriptors that close themselves, and reading and writing through them.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <cstdio>

namespace ZAV {

/// Owns one file descriptor, or none (-1). For one thread at a time.
class FileDescriptor {
public:
    FileDescriptor() = default;
    /// Takes over an open descriptor.
    explicit FileDescriptor(int fd) : fd_(fd) {}
    FileDescriptor(FileDescriptor&& other) noexcept : fd_(other.release()) {}
    FileDescriptor& operator=(FileDescriptor&& other) noexcept;
    ~FileDescriptor();

    bool isOpen() const { return fd_ >= 0; }
    int get() const { return fd_; }
    /// Hands the descriptor over to the caller.
    int release();
    /// Closes the descriptor; returns 0 (also when none was open) or an errno value. The descriptor
    /// is gone whatever the result.
    int close();

private:
    int fd_ = -1;
};

/// Opens a file as open does, close-on-exec. When that fails the result is not open and errno
/// tells why. The descriptor is above 2 even when those are free: what the host prints must not
/// end up in a file of ours.
FileDescriptor openFile(const char* path, int flags, mode_t mode = 0);

/// Opens a stream for reading ("rb") or for writing from its start ("wb"), on such a descriptor.
/// When that fails the result is null and errno tells why. The caller closes the stream.
std::FILE* openStream(const char* path, const char* mode);

/// Reads up to `size` bytes; returns their number, 0 at the end of the file, or -1 with errno set.
ssize_t readSome(int fd, void* buffer, std::size_t size);

/// Writes all of `size` bytes; returns 0 or an errno value.
int writeAll(int fd, const void* data, std::size_t size);

}  // namespace ZAV
