/// Packets as a client makes and reads them, in either byte order, and an interface to call.
#pragma once

#include <algorithm>
#include <atomic>
#include <cstdint>
#include <cstring>
#include <stdexcept>
#include <string>
#include <vector>

#include "platform/ncs.h"

namespace ncs_test {

inline constexpr uuid__t kEcho = {0x11223344, 0x5566, 0x7788, 0x99, {1, 2, 3, 4, 5, 6, 7}};
inline constexpr uuid__t kUnknown = {0x11223344, 0x5566, 0x7788, 0x98, {1, 2, 3, 4, 5, 6, 7}};
inline constexpr uuid__t kNdr = {
    0x8a885d04, 0x1ceb, 0x11c9, 0x9f, {0xe8, 0x08, 0x00, 0x2b, 0x10, 0x48, 0x60}};

enum Type : std::uint8_t {
    kRequest = 0,
    kResponse = 2,
    kFault = 3,
    kBind = 11,
    kBindAck = 12,
    kBindNak = 13,
    kAlter = 14,
    kAlterResponse = 15,
    kAuth3 = 16,
    kShutdown = 17,
    kCancel = 18,
    kOrphaned = 19,
};

/// Builds one packet in the byte order of a client.
class Packet {
public:
    explicit Packet(std::uint8_t type, std::uint32_t callId = 1, bool little = true,
                    std::uint8_t flags = 3)
        : little_(little) {
        u8(5).u8(0).u8(type).u8(flags).u8(little ? 0x10 : 0).u8(0).u8(0).u8(0);
        u16(0).u16(0).u32(callId);
    }
    Packet& u8(unsigned value) {
        bytes_ += static_cast<char>(value);
        return *this;
    }
    Packet& u16(unsigned value) {
        return little_ ? u8(value & 0xFF).u8(value >> 8 & 0xFF)
                       : u8(value >> 8 & 0xFF).u8(value & 0xFF);
    }
    Packet& u32(std::uint32_t value) {
        return little_ ? u16(value & 0xFFFF).u16(value >> 16)
                       : u16(value >> 16).u16(value & 0xFFFF);
    }
    Packet& id(const uuid__t& value) {
        u32(value.time_high).u16(value.time_low).u16(value.reserved).u8(value.family);
        for (const std::uint8_t byte : value.host)
            u8(byte);
        return *this;
    }
    Packet& raw(const std::string& data) {
        bytes_ += data;
        return *this;
    }
    /// Overwrites a byte of the header.
    Packet& poke(std::size_t at, unsigned value) {
        bytes_[at] = static_cast<char>(value);
        return *this;
    }
    std::string done() const {
        std::string whole = bytes_;
        const auto length = static_cast<unsigned>(whole.size());
        whole[little_ ? 8 : 9] = static_cast<char>(length & 0xFF);
        whole[little_ ? 9 : 8] = static_cast<char>(length >> 8);
        return whole;
    }

private:
    const bool little_;
    std::string bytes_;
};

struct Context {
    std::uint16_t id = 0;
    uuid__t interface = kEcho;
    std::uint32_t version = 1;
    uuid__t syntax = kNdr;
    std::uint32_t syntaxVersion = 2;
};

inline std::string bindPacket(std::vector<Context> contexts = {Context{}}, bool little = true,
                              std::uint8_t type = kBind, std::uint16_t largest = 65528,
                              std::uint32_t group = 0) {
    Packet packet(type, 7, little);
    packet.u16(largest).u16(largest).u32(group).u8(static_cast<unsigned>(contexts.size()));
    packet.u8(0).u16(0);
    for (const Context& context : contexts) {
        packet.u16(context.id).u8(1).u8(0).id(context.interface).u32(context.version);
        packet.id(context.syntax).u32(context.syntaxVersion);
    }
    return packet.done();
}

inline std::string fragment(std::uint8_t flags, std::uint16_t operation, const std::string& stub,
                            std::uint32_t callId = 1, bool little = true, std::uint16_t context = 0,
                            std::uint32_t hint = 0) {
    Packet packet(kRequest, callId, little, flags);
    packet.u32(hint).u16(context).u16(operation);
    if ((flags & 0x80) != 0) packet.raw(std::string(16, 'o'));
    return packet.raw(stub).done();
}

/// A request in fragments of at most `part` bytes of stub data.
inline std::string requestPackets(std::uint16_t operation, const std::string& stub,
                                  std::size_t part = 65504, std::uint32_t callId = 1,
                                  bool little = true) {
    std::string packets;
    std::size_t at = 0;
    do {
        const std::string piece = stub.substr(at, part);
        const unsigned flags = (at == 0 ? 1U : 0U) | (at + piece.size() == stub.size() ? 2U : 0U);
        packets += fragment(static_cast<std::uint8_t>(flags), operation, piece, callId, little, 0,
                            static_cast<std::uint32_t>(stub.size()));
        at += piece.size();
    } while (at < stub.size());
    return packets;
}

/// A packet of the server, which is little-endian.
struct Reply {
    std::uint8_t type = 0;
    std::uint8_t flags = 0;
    std::uint32_t callId = 0;
    std::string body;  ///< behind the 16 bytes of the header

