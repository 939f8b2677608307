#include "rpc/zavrpc.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <string>
#include <vector>

#include "base/file_descriptor.h"
#include "base/zavstr.h"
#include "base/zavtrace.h"
#include "rpc/depot_tree.h"
#include "rpc/line_ends.h"
#include "rpc/transfer_path.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavrpc"};

constexpr std::uint32_t kLongestPath = 1024;
constexpr mode_t kCreationMode = 0666;
constexpr mode_t kFileMode = 0770;

/// The destination file, closed at the end of the batch in any case. A batch is written with one
/// gathering write, without a buffer, so that a full file system is reported for the chunk that no
/// longer fits rather than when the file is closed.
class DestinationFile {
public:
    /// When it cannot be opened, errno says why.
    DestinationFile(DepotTree& depot, const char* path, bool anew)
        : file_(depot.open(path, O_CREAT | (anew ? O_WRONLY | O_TRUNC : O_RDWR | O_APPEND),
                           kCreationMode)) {}

    bool isOpen() const { return file_.isOpen(); }

    /// Sets the mode like chmod.
    bool setMode(mode_t mode) const { return ::fchmod(file_.get(), mode) == 0; }

    /// Writes the pieces, none of them empty, in order; false when one cannot be written. On return
    /// `done` is the number of pieces written in full, and the pieces after them describe the rest.
    bool write(std::vector<iovec>& pieces, std::size_t& done) const {
        for (done = 0; done < pieces.size();) {
            const int count =
                static_cast<int>(std::min<std::size_t>(pieces.size() - done, IOV_MAX));
            const ssize_t written = ::writev(file_.get(), &pieces[done], count);
            if (written == -1 && errno == EINTR) continue;
            if (written <= 0) return false;
            done = skipWritten(pieces, done, static_cast<std::size_t>(written));
        }
        return true;
    }

private:
    static std::size_t skipWritten(std::vector<iovec>& pieces, std::size_t at, std::size_t bytes) {
        while (at < pieces.size() && pieces[at].iov_len <= bytes)
            bytes -= pieces[at++].iov_len;
        if (at < pieces.size()) {
            pieces[at].iov_base = static_cast<char*>(pieces[at].iov_base) + bytes;
            pieces[at].iov_len -= bytes;
        }
        return at;
    }

    FileDescriptor file_;
};

/// Stores the directory part of a path; false when it has none.
bool directoryOf(const String& path, String& directory) {
    const std::uint32_t slash = path.rfind('/');
    if (slash == String::NPOS) return false;
    directory = path.substr(0, slash);
    return true;
}

/// Creates the destination's directory. Returns false, with a trace line, on failure.
bool ensureDirectory(const Trace& trace, DepotTree& depot, const String& destination) {
    String directory;
    if (!directoryOf(destination, directory) || pathExists(depot, directory)) return true;
    // Files for one directory may arrive on several threads; one of them creates it first.
    const CharStar narrow = directory.c_str();
    if (createDir(depot, narrow) == 0 || pathExists(depot, directory)) return true;
    trace().error("Could not create destination directory %s", directory);
    return false;
}

/// A batch as pieces to write, and the chunk that each comes from.
struct Batch {
    std::vector<iovec> pieces;
    std::vector<std::int32_t> chunks;
    std::int32_t badChunk = -1;  ///< claims more than a chunk holds; those after it are ignored
};

Batch batchOf(const DataChunk* chunks, std::int32_t lastIndex) {
    Batch batch;
    if (lastIndex < 0) return batch;
    batch.pieces.reserve(static_cast<std::size_t>(lastIndex) + 1);
    batch.chunks.reserve(static_cast<std::size_t>(lastIndex) + 1);
    for (std::int32_t i = 0; i <= lastIndex; ++i) {
        const DataChunk& chunk = chunks[i];
        if (chunk.length > kChunkCapacity) {
            batch.badChunk = i;
            break;
        }
        if (chunk.length == 0) continue;
        batch.pieces.push_back({const_cast<unsigned char*>(chunk.data), chunk.length});
        batch.chunks.push_back(i);
    }
    return batch;
}

