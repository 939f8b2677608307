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

    bool replaces = false;    ///< the depot holds a file of this name already
    bool converted = false;   ///< the host will drop carriage returns and Ctrl-Z
    std::string sha256{};     ///< of what the depot shall hold; empty when it is not computed
    std::uintmax_t kept = 0;  ///< bytes of that
    std::string arrived{};    ///< the SHA-256 that the host computed; empty when it did not

    /// Why the file was refused or did not arrive, in the host's words or ours; may be empty.
    std::string problem{};
    std::string guard{};  ///< which guard says so; empty for none
    std::string hint{};   ///< the way out; may be empty

    std::size_t unanswered = 0;  ///< batches that the host has not answered
    std::size_t taken = 0;       ///< batches that the host took
    bool isSent = false;         ///< the last batch is on its way

    /// Whether the host took the file to its end.
    bool isComplete() const { return isSent && unanswered == 0 && wasTaken(); }
    /// Whether a part of the file may lie in the depot. A push that was refused from the start has
    /// left nothing of its own there.
    bool isPartial() const { return !isComplete() && (taken > 0 || worst.status == 5); }

    /// Whether the host took everything that it was sent so far.
    bool wasTaken() const { return worst.isSuccess(); }
};

/// What a push consists of.
struct PushPlan {
    std::vector<PushedFile> files;
    /// What a folder holds besides, a sentence each: it is not pushed.
    std::vector<std::string> skipped;
};

/// Which links to files count as files when a folder is pushed.
enum class Links {
    Inside,  ///< those that stay inside it: others may give away what nobody meant to send
    All,
};

/// The files below `source` in the order of their names, or the one file that it is, whatever link
/// leads to that. `destination` is the name in the depot: the source's own name if empty, and a
/// directory to put it in if it ends in "/". Throws Failure(kWrongUsage) when there is nothing to
/// push or it cannot be read.
PushPlan filesToPush(const std::string& source, const std::string& destination,
                     Links links = Links::Inside);

/// The path of a pushed file below the depot, as the host's HTTP interface takes it: slashes for
/// backslashes, and none at the start.
std::string pathInDepot(const std::string& name);

/// Whether a name leads out of the depot, links apart.
bool leadsOutOfDepot(const std::string& name);

}  // namespace ctl
