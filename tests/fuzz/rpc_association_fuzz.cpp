// The RPC runtime's side of a connection: in pieces of any size a stream of packets leads to the
// same calls and the same answers, every answer is a whole packet, and no memory stays behind. The
// first byte of an input is the size of the pieces.
//
// fuzz-options: -max_len=12000

#include <algorithm>
#include <cstring>
#include <vector>

#include "ncs/association.h"
#include "support/fuzz_support.h"

using fuzz::require;

namespace {

constexpr std::size_t kLargestStub = 8192;
constexpr std::size_t kBudget = 4 * kLargestStub;
constexpr std::size_t kGroupOffset = 20;

/// Every call's parameters, one behind the other.
std::string& received() {
    static std::string& all = *new std::string;
    return all;
}

std::uint32_t echo(const rpc__request* request, const void*, rpc__reply* reply) {
    require(request->length <= kLargestStub, "no call is larger than the limit");
    received().append(reinterpret_cast<const char*>(request->data), request->length);
    received() += request->littleEndian ? 'l' : 'b';
    reply->length = std::min(request->length, reply->capacity);
    if (reply->length > 0) std::memcpy(reply->data, request->data, reply->length);
    return rpc__s_ok;
}

std::uint32_t refuse(const rpc__request*, const void*, rpc__reply*) {
    return rpc__s_bad_stub_data;
}

/// An interface of two operations, version 1.
void registerInterface() {
    static constexpr rpc__if_spec kInterface = {
        "fuzz",
        {0x01234567, 0x89ab, 0xcdef, 0x01, {0x23, 0x45, 0x67, 0x89, 0xab, 0xcd, 0xef}},
        1,
        2};
    static constexpr rpc__server_stub kStubs[] = {echo, refuse};
    static constexpr rpc__server_epv kVector = {kStubs, 2};
    std::uint32_t status = rpc__s_ok;
    rpc__register_mgr(&uuid__nil, &kInterface, &kVector, nullptr, &status);
    require(status == rpc__s_ok, "an interface can be registered");
}

struct Outcome {
    std::string output;
    std::string received;
    bool open = true;
    bool bound = false;
    std::uint64_t requests = 0;
    std::uint64_t calls = 0;
    std::uint64_t faults = 0;

    bool operator==(const Outcome& other) const {
        return output == other.output && received == other.received && open == other.open &&
               bound == other.bound && requests == other.requests && calls == other.calls &&
               faults == other.faults;
    }
};

/// Puts the stream's next bytes, `piece` of them at most, where the association wants them.
std::size_t offer(ncs::Association& association, std::string_view stream, std::size_t piece) {
    iovec ranges[2];
    const int count = association.windows(ranges);
    std::size_t room = 0;
    std::string_view left = stream.substr(0, piece);
    for (int i = 0; i < count; ++i) {
        room += ranges[i].iov_len;
        const std::size_t taken = std::min(left.size(), ranges[i].iov_len);
        if (taken > 0) std::memcpy(ranges[i].iov_base, left.data(), taken);
        left.remove_prefix(taken);
    }
    require(room > 0, "there is always room for a byte");
    return std::min(piece, stream.size()) - left.size();
}

/// Takes the output away; what was left because of it is handled.
void takeOutput(ncs::Association& association, std::string& all) {
    while (!association.output().empty()) {
        all += association.output();
        association.output().clear();
        association.handle();
    }
}

Outcome converse(std::string_view stream, std::size_t piece) {
    received().clear();
    ncs::SharedState shared(kLargestStub, kBudget);
    Outcome outcome;
    {
        ncs::Association association(shared, "");
        while (!stream.empty() && association.isOpen()) {
            const std::size_t count = offer(association, stream, piece);
            association.received(count);
            stream.remove_prefix(count);
            takeOutput(association, outcome.output);
        }
        outcome.open = association.isOpen();
        outcome.bound = association.isBound();
        outcome.requests = association.requestsDone();
    }
    require(shared.memory.take(kBudget), "all memory was given back");
    outcome.received = received();
    outcome.calls = shared.calls;
    outcome.faults = shared.faults;
    return outcome;
}

/// Walks over the packets; takes out the association group, of which there is a new one each time.
void checkPackets(std::string& output) {
    for (std::size_t at = 0; at < output.size();) {
        auto* const packet = reinterpret_cast<unsigned char*>(&output[at]);
        ncs::PduHeader header;
        require(ncs::decodeHeader(packet, output.size() - at, header) == ncs::HeaderProblem::None,
                "every answer has a header");
        require(header.fragmentLength <= output.size() - at, "every answer is whole");
        require(header.littleEndian && header.authLength == 0, "answers are of one kind");
        const bool hasGroup =
            header.is(ncs::PduType::BindAck) || header.is(ncs::PduType::AlterContextResponse);
        if (hasGroup) std::memset(packet + kGroupOffset, 0, 4);
        at += header.fragmentLength;
    }
}

/// The decoders on a block of exactly the size that they are given.
void checkDecoders(std::string_view stream) {
    const std::vector<unsigned char> bytes(stream.begin(), stream.end());
    ncs::PduHeader header;
    if (ncs::decodeHeader(bytes.data(), bytes.size(), header) != ncs::HeaderProblem::None) return;
    require(header.fragmentLength >= ncs::kHeaderSize, "a packet is as long as its header");
    ncs::BindRequest bind;
    if (header.fragmentLength <= bytes.size()) {
        const std::vector<unsigned char> packet(bytes.begin(),
                                                bytes.begin() + header.fragmentLength);
        if (ncs::decodeBind(packet.data(), packet.size(), header, bind)) {
            require(bind.contexts.size() * 24 <= packet.size(), "contexts are those of the packet");
        }
    }
    const std::size_t headSize = ncs::requestHeadSize(header);
    if (headSize > bytes.size()) return;
    const std::vector<unsigned char> head(bytes.begin(),
                                          bytes.begin() + static_cast<std::ptrdiff_t>(headSize));
    require(ncs::decodeRequestHead(head.data(), header).size == headSize, "a head has its size");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const bool registered = (registerInterface(), true);
    require(registered, "the interface is registered");
    fuzz::Input input(data, size);
    const std::size_t piece = input.byte() + std::size_t{1};
    const std::string_view stream = input.rest();
    checkDecoders(stream);
    Outcome inPieces = converse(stream, piece);
    Outcome atOnce = converse(stream, stream.size() + 1);
    checkPackets(inPieces.output);
    checkPackets(atOnce.output);
    require(inPieces == atOnce, "pieces do not matter");
    return 0;
}
