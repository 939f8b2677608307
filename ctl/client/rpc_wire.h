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
constexpr std::uint16_t kLargestFragment =
    65528;  // the largest multiple of 8 that a length can say

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

/// What stands at the beginning of every packet.
struct CommonHeader {
    std::uint8_t type = 0;
    std::uint8_t flags = 0;
    bool littleEndian = true;
    std::uint16_t fragmentLength = 0;  ///< the whole packet's
    std::uint32_t callId = 0;
};

/// Reads a common header; false when it is none of version 5.0 or claims an impossible length.
bool parseCommonHeader(const unsigned char (&bytes)[kCommonHeader], CommonHeader& header);

/// The packet that binds to the file transfer interface.
std::vector<unsigned char> bindPacket(std::uint32_t callId);

/// Whether a bind-ack accepts the one presentation context that bindPacket() offers, and the
/// largest fragment that the host takes. `body` follows the common header.
bool parseBindAck(const std::vector<unsigned char>& body, bool littleEndian,
                  std::uint16_t& largestFragment);

/// The header of one fragment of a request with `dataLength` bytes of data behind it.
std::array<unsigned char, kRequestHeader> requestHeader(std::uint32_t callId, std::uint8_t flags,
                                                        std::size_t dataLength,
                                                        std::size_t totalLength);

/// A 32-bit number in either byte order; `bytes` has four.
std::uint32_t number32(const unsigned char* bytes, bool littleEndian);

/// What stands before the chunks of a transfer request.
std::vector<unsigned char> transferHead(const std::string& name, bool firstBatch,
                                        std::uint16_t chunkCount);

/// A fault code in words.
std::string faultText(std::uint32_t code);

}  // namespace ctl::rpc