bool writeChunks(const Trace& trace, const DestinationFile& file, const DataChunk* chunks,
                 std::int32_t lastIndex) {
    Batch batch = batchOf(chunks, lastIndex);
    std::size_t done = 0;
    const bool written = file.write(batch.pieces, done);
    if (written && batch.badChunk == -1) return true;
    constexpr int kErrorIndicator = 1;  // the value of ferror after any failed write
    trace().error("Error writing chunk %d, error number was %d",
                  written ? batch.badChunk : batch.chunks[done], kErrorIndicator);
    return false;
}

/// What leads out of the depot has no directory in it.
TransferStatus refuseDirectory(const Trace& trace, const String& destination) {
    String directory = destination;
    directoryOf(destination, directory);
    trace().error("Could not create destination directory %s", directory);
    return kTransferCannotCreateDirectory;
}

TransferStatus cannotOpen(const Trace& trace, const String& destination, const char* mode) {
    if (errno == EXDEV) return refuseDirectory(trace, destination);
    trace().error("Failed to open file %s using mode \"%s\", check permissions", destination, mode);
    return kTransferCannotOpen;
}

/// Opens the file, writes the batch, sets the mode and closes the file.
TransferStatus writeBatch(const Trace& trace, DepotTree& depot, const String& destination,
                          const char* path, bool anew, const DataChunk* chunks,
                          std::int32_t lastIndex) {
    const char* const mode = anew ? "wb" : "a+b";
    if (anew && depot.remove(path) != 0) {
        trace().detail(
            "Failed to unlink file [%s]. File must not exist or we dont have perms to unlink it",
            destination);
    }
    const DestinationFile file(depot, path, anew);
    if (!file.isOpen()) return cannotOpen(trace, destination, mode);
    trace().detail("Opened file %s for appending using mode %s", destination, mode);
    if (!writeChunks(trace, file, chunks, lastIndex)) return kTransferCannotWrite;
    if (!file.setMode(kFileMode)) {
        trace().error("Failed to set permissions on file [%s] to [%d]", destination, kFileMode);
    }
    return kTransferDone;
}

void convertIfInteresting(const Trace& trace, DepotTree& depot, const String& destination,
                          const char* path) {
    for (const char* name : {"install.sh", "DeployLnk.sh", ".mdl"}) {
        if (destination.find(String(name), 0) == String::NPOS) continue;
        trace().detail("Its a file we're interested in: %s", destination);
        convertDOS2Unix(depot, path);
        return;
    }
}

std::string narrowText(const String& text) {
    const CharStar bytes = text.c_str();
    return static_cast<const char*>(bytes);
}

TransferStatus transfer(const Trace& trace, const char* fileName, bool anew,
                        const DataChunk* chunks, std::int32_t lastIndex) {
    String depot;
    if (!Util::getAgentDepotDir(depot)) {
        trace().error("No useable Agent Depot dir");
        return kTransferNoDepot;
    }
    const String name = transferName(fileName);
    const String destination = depot + name;
    trace().detail("Destination path name is: %s", destination);
    if (leadsOutOfDepot(depot, name)) return refuseDirectory(trace, destination);
    DepotTree tree(narrowText(depot));
    if (!ensureDirectory(trace, tree, destination)) return kTransferCannotCreateDirectory;
    if (destination.length() > kLongestPath) {
        trace().error("Destination path name too long, max is %d characters", kLongestPath - 1);
        return kTransferNameTooLong;
    }
    const CharStar narrow = destination.c_str();
    const char* const path = narrow;
    const TransferStatus written =
        writeBatch(trace, tree, destination, path, anew, chunks, lastIndex);
    if (written == kTransferDone) convertIfInteresting(trace, tree, destination, path);
    return written;
}

}  // namespace

void BinaryDataTransfer(handle_t, std::int32_t, const char* fileName, std::int32_t,
                        std::int32_t firstBatch, std::int32_t lastIndex, const DataChunk* chunks,
                        std::int32_t* status) {
    const Trace trace(traceUnit);
    *status = transfer(trace, fileName, firstBatch == 1, chunks, lastIndex);
}

}  // namespace ZAV
