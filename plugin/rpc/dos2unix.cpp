// Converts the line ends of transferred scripts and model files to this system's.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
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
constexpr mode_t kTemporaryMode = 0666;
constexpr std::size_t kPieceSize = 64 * 1024;

/// Allows one conversion at a time, because all share one temporary file. Never destroyed, because
/// transfers may run while the process exits.
std::mutex& conversionMutex() {
    static std::mutex& instance = *new std::mutex;
    return instance;
}

String temporaryFile() {
    String home;
    return Util::getTovrinHomeDir(home) ? home + String("/tmp/.zavtemp") : String(".zavtemp");
}

/// Reports a failed write as a failed close, because that is where a buffered stream would report
/// it.
struct Copied {
    bool read = true;
    bool written = true;
};

/// Copies without carriage returns and Ctrl-Z.
Copied copyConverted(const FileDescriptor& in, const FileDescriptor& out) {
    std::vector<char> piece(kPieceSize);
    for (;;) {
        const ssize_t length = readSome(in.get(), piece.data(), piece.size());
        if (length <= 0) return {length == 0, true};
        char* const end = std::remove_if(piece.data(), piece.data() + length,
                                         [](char c) { return c == 13 || c == 26; });
        const auto kept = static_cast<std::size_t>(end - piece.data());
        if (writeAll(out.get(), piece.data(), kept) != 0) return {true, false};
    }
}

bool closeTraced(const Trace& trace, FileDescriptor& file, const char* name, bool written = true) {
    if (file.close() == 0 && written) return true;
    trace().error("Could not close [%s].", name);
    return false;
}

/// Replaces the original by the converted text.
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
    FileDescriptor in = openFile(path, O_RDONLY);
    if (!in.isOpen()) {
        trace().error("Could not open [%s] for reading.", path);
        return false;
    }
    FileDescriptor out = openFile(temporary, O_WRONLY | O_CREAT | O_TRUNC, kTemporaryMode);
    if (!out.isOpen()) {
        trace().error("Could not open [%s] for writing.", temporary);
        closeTraced(trace, in, path);
        return false;
    }
    const Copied copied = copyConverted(in, out);
    bool ok = closeTraced(trace, in, path) && copied.read;
    ok = closeTraced(trace, out, temporary, copied.written) && ok;
    return ok && replaceFile(trace, path, temporary);
}

}  // namespace

int convertDOS2Unix(const char* path) {
    Trace trace(traceUnit);
    const std::lock_guard<std::mutex> lock(conversionMutex());
    return trace.exit(convert(trace, path) ? 0 : -1);
}

}  // namespace ZAV
