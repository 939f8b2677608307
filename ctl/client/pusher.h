/// Sends files to the host's depot.
#pragma once

#include <cstdint>
#include <deque>
#include <filesystem>
#include <string>

#include "ctl/client/options.h"
#include "ctl/client/transfer_client.h"
#include "ctl/show/transfer_progress.h"

namespace ctl {

/// A file on its way, and what became of it.
struct PushedFile {
    std::filesystem::path source;
    std::string name;  ///< relative to the depot
    std::uintmax_t size = 0;
    std::uintmax_t sent = 0;
    TransferAnswer worst;  ///< the first batch that was not taken
};

/// Whether the host took all of it, as far as is known.
bool wasTaken(const PushedFile& file);

/// What the host says of a batch, in words.
std::string statusText(const TransferAnswer& answer);

/// Sends files one behind the other over one association. Several batches are on their way at a
/// time, so that the host never waits for the next one.
class Pusher {
public:
    Pusher(const Options& options, Progress& progress)
        : client_(options.rpcSocket, options.timeout()), progress_(progress) {}

    /// Sends a file; what becomes of it is known after finish().
    void push(PushedFile& file);
    /// Waits for the answers that are still to come.
    void finish() { awaitAnswers(0); }

private:
    static constexpr std::size_t kFull = ChunkBatch::kMostChunks * 4096;
    // Small enough that the answers of all of them fit into the socket's buffer.
    static constexpr std::size_t kMostOnTheirWay = 64;

    struct Sent {
        PushedFile* file;
        std::size_t length;
    };

    void awaitAnswers(std::size_t remaining);

    TransferClient client_;
    ChunkBatch batch_;
    Progress& progress_;
    std::deque<Sent> onTheirWay_;
};

}  // namespace ctl
