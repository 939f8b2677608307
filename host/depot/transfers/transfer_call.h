/// A call of the file transfer operation, as far as the host looks into it before the plug-in does.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "embedded/ncs_host.h"

namespace host {

struct TransferCall {
    std::string name;        ///< as the client wrote it, up to its first 0
    bool startsFile = true;  ///< false: the batch is appended
    /// Whether the last chunk has room left, as only the last one of a file has.
    bool endsFile = false;
    std::uint64_t bytes = 0;  ///< of the file in all chunks, as their lengths say
};

/// Whether a call is one of the file transfer.
bool isTransfer(const ncs::Call& call);

/// Reads what stands before the chunks, and the chunks' lengths. Nothing when the parameters
/// are malformed: the plug-in's stub refuses those.
std::optional<TransferCall> readTransferCall(const ncs::Call& call);

/// The reply of the operation with that status.
std::string transferReply(int status);

/// The status in a reply; -1 when there is none.
int statusOfReply(const std::string& reply);

/// "A directory for the file cannot be made", and whatever else forbids a name.
inline constexpr int kTransferRefused = 6;

}  // namespace host
