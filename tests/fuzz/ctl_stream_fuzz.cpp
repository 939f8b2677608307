// What the control program reads from the host: streams of events, which mean the same in pieces of
// any size, and the packets that answer a transfer.

#include <algorithm>
#include <cstring>
#include <vector>

#include "ctl/event_parser.h"
#include "ctl/rpc_wire.h"
#include "support/fuzz_support.h"

using fuzz::require;

namespace {

using Events = std::vector<std::pair<std::string, std::string>>;

Events parseInPieces(std::string_view stream, std::size_t piece) {
    ctl::EventParser parser;
    Events events;
    while (!stream.empty()) {
        const std::size_t count = std::min(piece, stream.size());
        for (const ctl::ServerEvent& event : parser.feed(stream.data(), count))
            events.emplace_back(event.type, event.data);
        stream.remove_prefix(count);
    }
    return events;
}

void checkPackets(std::string_view bytes) {
    if (bytes.size() < ctl::rpc::kCommonHeader) return;
    unsigned char head[ctl::rpc::kCommonHeader];
    std::memcpy(head, bytes.data(), sizeof head);
    ctl::rpc::CommonHeader header;
    if (!ctl::rpc::parseCommonHeader(head, header)) return;
    require(header.fragmentLength >= ctl::rpc::kCommonHeader, "a packet is as long as its header");
    const std::vector<unsigned char> body(bytes.begin() + sizeof head, bytes.end());
    std::uint16_t largest = 0;
    if (ctl::rpc::parseBindAck(body, header.littleEndian, largest)) {
        require(largest > ctl::rpc::kRequestHeader, "a fragment has room for data");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const std::size_t piece = input.byte() + std::size_t{1};
    const std::string_view stream = input.rest();
    require(parseInPieces(stream, piece) == parseInPieces(stream, stream.size() + 1),
            "pieces do not matter");
    checkPackets(stream);
    return 0;
}
