/// A part of a file as it stands in a transfer request.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace ctl {

/// One batch of chunks, each a 32-bit length and 4096 bytes. A file is read straight to its place
/// among them. The same object holds one batch after the other.
class ChunkBatch {
public:
    /// Large enough that the cost of a call does not show beside the data, small enough that the
    /// data stays in the processor's caches on its way.
    static constexpr std::size_t kMostChunks = 250;
    static constexpr std::size_t kChunkData = 4096;
    /// The most bytes of a file that a batch holds.
    static constexpr std::size_t kMostData = kMostChunks * kChunkData;

    ChunkBatch();

    /// Fills the batch with the next bytes of an open file and returns their number, which is less
    /// than kMostData only at the end of the file. No bytes make one empty chunk. `name` is for the
    /// Failure that is thrown when reading fails. `expected` is how many bytes the file still has,
    /// or 0 if that is not known: the right number saves a system call, a wrong one does no harm.
    std::size_t read(int descriptor, const std::string& name, std::uintmax_t expected = 0);

    /// The number of chunks.
    std::uint16_t count() const { return count_; }
    /// Calls `look(const unsigned char* data, std::size_t length)` for the file's bytes, in order.
    template <typename Look>
    void eachPiece(Look look) const {
        for (std::size_t at = 0; at < total_; at += kChunkData)
            look(&bytes_[at / kChunkData * kChunkSize + 4], std::min(kChunkData, total_ - at));
    }

    /// The chunks as they are sent.
    const unsigned char* data() const { return bytes_.data(); }
    std::size_t size() const { return count_ * kChunkSize; }

private:
    static constexpr std::size_t kChunkSize = 4 + kChunkData;
    std::size_t readSome(int descriptor, std::size_t from, std::size_t to, const std::string& name);
    void putLengths(std::size_t total);

    std::vector<unsigned char> bytes_;
    std::uint16_t count_ = 0;
    std::size_t total_ = 0;  ///< bytes of the file
};

}  // namespace ctl
