/// File descriptors that close themselves, and reading from and writing to them.
#pragma once

#include <fcntl.h>
#include <sys/types.h>

#include <cstddef>
#include <cstdio>

namespace ZAV {

/// Owns one file descriptor, or none (-1). One thread at a time.
class FileDescriptor {
public:
    FileDescriptor() = default;
    /// Takes ownership of an open descriptor.
    explicit FileDescriptor(int fd) : fd_(fd) {}
    FileDescriptor(FileDescriptor&& other) noexcept : fd_(other.release()) {}
    FileDescriptor& operator=(FileDescriptor&& other) noexcept;
    ~FileDescriptor();

    bool isOpen() const { return fd_ >= 0; }
    int get() const { return fd_; }
    /// Gives up ownership and returns the descriptor.
    int release();
    /// Closes the descriptor. Returns 0, also when none was open, or an errno value. Either way the
    /// object owns no descriptor afterwards.
    int close();

private:
    int fd_ = -1;
};

/// Opens a file like open does, close-on-exec. On failure the result is not open and errno says
/// why. The descriptor is above 2 even when lower ones are free, so that the host's output never
/// ends up in a file of this library.
///
/// Never waits for the other end of a pipe or for a device: what is neither a regular file nor a
/// directory cannot be opened (ESPIPE; ENXIO for a socket, and for a pipe without a reader that is
/// opened for writing).
FileDescriptor openFile(const char* path, int flags, mode_t mode = 0);

/// What every open of this library adds to its flags.
constexpr int kOpenFlags = O_CLOEXEC | O_NONBLOCK | O_NOCTTY;

/// Takes over what an open with kOpenFlags returned. The result is above 2. It is not open, with
/// errno set, when `fd` is -1 (errno stays what it is) or is neither a file nor a directory.
FileDescriptor takeOpened(int fd);

/// The same for descriptors of O_PATH, which may name anything.
FileDescriptor takeDescriptor(int fd);

/// Opens a stream on such a descriptor, for reading ("rb") or for writing from the start ("wb").
/// Returns null with errno set on failure. The caller closes the stream.
std::FILE* openStream(const char* path, const char* mode);

/// Reads up to `size` bytes. Returns their number, 0 at the end of the file, or -1 with errno set.
ssize_t readSome(int fd, void* buffer, std::size_t size);

/// Writes all of `size` bytes. Returns 0 or an errno value.
int writeAll(int fd, const void* data, std::size_t size);

}  // namespace ZAV
