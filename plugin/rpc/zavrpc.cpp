#include "rpc/zavrpc.h"

#include <fcntl.h>
#include <limits.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <vector>

#include "base/file_descriptor.h"
#include "base/zavstr.h"
#include "base/zavtrace.h"
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
    DestinationFile(const char* path, bool anew)
        : file_(openFile(path, O_CREAT | (anew ? O_WRONLY | O_TRUNC : O_RDWR | O_APPEND),
                         kCreationMode)) {}

    bool isOpen() const { return file_.isOpen(); }

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
bool ensureDirectory(const Trace& trace, const String& destination) {
    String directory;
    if (!directoryOf(destination, directory) || Util::pathExists(directory)) return true;
    // Files for one directory may arrive on several threads; one of them creates it first.
    const CharStar narrow = directory.c_str();
    if (Util::createDir(narrow) == 0 || Util::pathExists(directory)) return true;
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

/// Opens the file, writes the batch and closes the file.
TransferStatus writeBatch(const Trace& trace, const String& destination, const char* path,
                          bool anew, const DataChunk* chunks, std::int32_t lastIndex) {
    const char* const mode = anew ? "wb" : "a+b";
    if (anew && ::unlink(path) != 0) {
        trace().detail(
            "Failed to unlink file [%s]. File must not exist or we dont have perms to unlink it",
            destination);
    }
    const DestinationFile file(path, anew);
    if (!file.isOpen()) {
        trace().error("Failed to open file %s using mode \"%s\", check permissions", destination,
                      mode);
        return kTransferCannotOpen;
    }
    trace().detail("Opened file %s for appending using mode %s", destination, mode);
    return writeChunks(trace, file, chunks, lastIndex) ? kTransferDone : kTransferCannotWrite;
}

void convertIfInteresting(const Trace& trace, const String& destination, const char* path) {
    for (const char* name : {"install.sh", "DeployLnk.sh", ".mdl"}) {
        if (destination.find(String(name), 0) == String::NPOS) continue;
        trace().detail("Its a file we're interested in: %s", destination);
        convertDOS2Unix(path);
        return;
    }
}

bool refuseToLeaveDepot(const Trace& trace, const String& depot, const String& name,
                        const String& destination) {
    if (!leadsOutOfDepot(depot, name)) return false;
    String directory = destination;
    directoryOf(destination, directory);
    trace().error("Could not create destination directory %s", directory);
    return true;
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
    if (refuseToLeaveDepot(trace, depot, name, destination)) return kTransferCannotCreateDirectory;
    if (!ensureDirectory(trace, destination)) return kTransferCannotCreateDirectory;
    if (destination.length() > kLongestPath) {
        trace().error("Destination path name too long, max is %d characters", kLongestPath - 1);
        return kTransferNameTooLong;
    }
    const CharStar narrow = destination.c_str();
    const char* const path = narrow;
    const TransferStatus written = writeBatch(trace, destination, path, anew, chunks, lastIndex);
    if (written != kTransferDone) return written;
    if (::chmod(path, kFileMode) != 0) {
        trace().error("Failed to set permissions on file [%s] to [%d]", destination, kFileMode);
    }
    convertIfInteresting(trace, destination, path);
    return kTransferDone;
}

}  // namespace

void BinaryDataTransfer(handle_t, std::int32_t, const char* fileName, std::int32_t,
                        std::int32_t firstBatch, std::int32_t lastIndex, const DataChunk* chunks,
                        std::int32_t* status) {
    const Trace trace(traceUnit);
    *status = transfer(trace, fileName, firstBatch == 1, chunks, lastIndex);
}

}  // namespace ZAV
