// Converts the line ends of transferred scripts and model files to this system's.

#include "rpc/line_ends.h"

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
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavrpc"};

constexpr mode_t kFileMode = 0770;
constexpr mode_t kTemporaryMode = 0666;
constexpr std::size_t kPieceSize = std::size_t{64} * 1024;
constexpr int kFirstOwnDescriptor = 3;

/// The file that is converted, by the way in which it is found.
class Original {
public:
    virtual FileDescriptor open() = 0;
    /// Like unlink.
    virtual int remove() = 0;
    /// Gives `from` the original's name, like link.
    virtual int linkFrom(const char* from) = 0;

protected:
    ~Original() = default;
};

class AnywhereOriginal final : public Original {
public:
    explicit AnywhereOriginal(const char* path) : path_(path) {}
    FileDescriptor open() override { return openFile(path_, O_RDONLY); }
    int remove() override { return ::unlink(path_); }
    int linkFrom(const char* from) override { return ::link(from, path_); }

private:
    const char* const path_;
};

class DepotOriginal final : public Original {
public:
    DepotOriginal(DepotTree& depot, const char* path) : depot_(depot), path_(path) {}
    FileDescriptor open() override { return depot_.open(path_, O_RDONLY); }
    int remove() override { return depot_.remove(path_); }
    int linkFrom(const char* from) override { return depot_.linkFrom(from, path_); }

private:
    DepotTree& depot_;
    const char* const path_;
};

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

/// Replaces the original by the converted text. `converted` is open on the temporary file, whose
/// name may have been given to another file meanwhile.
bool replaceFile(const Trace& trace, const char* path, Original& original, const char* temporary,
                 const FileDescriptor& converted) {
    if (::fchmod(converted.get(), kFileMode) != 0) {
        trace().error("Failed to set permissions on file [%s] to [%d]", temporary, kFileMode);
        return false;
    }
    if (original.remove() != 0) {
        trace().error("Failed to unlink file [%s]. ERRNO: %d - %s", path, errno,
                      std::strerror(errno));
        return false;
    }
    if (original.linkFrom(temporary) != 0) {
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

bool convert(const Trace& trace, const char* path, Original& original) {
    const CharStar narrow = temporaryFile().c_str();
    const char* const temporary = narrow;
    trace().detail("tempfile name: [%s]", temporary);
    FileDescriptor in = original.open();
    if (!in.isOpen()) {
        trace().error("Could not open [%s] for reading.", path);
        return false;
    }
    // The home may be the depot: a link in the temporary file's place is not followed.
    FileDescriptor out =
        openFile(temporary, O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW, kTemporaryMode);
    const FileDescriptor converted(::fcntl(out.get(), F_DUPFD_CLOEXEC, kFirstOwnDescriptor));
    if (!converted.isOpen()) {
        trace().error("Could not open [%s] for writing.", temporary);
        closeTraced(trace, in, path);
        return false;
    }
    const Copied copied = copyConverted(in, out);
    bool ok = closeTraced(trace, in, path) && copied.read;
    ok = closeTraced(trace, out, temporary, copied.written) && ok;
    return ok && replaceFile(trace, path, original, temporary, converted);
}

int convertOneByOne(Trace& trace, const char* path, Original& original) {
    const std::lock_guard<std::mutex> lock(conversionMutex());
    return convert(trace, path, original) ? 0 : -1;
}

}  // namespace

int convertLineEnds(Trace& trace, const char* path) {
    AnywhereOriginal original(path);
    return convertOneByOne(trace, path, original);
}

int convertDOS2Unix(DepotTree& depot, const char* path) {
    Trace trace(traceUnit);
    DepotOriginal original(depot, path);
    return trace.exit(convertOneByOne(trace, path, original));
}

}  // namespace ZAV
