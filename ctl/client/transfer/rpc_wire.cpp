#include "ctl/client/transfer/rpc_wire.h"

#include <algorithm>
#include <utility>

namespace ctl::rpc {
namespace {

/// Appends numbers in little-endian byte order, each aligned to its own size.
class Writer {
public:
    /// `expected` bytes come without another allocation.
    explicit Writer(std::size_t expected = 128) { bytes_.reserve(expected); }

    Writer& number8(unsigned value) {
        bytes_.push_back(static_cast<unsigned char>(value));
        return *this;
    }
    Writer& number16(unsigned value) {
        align(2);
        return number8(value & 0xFFU).number8(value >> 8 & 0xFFU);
    }
    Writer& number32(std::uint32_t value) {
        align(4);
        for (unsigned shift = 0; shift < 32; shift += 8)
            number8(value >> shift & 0xFFU);
        return *this;
    }
    Writer& raw(const void* data, std::size_t length) {
        const auto* const first = static_cast<const unsigned char*>(data);
        bytes_.insert(bytes_.end(), first, first + length);
        return *this;
    }
    Writer& align(std::size_t size) {
        while (bytes_.size() % size != 0)
            bytes_.push_back(0);
        return *this;
    }
    void setLength(std::size_t at) {
        bytes_[at] = static_cast<unsigned char>(bytes_.size() & 0xFFU);
        bytes_[at + 1] = static_cast<unsigned char>(bytes_.size() >> 8);
    }
    std::vector<unsigned char> take() { return std::move(bytes_); }

private:
    std::vector<unsigned char> bytes_;
};

void putHeader(Writer& out, PacketType type, std::uint8_t flags, std::size_t length,
               std::uint32_t callId) {
    out.number8(5).number8(0).number8(type).number8(flags);
    out.number8(0x10).number8(0).number8(0).number8(0);  // little-endian, ASCII, IEEE
    out.number16(static_cast<unsigned>(length)).number16(0).number32(callId);
}

// b1fb0fb3-03c4-0000-0200-000935183d00, version 1.0
constexpr unsigned char kInterface[] = {0xb3, 0x0f, 0xfb, 0xb1, 0xc4, 0x03, 0x00, 0x00,
                                        0x02, 0x00, 0x00, 0x09, 0x35, 0x18, 0x3d, 0x00};
// The NDR transfer syntax, version 2.0.
constexpr unsigned char kNdr[] = {0x04, 0x5d, 0x88, 0x8a, 0xeb, 0x1c, 0xc9, 0x11,
                                  0x9f, 0xe8, 0x08, 0x00, 0x2b, 0x10, 0x48, 0x60};

std::uint16_t number16(const unsigned char* bytes, bool littleEndian) {
    return static_cast<std::uint16_t>(littleEndian ? bytes[0] | bytes[1] << 8
                                                   : bytes[1] | bytes[0] << 8);
}

}  // namespace

std::uint32_t number32(const unsigned char* bytes, bool littleEndian) {
    std::uint32_t value = 0;
    for (unsigned i = 0; i < 4; ++i) {
        value |= static_cast<std::uint32_t>(bytes[littleEndian ? i : 3 - i]) << (8 * i);
    }
    return value;
}

bool parseCommonHeader(const unsigned char (&bytes)[kCommonHeader], CommonHeader& header) {
    header.type = bytes[2];
    header.flags = bytes[3];
    header.littleEndian = (bytes[4] & 0xF0U) != 0;
    header.fragmentLength = number16(bytes + 8, header.littleEndian);
    header.callId = number32(bytes + 12, header.littleEndian);
    return bytes[0] == 5 && bytes[1] == 0 && header.fragmentLength >= kCommonHeader;
}

std::vector<unsigned char> bindPacket(std::uint32_t callId) {
    Writer out;
    putHeader(out, kBind, kFirstFragment | kLastFragment, 0, callId);
    out.number16(kLargestFragment).number16(kLargestFragment).number32(0);
    out.number8(1).number8(0).number16(0);  // one presentation context,
    out.number16(0).number8(1).number8(0);  // number 0 with one transfer syntax
    out.raw(kInterface, sizeof kInterface).number32(1);
    out.raw(kNdr, sizeof kNdr).number32(2);
    out.setLength(8);
    return out.take();
}

bool parseBindAck(const std::vector<unsigned char>& body, bool littleEndian,
                  std::uint16_t& largestFragment) {
    // max_xmit, max_recv, group; length of the secondary address and the address itself; aligned
    // to 4 bytes: the number of results, three reserved bytes, the first result.
    if (body.size() < 10) return false;
    largestFragment = number16(body.data() + 2, littleEndian);
    const std::size_t address = number16(body.data() + 8, littleEndian);
    const std::size_t results = (10 + address + 3) / 4 * 4;
    if (body.size() < results + 6 || body[results] < 1) return false;
    return number16(body.data() + results + 4, littleEndian) == 0 &&
           largestFragment > kRequestHeader;
}

std::array<unsigned char, kRequestHeader> requestHeader(std::uint32_t callId, std::uint8_t flags,
                                                        std::size_t dataLength,
                                                        std::size_t totalLength) {
    Writer out;
    putHeader(out, kRequest, flags, kRequestHeader + dataLength, callId);
    out.number32(static_cast<std::uint32_t>(totalLength)).number16(0).number16(0);
    const std::vector<unsigned char> bytes = out.take();
    std::array<unsigned char, kRequestHeader> header{};
    std::copy(bytes.begin(), bytes.end(), header.begin());
    return header;
}

std::vector<unsigned char> transferHead(const std::string& name, bool firstBatch,
                                        std::uint16_t chunkCount) {
    const auto length = static_cast<std::uint32_t>(name.size() + 1);
    Writer out(64 + length);
    out.number32(0).number32(length).number32(0).number32(length);
    out.raw(name.c_str(), length);
    out.number32(0).number32(firstBatch ? 1 : 0).number32(chunkCount - 1U);
    out.number16(chunkCount).align(4);
    return out.take();
}

}  // namespace ctl::rpc
