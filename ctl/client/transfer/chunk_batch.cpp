#include "ctl/client/transfer/chunk_batch.h"

#include <sys/uio.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "ctl/client/failure.h"

namespace ctl {

ChunkBatch::ChunkBatch() : bytes_(kMostChunks * kChunkSize) {}

std::size_t ChunkBatch::read(int descriptor, const std::string& name, std::uintmax_t expected) {
    // With room for more than the file has, a read that ends where it should has met the end. Files
    // whose size says nothing, such as those below /proc, are read until nothing comes.
    std::size_t room = kMostData;
    if (expected > 0 && expected < kMostData) room = static_cast<std::size_t>(expected) + 1;
    std::size_t total = 0;
    while (total < kMostData) {
        const std::size_t length = readSome(descriptor, total, room, name);
        if (length == 0) break;
        total += length;
        if (total == expected && total < room) break;
        if (total == room) room = kMostData;
    }
    putLengths(total);
    return total;
}

/// Reads to the places from byte `from` to byte `to` of the batch; 0 at the end of the file.
std::size_t ChunkBatch::readSome(int descriptor, std::size_t from, std::size_t to,
                                 const std::string& name) {
    iovec places[kMostChunks];
    int count = 0;
    for (std::size_t at = from; at < to;) {
        const std::size_t within = at % kChunkData;
        const std::size_t length = std::min(kChunkData - within, to - at);
        places[count++] = {&bytes_[at / kChunkData * kChunkSize + 4 + within], length};
        at += length;
    }
    for (;;) {
        const ssize_t length = ::readv(descriptor, places, count);
        if (length >= 0) return static_cast<std::size_t>(length);
        if (errno == EINTR) continue;
        throw Failure(kWrongUsage, "cannot read " + name + ": " + std::strerror(errno));
    }
}

void ChunkBatch::putLengths(std::size_t total) {
    total_ = total;
    const std::size_t chunks = std::max<std::size_t>(1, (total + kChunkData - 1) / kChunkData);
    count_ = static_cast<std::uint16_t>(chunks);
    for (std::size_t i = 0; i < count_; ++i) {
        unsigned char* const chunk = &bytes_[i * kChunkSize];
        const std::size_t length = std::min(kChunkData, total - std::min(total, i * kChunkData));
        for (unsigned byte = 0; byte < 4; ++byte) {
            chunk[byte] = static_cast<unsigned char>(length >> (8 * byte));
        }
        // What an earlier batch left behind the end must not reach the host.
        std::fill(chunk + 4 + length, chunk + kChunkSize, static_cast<unsigned char>(0));
    }
}

}  // namespace ctl
