#include "ncs/pdu.h"

#include <algorithm>
#include <cstring>

#include "ncs/registry.h"

namespace ncs {
namespace {

constexpr std::uint8_t kVersion = 5;
constexpr std::uint8_t kNewestMinor = 1;
constexpr std::uint8_t kLittleEndian = 0x10;
constexpr std::size_t kContextSize = 24;  ///< without its transfer syntaxes
constexpr std::size_t kSyntaxSize = 20;

/// NDR, the one transfer syntax; version 2.0.
constexpr uuid__t kNdr = {
    0x8a885d04, 0x1ceb, 0x11c9, 0x9f, {0xe8, 0x08, 0x00, 0x2b, 0x10, 0x48, 0x60}};
constexpr std::uint32_t kNdrVersion = 2;

/// Reads numbers from bytes. The caller has checked that there are enough.
class Reader {
public:
    Reader(const unsigned char* at, bool littleEndian) : at_(at), littleEndian_(littleEndian) {}

    std::uint8_t number8() { return *at_++; }
    std::uint16_t number16() {
        const unsigned a = *at_++;
        const unsigned b = *at_++;
        return static_cast<std::uint16_t>(littleEndian_ ? a | b << 8 : a << 8 | b);
    }
    std::uint32_t number32() {
        const std::uint32_t a = number16();
        const std::uint32_t b = number16();
        return littleEndian_ ? a | b << 16 : a << 16 | b;
    }
    uuid__t identifier() {
        uuid__t id{};
        id.time_high = number32();
        id.time_low = number16();
        id.reserved = number16();
        id.family = number8();
        for (std::uint8_t& byte : id.host)
            byte = number8();
        return id;
    }
    void skip(std::size_t bytes) { at_ += bytes; }

private:
    const unsigned char* at_;
    const bool littleEndian_;
};

/// Appends one packet, whose length is filled in at its end.
class Writer {
public:
    Writer(PduType type, std::uint8_t flags, std::uint32_t callId, std::string& out)
        : out_(out), start_(out.size()) {
        number8(kVersion);
        number8(0);
        number8(static_cast<std::uint8_t>(type));
        number8(flags);
        number8(kLittleEndian);
        zeros(3);
        number16(0);
        number16(0);
        number32(callId);
    }
    ~Writer() {
        const std::size_t length = out_.size() - start_;
        out_[start_ + 8] = static_cast<char>(length & 0xFF);
        out_[start_ + 9] = static_cast<char>(length >> 8);
    }
    Writer(const Writer&) = delete;
    Writer& operator=(const Writer&) = delete;