    std::uint32_t number(std::size_t at, std::size_t bytes) const {
        std::uint32_t value = 0;
        for (std::size_t i = bytes; i-- > 0;) {
            value = value << 8 | static_cast<unsigned char>(body.at(at + i));
        }
        return value;
    }
    std::uint32_t fault() const { return number(8, 4); }
    std::string stub() const { return body.substr(8); }
};

/// Cuts the server's bytes into packets; throws when they are none.
inline std::vector<Reply> replies(const std::string& bytes) {
    std::vector<Reply> found;
    for (std::size_t at = 0; at < bytes.size();) {
        const auto byte = [&](std::size_t i) {
            return static_cast<std::size_t>(static_cast<unsigned char>(bytes.at(at + i)));
        };
        const std::size_t length = byte(8) | byte(9) << 8;
        if (byte(0) != 5 || byte(4) != 0x10 || length < 16 || at + length > bytes.size()) {
            throw std::runtime_error("no packet");
        }
        Reply reply;
        reply.type = static_cast<std::uint8_t>(byte(2));
        reply.flags = static_cast<std::uint8_t>(byte(3));
        std::memcpy(&reply.callId, bytes.data() + at + 12, 4);
        reply.body = bytes.substr(at + 16, length - 16);
        found.push_back(reply);
        at += length;
    }
    return found;
}

/// The stub data of a response in any number of fragments.
inline std::string stubOf(const std::vector<Reply>& fragments) {
    std::string stub;
    for (const Reply& reply : fragments)
        stub += reply.stub();
    return stub;
}

/// The operations of the interface kEcho.
enum Operation : std::uint16_t {
    kRepeat,  ///< answers with the stub data
    kOrder,   ///< answers with 1 for a little-endian caller
    kRefuse,  ///< answers with the fault rpc__s_bad_stub_data
    kThrow,
    kOverfill,  ///< claims to have written more than there was room for
    kFill,      ///< answers with as many bytes as the reply holds
    kOperations,
};

inline std::atomic<int>& callsOfRepeat() {
    static std::atomic<int> calls{0};
    return calls;
}

inline std::uint32_t repeatStub(const rpc__request* request, const void*, rpc__reply* reply) {
    ++callsOfRepeat();
    reply->length = std::min(request->length, reply->capacity);
    if (reply->length > 0) std::memcpy(reply->data, request->data, reply->length);
    return rpc__s_ok;
}
inline std::uint32_t orderStub(const rpc__request* request, const void* manager,
                               rpc__reply* reply) {
    reply->data[0] = request->littleEndian ? 1 : 0;
    reply->data[1] = manager != nullptr ? 1 : 0;
    reply->data[2] = request->handle != nullptr ? 1 : 0;
    reply->length = 3;
    return rpc__s_ok;
}
inline std::uint32_t refuseStub(const rpc__request*, const void*, rpc__reply*) {
    return rpc__s_bad_stub_data;
}
inline std::uint32_t throwStub(const rpc__request*, const void*, rpc__reply*) {
    throw std::runtime_error("stub");
}
inline std::uint32_t overfillStub(const rpc__request*, const void*, rpc__reply* reply) {
    reply->length = reply->capacity + 1;
    return rpc__s_ok;
}
inline std::uint32_t fillStub(const rpc__request*, const void*, rpc__reply* reply) {
    std::memset(reply->data, 'f', reply->capacity);
    reply->length = reply->capacity;
    return rpc__s_ok;
}

/// Registers kEcho version 1.
inline void registerEcho() {
    static constexpr rpc__server_stub kStubs[] = {repeatStub, orderStub,    refuseStub,
                                                  throwStub,  overfillStub, fillStub};
    static constexpr rpc__server_epv kVector = {kStubs, kOperations};
    static constexpr rpc__if_spec kSpecification = {"echo", kEcho, 1, kOperations};
    static constexpr int kManager = 0;
    std::uint32_t status = 1;
    rpc__register_mgr(&uuid__nil, &kSpecification, &kVector, &kManager, &status);
    if (status != rpc__s_ok) throw std::runtime_error("not registered");
}

}  // namespace ncs_test
