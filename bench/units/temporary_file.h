/// A file for a benchmark.
#pragma once

#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <stdexcept>
#include <string>

/// An executable file below /tmp that goes when the object does.
class TemporaryFile {
public:
    explicit TemporaryFile(const std::string& text) {
        const int fd = ::mkstemp(path_);
        if (fd < 0 || ::fchmod(fd, 0700) != 0) throw std::runtime_error("no file");
        for (std::size_t at = 0; at < text.size();) {
            const ssize_t written = ::write(fd, text.data() + at, text.size() - at);
            if (written <= 0) throw std::runtime_error("no space");
            at += static_cast<std::size_t>(written);
        }
        ::close(fd);
    }
    ~TemporaryFile() { ::unlink(path_); }
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;

    const char* path() const { return path_; }

private:
    char path_[32] = "/tmp/zavbench.XXXXXX";
};
