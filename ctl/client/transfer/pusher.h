/// Sends files to the host's depot.
#pragma once

#include <cstdint>
#include <deque>
#include <functional>

#include "ctl/client/address/host_address.h"
#include "ctl/client/transfer/pushed_file.h"
#include "ctl/client/transfer/transfer_client.h"

namespace ctl {

/// Sends files to the host, several batches at a time on their way, so that the host never waits
/// for the next one. Small files take turns on two associations, which the host serves side by
/// side: most of their cost is that of making them. Operations throw Failure when a file cannot be
/// read and as TransferClient does.
class Pusher {
public:
    /// Called with the number of bytes of each batch that the host has answered.
    using OnAnswer = std::function<void(std::uintmax_t bytes)>;

    enum class Sums { No, Yes };

    /// Connects to the host. With sums, each file's checksum is computed while it is read.
    explicit Pusher(const HostAddress& host, OnAnswer onAnswer = {}, Sums sums = Sums::No);

    /// Sends a file. It must live until finish(): its result is filled in as answers come. A file
    /// that cannot be read does not keep those before it from arriving.
    void push(PushedFile& file);
    /// Waits for the answers that are still to come.
    void finish();
    /// Sends nothing more, and takes the answers to what the host has got already, for two seconds
    /// at most. To be called after a failure, so that each file's state is as well known as can be;
    /// nothing else may follow. Does not throw.
    void abandon() noexcept;

private:
    // Small enough that the answers to all of them fit into the socket's buffer.
    static constexpr std::size_t kMostOnTheirWay = 64;

    struct Sent {
        PushedFile* file;
        std::size_t length;
    };
    /// An association and the batches that it has not answered yet.
    struct Lane {
        explicit Lane(const HostAddress& host) : client(host.rpcSocket, host.timeout) {}
        TransferClient client;
        std::deque<Sent> onTheirWay;
    };

    void sendBatches(PushedFile& file);
    void sendBatch(Lane& lane, PushedFile& file, bool first, std::size_t length);
    Lane& laneFor(const PushedFile& file);
    void openSecondLane();
    void awaitAnswers(Lane& lane, std::size_t remaining);

    HostAddress host_;
    OnAnswer onAnswer_;
    Sums sums_;
    ChunkBatch batch_;
    std::deque<Lane> lanes_;
    std::size_t turn_ = 0;
};

}  // namespace ctl
