/// The host's file transfer over its RPC socket.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

#include "ctl/client/deadline.h"
#include "ctl/client/transfer/chunk_batch.h"
#include "ctl/client/transfer/rpc_wire.h"

namespace ctl {

/// What the host says of one batch.
struct TransferAnswer {
    std::int32_t status = 0;  ///< the operation's result; 0 for success
    std::uint32_t fault = 0;  ///< not 0: the call failed before there was a status

    bool isSuccess() const { return status == 0 && fault == 0; }
};

/// One association with the host. Requests may be sent before earlier ones are answered; answers
/// come in the order of the requests. Operations throw Failure: kNoHost when nobody listens or the
/// connection breaks, kNoOutcome when the host takes longer than the time-out.
class TransferClient {
public:
    /// Connects and binds to the file transfer interface. The time-out is that of each wait for the
    /// host: for a whole answer, however few bytes of it come at a time, or for room to send in.
    TransferClient(const std::string& socketPath, std::chrono::milliseconds timeout);
    ~TransferClient();
    TransferClient(const TransferClient&) = delete;
    TransferClient& operator=(const TransferClient&) = delete;

    /// Sends a batch of the file that becomes `name` in the depot. The first batch of a file
    /// replaces what is there, later ones are appended. A small batch may be held back until more
    /// come or receive() waits for an answer.
    void send(const std::string& name, bool firstBatch, const ChunkBatch& batch);
    /// Waits for the answer to the oldest request that has none yet.
    TransferAnswer receive();
    /// Tells the host that no more requests come. From now on receive() waits that long at most and
    /// fails when the host has answered what it had got.
    void stopSending(std::chrono::milliseconds timeout);

private:
    struct Packet {
        rpc::CommonHeader header;
        std::vector<unsigned char> body;
    };
    void connect(const std::string& path);
    void bind();
    void close();
    void sendFragments(const std::vector<unsigned char>& head, const ChunkBatch& batch);
    void sendHeldBack();
    Packet readPacket();
    void readAll(unsigned char* data, std::size_t length);
    void readMore();
    void awaitRestOfPacket() const;
    void limitWaits(std::chrono::milliseconds timeout);

    int descriptor_ = -1;
    std::chrono::milliseconds timeout_{0};
    Deadline packetDeadline_{};  ///< for the last byte of the packet that is being read
    bool packetBegun_ = false;   ///< of which some bytes have come
    std::uint32_t nextCall_ = 1;
    std::size_t largestData_ = 0;
    std::vector<unsigned char> heldBack_;  ///< whole requests that are to be sent

    /// What came with one system call and is not looked at yet: the bytes from `at_` to `end_`.
    unsigned char received_[4096];
    std::size_t at_ = 0;
    std::size_t end_ = 0;
};

}  // namespace ctl
