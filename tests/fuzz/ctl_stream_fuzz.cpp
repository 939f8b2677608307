// What the control program reads from the host: the packets that answer a transfer, and streams of
// events, which must give the same events whatever pieces they arrive in.

#include <algorithm>
#include <cstring>
#include <vector>

#include "ctl/client/http/event_parser.h"
#include "ctl/client/transfer/rpc_wire.h"
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

/// A second parser to compare with. It takes a line at a time: "name: value", without the blank
/// after the colon. An event ends at an empty line; without data it is ignored.
Events parseByLines(std::string_view stream) {
    Events events;
    std::string type = "message";
    std::vector<std::string> data;
    for (std::size_t end; (end = stream.find('\n')) != std::string_view::npos;) {
        std::string line(stream.substr(0, end));
        stream.remove_prefix(end + 1);
        if (!line.empty() && line.back() == '\r') line.pop_back();
        const std::string name = line.substr(0, line.find(':'));
        std::string value = line.substr(std::min(name.size() + 1, line.size()));
        if (!value.empty() && value.front() == ' ') value.erase(0, 1);
        if (name == "data") data.push_back(value);
        if (name == "event") type = value;
        if (!line.empty()) continue;
        std::string joined;
        for (std::size_t i = 0; i < data.size(); ++i)
            joined += (i > 0 ? "\n" : "") + data[i];
        if (!data.empty()) events.emplace_back(type, joined);
        type = "message";
        data.clear();
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
    require(parseInPieces(stream, piece) == parseByLines(stream), "pieces do not matter");
    checkPackets(stream);
    return 0;
}
