// Reads, removes and copies whole files.
#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>

#include "base/file_descriptor.h"
#include "base/read_file.h"
#include "base/zavtrace.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavutil"};

constexpr int kNoFileName = 5;
constexpr mode_t kFileMode = 0666;

/// A buffered writer. A full disk is reported by write, or, for a short file, by close.
class BufferedOutput {
public:
    explicit BufferedOutput(FileDescriptor file) : file_(std::move(file)) {}

    /// Writes `size` bytes, at most the buffer's size. Returns 0 or an errno value; after a failure
    /// the content of the buffer is lost.
    int write(const char* data, std::size_t size) {
        const int rc = size > buffer_.size() - used_ ? flush() : 0;
        if (rc != 0) return rc;
        std::memcpy(buffer_.data() + used_, data, size);
        used_ += size;
        return 0;
    }

    /// Writes what is in the buffer and closes the file; returns 0 or the first errno value.
    int close() {
        const int flushed = flush();
        const int closed = file_.close();
        return flushed != 0 ? flushed : closed;
    }

private:
    int flush() {
        const std::size_t size = used_;
        used_ = 0;
        return writeAll(file_.get(), buffer_.data(), size);
    }

    FileDescriptor file_;
    std::array<char, 4096> buffer_;
    std::size_t used_ = 0;
};

/// Opens a file for the copy; `mode` is one of fopen's. Traces a failure.
FileDescriptor openTraced(Trace& trace, const char* which, const String& path, const char* mode) {
    const bool writing = mode[0] == 'w';
    FileDescriptor file =
        openFile(path.c_str(), writing ? O_WRONLY | O_CREAT | O_TRUNC : O_RDONLY, kFileMode);
    if (!file.isOpen()) {
        const int failure = errno;
        trace().error(
            "Failed to open %s file %s using mode \"%s\", check permissions, error code: %s", which,
            path, mode, std::strerror(failure));
        errno = failure;
    }
    return file;
}

/// Copies until the end or the first failure; returns 0 or its errno value.
int copyBlocks(Trace& trace, const FileDescriptor& in, const String& src, BufferedOutput& out,
               const String& dst) {
    std::array<char, 1024> block;
    for (;;) {
        const ssize_t got = readSome(in.get(), block.data(), block.size());
        if (got == 0) return 0;
        if (got < 0) {
            const int failure = errno;
            trace().error("Error reading from file %s, error code: %s", src,
                          std::strerror(failure));
            return failure;
        }
        const int failure = out.write(block.data(), static_cast<std::size_t>(got));
        if (failure != 0) {
            trace().error("Error writing to file %s, error code: %s", dst, std::strerror(failure));
            return failure;
        }
    }
}

/// Traces the result of closing a file. Returns the first failure of the copy.
int afterClosing(Trace& trace, int soFar, int closed, const String& path) {
    if (closed == 0) return soFar;
    trace().error("Failed to close stream for file %s, error code: %s", path,
                  std::strerror(closed));
    return soFar != 0 ? soFar : closed;
}

int copyBytes(Trace& trace, const String& src, const String& dst) {
    FileDescriptor in = openTraced(trace, "source", src, "rb");
    if (!in.isOpen()) return errno;
    FileDescriptor file = openTraced(trace, "destination", dst, "wb");
    if (!file.isOpen()) {
        const int failure = errno;  // closing may change it
        return afterClosing(trace, failure, in.close(), src);
    }
    BufferedOutput out(std::move(file));
    int rc = copyBlocks(trace, in, src, out, dst);
    rc = afterClosing(trace, rc, in.close(), src);
    return afterClosing(trace, rc, out.close(), dst);
}

/// What both forms of copyFile do once the destination is known.
int copyTraced(Trace& trace, const String& src, const String& dst) {
    const int rc = Util::_copyFile(src, dst);
    trace().detail("Exit with return code (%d)", rc);
    return trace.exit(rc);
}

}  // namespace

int Util::readFile(const char* path, char** buf) {
    return ZAV::readFile(path, buf);
}

bool Util::deleteFile(const String& path) {
    Trace trace(traceUnit);
    if (::unlink(path.c_str()) == 0) return trace.exit(true);
    trace().error("Error deleting [%s]: %s", path, std::strerror(errno));
    return trace.exit(false);
}

int Util::copyFile(const String& src, const String& dstDir) {
    Trace trace(traceUnit);
    trace().detail("Copying file [%s] to directory [%s]", src, dstDir);
    const unsigned slash = src.rfind('/');
    if (slash == String::NPOS) return trace.exit(kNoFileName);
    return copyTraced(trace, src, dstDir + src.substr(slash));
}

int Util::copyFile(const String& src, const String& dstDir, const String& dstName) {
    Trace trace(traceUnit);
    trace().detail("Copying file [%s] to directory [%s]", src, dstDir);
    return copyTraced(trace, src, dstDir + String("/") + dstName);
}

int Util::_copyFile(const String& src, const String& dst) {
    Trace trace(traceUnit);
    trace().detail("Source file [%s] destination file [%s]", src, dst);
    const int rc = copyBytes(trace, src, dst);
    trace().detail("Exit with return code (%d)", rc);
    return trace.exit(rc);
}

}  // namespace ZAV
