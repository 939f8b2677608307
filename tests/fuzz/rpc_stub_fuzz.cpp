// The server stub of the file transfer: a request either is refused or reaches the manager once,
// with arguments that are all in place. The first byte of an input is the caller's byte order.
//
// fuzz-options: -max_len=20000

#include <vector>

#include "rpc/zavagts.h"
#include "support/fuzz_support.h"

using fuzz::require;

namespace {

struct Call {
    int count = 0;
    std::int32_t lastIndex = 0;
    std::size_t bytes = 0;
    std::string fileName;
    std::size_t length = 0;
};
Call call;

/// Looks at every byte that the arguments name, so that the sanitizers see those that are not
/// there.
extern "C" void inspectCall(handle_t, std::int32_t, const char* fileName, std::int32_t,
                            std::int32_t, std::int32_t lastIndex, const ZAV::DataChunk* chunks,
                            std::int32_t* status) {
    ++call.count;
    call.lastIndex = lastIndex;
    call.fileName = fileName;
    require(lastIndex >= 0, "there is a chunk");
    const auto count = static_cast<std::size_t>(lastIndex) + 1;
    require(count * sizeof(ZAV::DataChunk) <= call.length, "chunks are those of the packet");
    unsigned sum = 0;
    for (std::size_t i = 0; i < count; ++i) {
        require(chunks[i].length <= ZAV::kChunkCapacity, "a chunk is no longer than it can be");
        call.bytes += chunks[i].length;
        for (const unsigned char byte : chunks[i].data)
            sum += byte;
    }
    *status = static_cast<std::int32_t>(sum);
}

constexpr QVS_Agent_v1_mgr_epv kInspector = {inspectCall};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const bool littleEndian = input.below(2) == 1;
    const std::string_view rest = input.rest();
    // A block of exactly that size: bytes read beyond it are seen.
    const std::vector<unsigned char> packet(rest.begin(), rest.end());
    call = Call{};
    call.length = packet.size();
    unsigned char room[4096];
    rpc__reply reply{room, sizeof room, 0};
    const rpc__request request{nullptr, packet.data(), packet.size(), littleEndian};
    const std::uint32_t fault = QVS_Agent_v1_BinaryDataTransfer_stub(&request, &kInspector, &reply);
    if (fault != rpc__s_ok) {
        require(fault == rpc__s_bad_stub_data, "what does not fit is bad data");
        require(call.count == 0, "and never reaches the manager");
        return 0;
    }
    require(call.count == 1, "a good request reaches the manager once");
    require(reply.length == 4, "the reply is the status");
    require(call.fileName.size() + call.bytes < packet.size(), "the parts are those of the packet");
    const std::string whole(packet.begin(), packet.end());
    require(whole.find(call.fileName) != std::string::npos, "the name stands in the packet");
    return 0;
}
