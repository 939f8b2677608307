#include "host/depot/transfers/transfer_call.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace host {
namespace {

constexpr std::size_t kChunkCapacity = 4096;

/// Numbers in the caller's byte order, each aligned to its own size. Once something is missing,
/// everything is 0.
class Reader {
public:
    explicit Reader(const ncs::Call& call) : call_(call) {}

    std::uint32_t number(std::size_t size) {
        align(size);
        if (!has(size)) return 0;
        std::uint32_t value = 0;
        for (std::size_t i = 0; i < size; ++i) {
            const std::size_t place = call_.littleEndian ? size - 1 - i : i;
            value = value << 8 | call_.data[at_ + place];
        }
        at_ += size;
        return value;
    }

    /// A text with its terminating 0; null when it is not well-formed.
    const char* text() {
        const std::uint32_t room = number(4);
        const std::uint32_t offset = number(4);
        const std::uint32_t length = number(4);
        if (length == 0 || length > room || offset != 0 || !has(length)) ok_ = false;
        if (!ok_ || call_.data[at_ + length - 1] != 0) return nullptr;
        at_ += length;
        return reinterpret_cast<const char*>(call_.data + at_ - length);
    }

    void align(std::size_t size) { at_ = (at_ + size - 1) / size * size; }
    void skip(std::size_t count) {
        if (has(count)) at_ += count;
    }
    bool has(std::size_t count) {
        if (at_ > call_.length || count > call_.length - at_) ok_ = false;
        return ok_;
    }
    bool ok() const { return ok_; }

private:
    const ncs::Call& call_;
    std::size_t at_ = 0;
    bool ok_ = true;
};

}  // namespace

bool isTransfer(const ncs::Call& call) {
    return std::string_view(call.interface) == "QVS_Agent_v1" && call.operation == 0;
}

std::optional<TransferCall> readTransferCall(const ncs::Call& call) {
    Reader reader(call);
    reader.number(4);  // not used
    const char* const name = reader.text();
    if (name == nullptr) return std::nullopt;
    TransferCall found;
    found.name = name;
    reader.number(4);  // not used
    found.startsFile = reader.number(4) == 1;
    const std::uint32_t lastIndex = reader.number(4);
    const std::uint32_t count = reader.number(2);
    if (lastIndex >= count) return std::nullopt;
    reader.align(4);
    for (std::uint32_t i = 0; i <= lastIndex && reader.ok(); ++i) {
        const std::uint32_t length = reader.number(4);
        reader.skip(kChunkCapacity);
        found.bytes += std::min<std::uint64_t>(length, kChunkCapacity);
        found.endsFile = length < kChunkCapacity;
    }
    if (!reader.ok()) return std::nullopt;
    return found;
}

std::string transferReply(int status) {
    std::string reply;
    for (unsigned shift = 0; shift < 32; shift += 8)
        reply += static_cast<char>(static_cast<unsigned>(status) >> shift & 0xFFU);
    return reply;
}

int statusOfReply(const std::string& reply) {
    if (reply.size() != 4) return -1;
    std::uint32_t value = 0;
    for (std::size_t i = 4; i-- > 0;)
        value = value << 8 | static_cast<unsigned char>(reply[i]);
    return static_cast<int>(value);
}

}  // namespace host
