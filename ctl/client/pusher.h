/// Sends files to the host's depot.
#pragma once

#include <cstdint>
#include <deque>
#include <functional>

#include "ctl/client/host_address.h"
#include "ctl/client/pushed_file.h"
#include "ctl/client/transfer_client.h"

namespace ctl {

/// Sends files one after the other over one association. Several batches are on their way at a
/// time, so that the host never waits for the next one. Operations throw Failure when a file cannot
/// be read and as TransferClient does.
class Pusher {
public:
    /// Called with the number of bytes of each batch that the host has answered.
    using OnAnswer = std::function<void(std::uintmax_t bytes)>;

    /// Connects to the host.
    explicit Pusher(const HostAddress& host, OnAnswer onAnswer = {});

    /// Sends a file. It must live until finish(): its result is filled in as answers come.
    void push(PushedFile& file);
    /// Waits for the answers that are still to come.
    void finish() { awaitAnswers(0); }

private:
    // Small enough that the answers to all of them fit into the socket's buffer.
    static constexpr std::size_t kMostOnTheirWay = 64;

    struct Sent {
        PushedFile* file;
        std::size_t length;
    };

    void awaitAnswers(std::size_t remaining);

    TransferClient client_;
    OnAnswer onAnswer_;
    ChunkBatch batch_;
    std::deque<Sent> onTheirWay_;
};

}  // namespace ctl
