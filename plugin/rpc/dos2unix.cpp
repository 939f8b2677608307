// The conversion of transferred scripts and model files to this system's line ends.

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <mutex>
#include <vector>

#include "base/file_descriptor.h"
#include "base/zavstr.h"
#include "base/zavtrace.h"
#include "rpc/zavrpc.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavrpc"};

constexpr mode_t kFileMode = 0770;
constexpr std::size_t kPieceSize = 64 * 1024;

/// A stream that reports whether its closing failed.
class Stream {
public:
    Stream(const char* path, const char* mode) : file_(openStream(path, mode)) {}
    ~Stream() { close(); }
    Stream(const Stream&) = delete;
    Stream& operator=(const Stream&) = delete;

    bool isOpen() const { return file_ != nullptr; }
    std::FILE* get() const { return file_; }
    bool close() {
        std::FILE* const file = file_;
        file_ = nullptr;
        return file == nullptr || std::fclose(file) == 0;
    }

private:
    std::FILE* file_;
};

/// One conversion at a time: they share one temporary file. Immortal, since transfers may run while
/// the process ends.
std::mutex& conversionMutex() {
    static std::mutex& instance = *new std::mutex;
    return instance;
}

String temporaryFile() {
    String home;
    return Util::getTovrinHomeDir(home) ? home + String("/tmp/.zavtemp") : String(".zavtemp");
}

/// Copies without carriage returns and Ctrl-Z. False when reading or writing fails.
bool copyConverted(std::FILE* in, std::FILE* out) {
    std::vector<char> piece(kPieceSize);
    for (;;) {
        const std::size_t length = std::fread(piece.data(), 1, piece.size(), in);
        if (length == 0) return std::ferror(in) == 0;
        char* const end = std::remove_if(piece.data(), piece.data() + length,
                                         [](char c) { return c == 13 || c == 26; });
        const auto kept = static_cast<std::size_t>(end - piece.data());
        if (std::fwrite(piece.data(), 1, kept, out) != kept) return false;
    }
}

bool closeTraced(const Trace& trace, Stream& stream, const char* name) {
    if (stream.close()) return true;
    trace().error("Could not close [%s].", name);
    return false;
}

/// Puts the converted text in the place of the original.
bool replaceFile(const Trace& trace, const char* path, const char* temporary) {
    if (::chmod(temporary, kFileMode) != 0) {
        trace().error("Failed to set permissions on file [%s] to [%d]", temporary, kFileMode);
        return false;
    }
    if (::unlink(path) != 0) {
        trace().error("Failed to unlink file [%s]. ERRNO: %d - %s", path, errno,
                      std::strerror(errno));
        return false;
    }
    if (::link(temporary, path) != 0) {
        trace().error("Failed to link file [%s] to [%s]. ERRNO: %d - %s", temporary, path, errno,
                      std::strerror(errno));
        return false;
    }
    if (::unlink(temporary) != 0) {
        trace().error("Failed to unlink temp file [%s]. ERRNO: %d - %s", temporary, errno,
                      std::strerror(errno));
        return false;
    }
    return true;
}

bool convert(const Trace& trace, const char* path) {
    const CharStar narrow = temporaryFile().c_str();
    const char* const temporary = narrow;
    trace().detail("tempfile name: [%s]", temporary);
    // "e": the descriptors must not reach children that other threads start.
    Stream in(path, "rb");
    if (!in.isOpen()) {
        trace().error("Could not open [%s] for reading.", path);
        return false;
    }
    Stream out(temporary, "wb");
    if (!out.isOpen()) {
        trace().error("Could not open [%s] for writing.", temporary);
        closeTraced(trace, in, path);
        return false;
    }
    bool ok = copyConverted(in.get(), out.get());
    ok = closeTraced(trace, in, path) && ok;
    ok = closeTraced(trace, out, temporary) && ok;
    return ok && replaceFile(trace, path, temporary);
}

}  // namespace

int convertDOS2Unix(const char* path) {
    Trace trace(traceUnit);
    const std::lock_guard<std::mutex> lock(conversionMutex());
    return trace.exit(convert(trace, path) ? 0 : -1);
}

}  // namespace ZAV
