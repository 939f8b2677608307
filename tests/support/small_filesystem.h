/// A small filesystem, which tests can fill.
#pragma once

#include <fcntl.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <string>

/// One that is mounted on a directory for as long as the object exists. That is not possible
/// everywhere.
class SmallFilesystem {
public:
    SmallFilesystem(const std::string& path, unsigned sizeKiB)
        : path_(path),
          mounted_(::mount("tmpfs", path.c_str(), "tmpfs", 0,
                           ("size=" + std::to_string(sizeKiB) + "k").c_str()) == 0),
          error_(mounted_ ? 0 : errno) {}
    ~SmallFilesystem() {
        if (mounted_) ::umount2(path_.c_str(), MNT_DETACH);
    }
    SmallFilesystem(const SmallFilesystem&) = delete;
    SmallFilesystem& operator=(const SmallFilesystem&) = delete;

    bool mounted() const { return mounted_; }
    std::string reason() const { return std::strerror(error_); }
    bool makeReadOnly() const {
        return ::mount("tmpfs", path_.c_str(), "tmpfs", MS_REMOUNT | MS_RDONLY, nullptr) == 0;
    }
    /// Takes all its room but these bytes.
    void fill(off_t leaving = 0) const {
        const int file = ::open(filler().c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
        off_t size = 0;
        for (off_t piece = kLargestPiece; piece >= kBlock; piece /= 2) {
            while (::posix_fallocate(file, size, piece) == 0)
                size += piece;
        }
        const int shrunk = ::ftruncate(file, size > leaving ? size - leaving : 0);
        ::close(file);
        if (shrunk != 0) throw std::runtime_error("the filesystem cannot be filled");
    }
    /// Gives the room back.
    void empty() const { ::unlink(filler().c_str()); }

private:
    static constexpr off_t kBlock = 4096;
    static constexpr off_t kLargestPiece = off_t{1} << 20;

    std::string filler() const { return path_ + "/filler"; }

    const std::string path_;
    const bool mounted_;
    const int error_;
};
