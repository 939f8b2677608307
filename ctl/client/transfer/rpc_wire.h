/// Connection-oriented DCE/RPC 5.0 as far as the file transfer uses it: the bytes of a bind, of a
/// request's fragments and of what comes back. docs/rpc.md draws them.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace ctl::rpc {

constexpr std::size_t kCommonHeader = 16;
constexpr std::size_t kRequestHeader = 24;
/// The largest multiple of 8 that fits into a packet's 16-bit length.
constexpr std::uint16_t kLargestFragment = 65528;

enum PacketType : std::uint8_t {
    kRequest = 0,
    kResponse = 2,
    kFault = 3,
    kBind = 11,
    kBindAck = 12,
    kBindNak = 13,
};

enum PacketFlag : std::uint8_t {
    kFirstFragment = 0x01,
    kLastFragment = 0x02,
};

/// The fields at the beginning of every packet that matter here.
struct CommonHeader {
    std::uint8_t type = 0;
    std::uint8_t flags = 0;
    bool littleEndian = true;
    std::uint16_t fragmentLength = 0;  ///< of the whole packet, this header included
    std::uint32_t callId = 0;
};

/// Reads a common header. Returns false when its version is not 5.0 or its length is impossible.
bool parseCommonHeader(const unsigned char (&bytes)[kCommonHeader], CommonHeader& header);

/// The packet that binds to the file transfer interface.
std::vector<unsigned char> bindPacket(std::uint32_t callId);

/// Whether a bind-ack accepts the one presentation context that bindPacket() offers. `body` is what
/// follows the common header. `largestFragment` becomes the largest packet that the host takes.
bool parseBindAck(const std::vector<unsigned char>& body, bool littleEndian,
                  std::uint16_t& largestFragment);

/// The header of one fragment of a request with `dataLength` bytes of data behind it.
std::array<unsigned char, kRequestHeader> requestHeader(std::uint32_t callId, std::uint8_t flags,
                                                        std::size_t dataLength,
                                                        std::size_t totalLength);

/// A 32-bit number in either byte order; `bytes` has four.
std::uint32_t number32(const unsigned char* bytes, bool littleEndian);

/// The data of a transfer request up to its chunks: the file's name in the depot and whether this
/// is the file's first batch.
std::vector<unsigned char> transferHead(const std::string& name, bool firstBatch,
                                        std::uint16_t chunkCount);

}  // namespace ctl::rpc
