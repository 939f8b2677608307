/// A file on its way to the depot, and which files a push consists of.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "ctl/client/transfer/transfer_client.h"

namespace ctl {

struct PushedFile {
    std::string source;       ///< where it stands here
    std::string name;         ///< relative to the depot
    std::uintmax_t size = 0;  ///< in bytes, before it is read
    std::uintmax_t sent = 0;  ///< bytes that the host took
    TransferAnswer worst;     ///< for the first batch that the host did not take

    /// Whether the host took everything that it was sent so far.
    bool wasTaken() const { return worst.isSuccess(); }
};

/// The files below `source` in the order of their names, or the one file that it is. `destination`
/// is the name in the depot: the source's own name if empty, and a directory to put it in if it
/// ends in "/". Throws Failure(kWrongUsage) when there is nothing to push or it cannot be read.
std::vector<PushedFile> filesToPush(const std::string& source, const std::string& destination);

}  // namespace ctl
