/// File transfer: the operation with which a central server puts files into the agent depot.
#pragma once

#include <cstdint>

#include "platform/ncs.h"

namespace ZAV {

/// The capacity of a chunk in bytes.
constexpr std::uint32_t kChunkCapacity = 4096;

/// An element of the transferred array.
struct DataChunk {
    std::uint32_t length;  ///< number of valid bytes; the rest of `data` is ignored
    unsigned char data[kChunkCapacity];
};
static_assert(sizeof(DataChunk) == 4100, "chunks stand one behind the other on the wire");

/// The results of BinaryDataTransfer.
enum TransferStatus : std::int32_t {
    kTransferDone = 0,
    kTransferNoDepot = 1,
    kTransferNameTooLong = 3,
    kTransferCannotOpen = 4,
    kTransferCannotWrite = 5,
    kTransferCannotCreateDirectory = 6,
};

extern "C" {

/// Writes one batch of chunks to a file in the agent depot.
///
/// `fileName` is 0-terminated and relative to the depot. Both "\" and "/" separate its components.
/// Missing directories are created; a name that leads out of the depot is refused. `firstBatch` 1
/// starts the file from the beginning, any other value appends. `chunks` has `lastIndex` + 1
/// elements; the caller keeps it. The file gets mode 0770; the line ends of scripts and model files
/// are converted after every batch. `*status` becomes a TransferStatus. The first, second and
/// fourth arguments are not used. May run on several threads at once, for different files.
void BinaryDataTransfer(handle_t handle, std::int32_t unused1, const char* fileName,
                        std::int32_t unused2, std::int32_t firstBatch, std::int32_t lastIndex,
                        const DataChunk* chunks, std::int32_t* status);

/// Removes the carriage returns (13) and Ctrl-Z characters (26) from a file, using a temporary file
/// below the home directory. Returns 0, or -1 when a step fails. If the original has been removed
/// by then, the converted text exists only in the temporary file.
int convertDOS2Unix(const char* path);

}  // extern "C"
}  // namespace ZAV

using ZAV::BinaryDataTransfer;
using ZAV::convertDOS2Unix;
