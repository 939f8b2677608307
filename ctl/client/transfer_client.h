/// The host's file transfer over its RPC socket.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <vector>

#include "ctl/client/rpc_wire.h"

namespace ctl {

/// A batch of a file's content as it stands in a request: chunks of a 32-bit length and 4096 bytes.
/// The content is read from the file straight to its place.
class ChunkBatch {
public:
    /// Chunks per batch: large enough that calls cost nothing beside the data, small enough that
    /// the data stays in the processor's caches on its way.
    static constexpr std::size_t kMostChunks = 250;

    ChunkBatch();
    /// Reads the next part of a file; 0 bytes at its end, which make one empty chunk. Throws
    /// Failure when reading fails.
    std::size_t read(int descriptor, const std::string& name);

    std::uint16_t count() const { return count_; }
    const unsigned char* data() const { return bytes_.data(); }
    std::size_t size() const { return count_ * kChunkSize; }

private:
    static constexpr std::size_t kChunkData = 4096;
    static constexpr std::size_t kChunkSize = 4 + kChunkData;
    void putLengths(std::size_t total);

    std::vector<unsigned char> bytes_;
    std::uint16_t count_ = 0;
};

/// What the host says of one batch.
struct TransferAnswer {
    std::int32_t status = 0;
    std::uint32_t fault = 0;  ///< not 0: the call failed before there was a status
};

/// One association with the host. Requests may be sent before earlier ones are answered; answers
/// come in the order of the requests. Operations throw Failure: kNoHost when nobody listens or the
/// connection breaks, kNoOutcome when the host takes longer than the time-out.
class TransferClient {
public:
    TransferClient(const std::string& socketPath, std::chrono::milliseconds timeout);
    ~TransferClient();
    TransferClient(const TransferClient&) = delete;
    TransferClient& operator=(const TransferClient&) = delete;

    void send(const std::string& name, bool firstBatch, const ChunkBatch& batch);
    TransferAnswer receive();

private:
    struct Packet {
        rpc::CommonHeader header;
        std::vector<unsigned char> body;
    };
    void connect(const std::string& path);
    void bind();
    void sendAll(const unsigned char* data, std::size_t length);
    Packet readPacket();
    void readAll(unsigned char* data, std::size_t length);

    int descriptor_ = -1;
    std::uint32_t nextCall_ = 1;
    std::size_t largestData_ = 0;
};

}  // namespace ctl
