/// What tests of the file transfer share: content, and the chunks that carry it.
#pragma once

#include <unistd.h>

#include <cstdint>
#include <string>

#include "ctl/client/transfer/chunk_batch.h"
#include "ctl/client/transfer/rpc_wire.h"

namespace ctl_test {

/// An open descriptor, closed at the end.
class Descriptor {
public:
    explicit Descriptor(int descriptor) : descriptor_(descriptor) {}
    ~Descriptor() { ::close(descriptor_); }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    int get() const { return descriptor_; }

private:
    int descriptor_;
};

/// Content of a length, without a period that chunks could share.
inline std::string pattern(std::size_t length) {
    std::string text(length, '\0');
    for (std::size_t i = 0; i < length; ++i)
        text[i] = static_cast<char>('A' + i * i % 61);
    return text;
}

/// A little-endian number of 32 bits.
inline std::uint32_t numberAt(const std::string& bytes, std::size_t at) {
    return ctl::rpc::number32(reinterpret_cast<const unsigned char*>(bytes.data()) + at, true);
}

inline std::string bytesOf(const ctl::ChunkBatch& batch) {
    return {reinterpret_cast<const char*>(batch.data()), batch.size()};
}

/// The content that chunks carry.
inline std::string contentOf(const std::string& chunks) {
    std::string content;
    for (std::size_t at = 0; at < chunks.size(); at += 4100) {
        content += chunks.substr(at + 4, numberAt(chunks, at));
    }
    return content;
}

}  // namespace ctl_test
