/// File transfer: the operation by which a central server puts files into the agent depot.
#pragma once

#include <cstdint>

#include "platform/ncs.h"

namespace ZAV {

/// The most data that one chunk carries.
constexpr std::uint32_t kChunkCapacity = 4096;

/// An element of the transferred array.
struct DataChunk {
    std::uint32_t length;  ///< bytes that count; the rest of `data` is never looked at
    unsigned char data[kChunkCapacity];
};
static_assert(sizeof(DataChunk) == 4100, "chunks stand one behind the other on the wire");

/// What BinaryDataTransfer reports.
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
/// `fileName` is 0-terminated and relative to the depot; "\" and "/" separate its components, and
/// missing directories are made. A name that would climb out of the depot is refused.
/// `firstBatch` 1 begins the file anew, any other value appends. `chunks` holds `lastIndex` + 1
/// elements and stays the caller's. The file ends with mode 0770; scripts and model files have
/// their line ends converted after every batch. `*status` is a TransferStatus. The first, second
/// and fourth arguments are not used. Runs on any number of threads, for different files.
void BinaryDataTransfer(handle_t handle, std::int32_t unused1, const char* fileName,
                        std::int32_t unused2, std::int32_t firstBatch, std::int32_t lastIndex,
                        const DataChunk* chunks, std::int32_t* status);

/// Rewrites a file without its carriage returns (13) and Ctrl-Z characters (26), by way of a
/// temporary file below the home directory. Returns 0, or -1 at the first step that fails; when the
/// original was removed by then, the converted text is in the temporary file only.
int convertDOS2Unix(const char* path);

}  // extern "C"
}  // namespace ZAV

using ZAV::BinaryDataTransfer;
using ZAV::convertDOS2Unix;