    void number8(std::uint8_t value) { out_ += static_cast<char>(value); }
    void number16(std::uint16_t value) {
        number8(static_cast<std::uint8_t>(value & 0xFF));
        number8(static_cast<std::uint8_t>(value >> 8));
    }
    void number32(std::uint32_t value) {
        number16(static_cast<std::uint16_t>(value & 0xFFFF));
        number16(static_cast<std::uint16_t>(value >> 16));
    }
    void identifier(const uuid__t& id) {
        number32(id.time_high);
        number16(id.time_low);
        number16(id.reserved);
        number8(id.family);
        for (const std::uint8_t byte : id.host)
            number8(byte);
    }
    void bytes(const void* data, std::size_t length) {
        out_.append(static_cast<const char*>(data), length);
    }
    void zeros(std::size_t count) { out_.append(count, '\0'); }
    void alignTo4() { zeros((4 - (out_.size() - start_) % 4) % 4); }

private:
    std::string& out_;
    const std::size_t start_;
};

constexpr std::uint8_t kOnlyFragment = kFirstFragment | kLastFragment;

void putResult(ContextResult result, Writer& out) {
    const bool accepted = result == ContextResult::Accepted;
    constexpr std::uint16_t kProviderRejection = 2;
    out.number16(accepted ? 0 : kProviderRejection);
    out.number16(static_cast<std::uint16_t>(result));
    out.identifier(accepted ? kNdr : uuid__nil);
    out.number32(accepted ? kNdrVersion : 0);
}

}  // namespace

HeaderProblem decodeHeader(const unsigned char* bytes, std::size_t length, PduHeader& header) {
    if (length < kHeaderSize) return HeaderProblem::Incomplete;
    const unsigned byteOrder = bytes[4] >> 4;
    header.littleEndian = byteOrder == 1;
    Reader in(bytes, header.littleEndian);
    const std::uint8_t version = in.number8();
    const std::uint8_t minor = in.number8();
    header.type = in.number8();
    header.flags = in.number8();
    const unsigned characters = in.number8() & 0x0F;
    in.skip(3);
    header.fragmentLength = in.number16();
    header.authLength = in.number16();
    header.callId = in.number32();
    if (version != kVersion || minor > kNewestMinor) return HeaderProblem::Version;
    if (byteOrder > 1 || characters != 0) return HeaderProblem::Representation;
    const bool fits = header.fragmentLength >= kHeaderSize + header.authLength;
    return fits ? HeaderProblem::None : HeaderProblem::Length;
}

std::size_t requestHeadSize(const PduHeader& header) {
    return header.has(kHasObject) ? kRequestHeadSize + kObjectSize : kRequestHeadSize;
}

RequestHead decodeRequestHead(const unsigned char* pdu, const PduHeader& header) {
    Reader in(pdu + kHeaderSize, header.littleEndian);
    RequestHead head;
    head.allocationHint = in.number32();
    head.contextId = in.number16();
    head.operation = in.number16();
    head.size = requestHeadSize(header);
    return head;
}

bool decodeBind(const unsigned char* pdu, std::size_t length, const PduHeader& header,
                BindRequest& bind) {
    constexpr std::size_t kFixedSize = kHeaderSize + 12;
    if (length < kFixedSize) return false;
    Reader in(pdu + kHeaderSize, header.littleEndian);
    bind.largestSent = in.number16();
    bind.largestTaken = in.number16();
    bind.associationGroup = in.number32();
    const unsigned count = in.number8();
    in.skip(3);
    std::size_t left = length - kFixedSize;
    bind.contexts.clear();
    bind.contexts.reserve(count);
    for (unsigned i = 0; i < count; ++i) {
        if (left < kContextSize) return false;
        PresentationContext context;
        context.id = in.number16();
        const std::size_t syntaxes = in.number8();
        in.skip(1);
        context.interface = in.identifier();
        context.version = in.number32();
        left -= kContextSize;
        if (left < syntaxes * kSyntaxSize) return false;
        for (std::size_t s = 0; s < syntaxes; ++s) {
            const uuid__t syntax = in.identifier();
            const std::uint32_t version = in.number32();
            if (syntax == kNdr && version == kNdrVersion) context.offersNdr = true;
        }
        left -= syntaxes * kSyntaxSize;
        bind.contexts.push_back(context);
    }
    return true;
}

void encodeBindAnswer(PduType type, std::uint32_t callId, const BindAnswer& answer,
                      std::string& out) {
    Writer pdu(type, kOnlyFragment, callId, out);
    pdu.number16(answer.largestSent);
    pdu.number16(answer.largestTaken);
    pdu.number32(answer.associationGroup);
    const std::size_t portLength = answer.port.empty() ? 0 : answer.port.size() + 1;
    pdu.number16(static_cast<std::uint16_t>(portLength));
    pdu.bytes(answer.port.c_str(), portLength);
    pdu.alignTo4();
    pdu.number8(static_cast<std::uint8_t>(answer.results.size()));
    pdu.zeros(3);
    for (const ContextResult result : answer.results)
        putResult(result, pdu);
}

void encodeBindRefusal(std::uint32_t callId, BindRefusal reason, std::string& out) {
    Writer pdu(PduType::BindNak, kOnlyFragment, callId, out);
    pdu.number16(static_cast<std::uint16_t>(reason));
    pdu.number8(1);
    pdu.number8(kVersion);
    pdu.number8(0);
}

void encodeResponse(std::uint32_t callId, std::uint16_t contextId, const unsigned char* data,
                    std::size_t length, std::uint16_t largestFragment, std::string& out) {
    // Except in the last fragment, the length of the data must be a multiple of 8.
    const std::size_t most = (largestFragment - kResponseHeadSize) / 8 * 8;
    std::size_t at = 0;
    do {
        const std::size_t part = std::min(most, length - at);
        const std::uint8_t first = at == 0 ? kFirstFragment : 0;
        const std::uint8_t last = at + part == length ? kLastFragment : 0;
        Writer pdu(PduType::Response, static_cast<std::uint8_t>(first | last), callId, out);
        pdu.number32(static_cast<std::uint32_t>(length - at));
        pdu.number16(contextId);
        pdu.zeros(2);
        pdu.bytes(data + at, part);
        at += part;
    } while (at < length);
}

void encodeFault(std::uint32_t callId, std::uint16_t contextId, std::uint32_t status,
                 std::uint8_t flags, std::string& out) {
    Writer pdu(PduType::Fault, static_cast<std::uint8_t>(kOnlyFragment | flags), callId, out);
    pdu.number32(0);
    pdu.number16(contextId);
    pdu.zeros(2);
    pdu.number32(status);
    pdu.number32(0);
}

}  // namespace ncs
