/// Encoding and decoding of the packets (PDUs) of connection-oriented DCE/RPC 5.0.
///
/// Every packet begins with 16 bytes. Numbers are in the sender's byte order, which bits 4 to 7 of
/// byte 4 give (1 = little-endian):
///
///     0   version 5           4   data representation (4 bytes)    12  call id (32 bits)
///     1   minor version       8   length of the whole packet (16)
///     2   type                10  length of authentication data (16), none here
///     3   flags
///
/// It continues with
///
///     request      allocation hint (32), context id (16), operation (16), with flag 0x80 an object
///                  identifier (16 bytes), stub data
///     response     allocation hint (32), context id (16), cancel count (8), 8 bits, stub data
///     fault        the same, then status (32), 32 bits
///     bind         largest fragment that the client sends (16) and takes (16), association group
///                  (32), number of contexts (8), 24 bits; each context: id (16), number of
///                  transfer syntaxes (8), 8 bits, abstract syntax (20 bytes), transfer syntaxes
///                  (20 bytes each); a syntax is an identifier (16 bytes) and a version (32)
///     bind_ack     largest fragments (16, 16), association group (32), length (16) and text of the
///                  port with its terminating 0, padded to a multiple of 4, number of results
///                  (8), 24 bits; each result: result (16), reason (16), transfer syntax
///     bind_nak     reason (16), number of versions (8), each 8 bits major and 8 bits minor
///
/// alter_context is like bind, its response like bind_ack. Decoding is a pure function of the bytes
/// and never reads beyond the given length.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "platform/ncs.h"

namespace ncs {

enum class PduType : std::uint8_t {
    Request = 0,
    Response = 2,
    Fault = 3,
    Bind = 11,
    BindAck = 12,
    BindNak = 13,
    AlterContext = 14,
    AlterContextResponse = 15,
    Cancel = 18,
    Orphaned = 19,
};

enum : std::uint8_t {
    kFirstFragment = 0x01,
    kLastFragment = 0x02,
    kDidNotExecute = 0x20,
    kMaybe = 0x40,  ///< the caller wants no answer
    kHasObject = 0x80,
};

constexpr std::size_t kHeaderSize = 16;
constexpr std::size_t kRequestHeadSize = 24;
constexpr std::size_t kObjectSize = 16;
constexpr std::size_t kResponseHeadSize = 24;
/// Every implementation must accept fragments of this size.
constexpr std::uint16_t kSmallestMaximum = 1432;
/// The largest fragment that is sent or accepted; a multiple of 8.
constexpr std::uint16_t kLargestFragment = 65528;

struct PduHeader {
    std::uint8_t type = 0;  ///< a PduType, or any other number
    std::uint8_t flags = 0;
    bool littleEndian = true;
    std::uint16_t fragmentLength = 0;
    std::uint16_t authLength = 0;
    std::uint32_t callId = 0;

    bool is(PduType wanted) const { return type == static_cast<std::uint8_t>(wanted); }
    bool has(std::uint8_t flag) const { return (flags & flag) != 0; }
};

enum class HeaderProblem {
    None,
    Incomplete,      ///< fewer than 16 bytes
    Version,         ///< not 5.0 or 5.1
    Representation,  ///< an unknown byte order, or characters that are not ASCII
    Length,          ///< smaller than the header
};

/// Decodes the first 16 bytes of a packet. The header is filled unless the bytes are incomplete.
HeaderProblem decodeHeader(const unsigned char* bytes, std::size_t length, PduHeader& header);

/// The part of a request between its header and its stub data.
struct RequestHead {
    std::uint32_t allocationHint = 0;
    std::uint16_t contextId = 0;
    std::uint16_t operation = 0;
    std::size_t size = kRequestHeadSize;  ///< from the packet's start to the stub data
};

/// The number of bytes that decodeRequestHead() needs.
std::size_t requestHeadSize(const PduHeader& header);
/// Decodes a request's head from the packet's first requestHeadSize() bytes.
RequestHead decodeRequestHead(const unsigned char* pdu, const PduHeader& header);

struct PresentationContext {
    std::uint16_t id = 0;
    uuid__t interface {};
    std::uint32_t version = 0;  ///< major version in the lower half, minor in the upper
    bool offersNdr = false;     ///< NDR 2.0 is among the transfer syntaxes
};

struct BindRequest {
    std::uint16_t largestSent = 0;   ///< by the client
    std::uint16_t largestTaken = 0;  ///< by the client
    std::uint32_t associationGroup = 0;
    std::vector<PresentationContext> contexts;
};

/// Decodes a complete bind or alter_context packet. False if its counts do not fit its length.
bool decodeBind(const unsigned char* pdu, std::size_t length, const PduHeader& header,
                BindRequest& bind);

/// The outcome for one presentation context.
enum class ContextResult : std::uint16_t {
    Accepted = 0,
    UnknownInterface = 1,  ///< this and the following are reasons of a provider rejection
    UnknownTransferSyntax = 2,
    TooMany = 3,
};

struct BindAnswer {
    std::uint16_t largestSent = 0;   ///< by the server
    std::uint16_t largestTaken = 0;  ///< by the server
    std::uint32_t associationGroup = 0;
    std::string port;  ///< empty for a Unix socket
    std::vector<ContextResult> results;
};

enum class BindRefusal : std::uint16_t { Unspecified = 0, Version = 4, Authentication = 8 };

// Packets are appended to `out`, in little-endian byte order.

/// `type` is BindAck or AlterContextResponse.
void encodeBindAnswer(PduType type, std::uint32_t callId, const BindAnswer& answer,
                      std::string& out);
void encodeBindRefusal(std::uint32_t callId, BindRefusal reason, std::string& out);
/// Encodes results in as many fragments as `largestFragment` requires.
void encodeResponse(std::uint32_t callId, std::uint16_t contextId, const unsigned char* data,
                    std::size_t length, std::uint16_t largestFragment, std::string& out);
/// `flags` are added to those of a single fragment.
void encodeFault(std::uint32_t callId, std::uint16_t contextId, std::uint32_t status,
                 std::uint8_t flags, std::string& out);

}  // namespace ncs
