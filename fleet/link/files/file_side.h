/// How the files of orders come to the host.
#pragma once

#include <atomic>
#include <functional>
#include <string>

#include "fleet/link/core/answers.h"
#include "fleet/link/core/directive.h"
#include "fleet/link/files/depot_side.h"
#include "fleet/link/files/file_source.h"
#include "fleet/link/files/spool.h"
#include "fleet/loop/worker.h"

namespace fleet {

struct FileSideSettings {
    FileSourceSettings source;
    std::string spool;       ///< a directory of the link's own
    std::string hostSocket;  ///< see DepotSide
};

/// Does one thing after the other on a thread of its own, which calls the answers. They may be
/// asked for from any thread.
class FileSide {
public:
    /// Throws FileError.
    explicit FileSide(FileSideSettings settings);
    /// Ends what is under way within a minute; no answer comes any more once it is over.
    ~FileSide();
    FileSide(const FileSide&) = delete;
    FileSide& operator=(const FileSide&) = delete;

    /// Fetches an order's files, so that they are there when its turn comes; one order's at a time,
    /// and not while another's are wanted. Why they do not come is told then.
    void fetchAhead(const Directive& directive);
    /// Has an order's files in the depot, and then they are no longer in the spool.
    void prepare(const Directive& directive, std::function<void(PrepareAnswer)> answer);

private:
    PrepareAnswer prepared(const Directive& directive);

    const FileSideSettings settings_;
    std::atomic<bool> isEnding_{false};
    std::atomic<bool> isAhead_{false};  ///< files are being fetched ahead, or about to be
    std::atomic<int> wanted_{0};        ///< orders whose files are wanted now
    bool isPatient_ = false;            ///< worker's: what is fetched is ahead
    Spool spool_;
    FileSource source_;
    DepotSide depot_;
    Worker worker_;  ///< last: it uses everything above
};

}  // namespace fleet
