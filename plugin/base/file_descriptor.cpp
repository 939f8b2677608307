#include "base/file_descriptor.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

namespace ZAV {
namespace {

constexpr int kFirstOwnDescriptor = 3;
constexpr mode_t kStreamMode = 0666;

/// Whether a descriptor is of a kind that never makes its reader or writer wait. Sets errno if not.
bool isFileOrDirectory(const FileDescriptor& opened) {
    struct stat found {};
    if (::fstat(opened.get(), &found) != 0) return false;
    if (S_ISREG(found.st_mode) || S_ISDIR(found.st_mode)) return true;
    errno = ESPIPE;
    return false;
}

}  // namespace

FileDescriptor& FileDescriptor::operator=(FileDescriptor&& other) noexcept {
    if (this != &other) {
        close();
        fd_ = other.release();
    }
    return *this;
}

FileDescriptor::~FileDescriptor() {
    const int savedErrno = errno;
    close();
    errno = savedErrno;
}

int FileDescriptor::release() {
    return std::exchange(fd_, -1);
}

int FileDescriptor::close() {
    if (fd_ < 0) return 0;
    // Linux frees the descriptor even when it reports EINTR. A second close could hit a descriptor
    // that another thread has just opened.
    if (::close(release()) == 0 || errno == EINTR) return 0;
    return errno;
}

FileDescriptor takeDescriptor(int fd) {
    FileDescriptor opened(fd);
    if (fd < 0 || fd >= kFirstOwnDescriptor) return opened;
    return FileDescriptor(::fcntl(fd, F_DUPFD_CLOEXEC, kFirstOwnDescriptor));
}

FileDescriptor takeOpened(int fd) {
    FileDescriptor opened = takeDescriptor(fd);
    if (opened.isOpen() && !isFileOrDirectory(opened)) return FileDescriptor();
    return opened;
}

FileDescriptor openFile(const char* path, int flags, mode_t mode) {
    int fd;
    do {
        fd = ::open(path, flags | kOpenFlags, mode);
    } while (fd < 0 && errno == EINTR);
    return takeOpened(fd);
}

std::FILE* openStream(const char* path, const char* mode) {
    const bool writing = mode[0] == 'w';
    FileDescriptor file =
        openFile(path, writing ? O_WRONLY | O_CREAT | O_TRUNC : O_RDONLY, kStreamMode);
    if (!file.isOpen()) return nullptr;
    std::FILE* const stream = ::fdopen(file.get(), mode);
    if (stream != nullptr) file.release();
    return stream;
}

ssize_t readSome(int fd, void* buffer, std::size_t size) {
    ssize_t got;
    do {
        got = ::read(fd, buffer, size);
    } while (got < 0 && errno == EINTR);
    return got;
}

int writeAll(int fd, const void* data, std::size_t size) {
    const char* at = static_cast<const char*>(data);
    while (size > 0) {
        const ssize_t written = ::write(fd, at, size);
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) return errno;
        at += written;
        size -= static_cast<std::size_t>(written);
    }
    return 0;
}

}  // namespace ZAV
