#include "rpc/zavagts.h"

#include <cstring>
#include <memory>

#include "base/zavtrace.h"

namespace {

RAS1_UNIT traceUnit{"zavagts"};

/// Reads fields from a request. Each operation checks that the field is there, and marks the reader
/// as failed otherwise; a failed reader returns zeros.
class RequestReader {
public:
    explicit RequestReader(const rpc__request& request) : request_(request) {}

    std::uint32_t number32() {
        if (!align(4) || !has(4)) return 0;
        std::uint32_t value = 0;
        std::memcpy(&value, request_.data + at_, 4);
        at_ += 4;
        return request_.littleEndian == kLittleEndianMachine ? value : __builtin_bswap32(value);
    }

    std::uint16_t number16() {
        if (!align(2) || !has(2)) return 0;
        std::uint16_t value = 0;
        std::memcpy(&value, request_.data + at_, 2);
        at_ += 2;
        return request_.littleEndian == kLittleEndianMachine ? value : __builtin_bswap16(value);
    }

    /// A 0-terminated text, borrowed from the request; null when it is not well-formed.
    const char* text() {
        const std::uint32_t room = number32();
        const std::uint32_t offset = number32();
        const std::uint32_t length = number32();
        if (length == 0 || length > room || offset != 0 || !has(length)) return fail();
        const auto* const found = reinterpret_cast<const char*>(request_.data + at_);
        if (found[length - 1] != '\0') return fail();
        at_ += length;
        return found;
    }

    /// The next `count` bytes; null when there are fewer.
    const unsigned char* bytes(std::size_t count) {
        if (!has(count)) return nullptr;
        at_ += count;
        return request_.data + at_ - count;
    }

    bool align(std::size_t size) {
        const std::size_t aligned = (at_ + size - 1) / size * size;
        if (aligned > request_.length) ok_ = false;
        if (ok_) at_ = aligned;
        return ok_;
    }

    bool has(std::size_t count) {
        if (count > request_.length - at_) ok_ = false;
        return ok_;
    }

    bool ok() const { return ok_; }

private:
    static constexpr bool kLittleEndianMachine = __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__;

    const char* fail() {
        ok_ = false;
        return nullptr;
    }

    const rpc__request& request_;
    std::size_t at_ = 0;
    bool ok_ = true;
};

struct RpcMemory {
    void operator()(ZAV::DataChunk* memory) const { rpc__free(memory); }
};
using Chunks = std::unique_ptr<ZAV::DataChunk[], RpcMemory>;

/// Copies the chunks from the request. Returns null with a failed reader when a chunk claims more
/// than it can hold, and null with a reader that has not failed when out of memory.
Chunks readChunks(RequestReader& reader, std::size_t count) {
    // Checked before the allocation: a small packet must not ask for much memory.
    if (!reader.align(4) || !reader.has(count * sizeof(ZAV::DataChunk))) return nullptr;
    Chunks chunks(static_cast<ZAV::DataChunk*>(rpc__malloc(count * sizeof(ZAV::DataChunk))));
    if (!chunks) return nullptr;
    for (std::size_t i = 0; i < count; ++i) {
        ZAV::DataChunk& chunk = chunks[i];
        chunk.length = reader.number32();
        if (chunk.length > ZAV::kChunkCapacity) {
            reader.has(static_cast<std::size_t>(-1));
            return nullptr;
        }
        rpc__block_copy(reader.bytes(ZAV::kChunkCapacity), chunk.data, ZAV::kChunkCapacity);
    }
    return chunks;
}

void putNumber32(std::uint32_t value, rpc__reply* reply) {
    for (std::size_t i = 0; i < 4; ++i) {
        reply->data[i] = static_cast<unsigned char>(value >> (8 * i));
    }
    reply->length = 4;
}

std::uint32_t callManager(const rpc__request* request, const void* manager, rpc__reply* reply) {
    RequestReader reader(*request);
    const auto unused1 = static_cast<std::int32_t>(reader.number32());
    const char* const fileName = reader.text();
    const auto unused2 = static_cast<std::int32_t>(reader.number32());
    const auto firstBatch = static_cast<std::int32_t>(reader.number32());
    const auto lastIndex = static_cast<std::int32_t>(reader.number32());
    const std::uint16_t count = reader.number16();
    if (!reader.ok() || lastIndex < 0 || lastIndex >= count) return rpc__s_bad_stub_data;
    const Chunks chunks = readChunks(reader, count);
    if (!reader.ok()) return rpc__s_bad_stub_data;
    if (!chunks) return rpc__s_no_memory;
    std::int32_t status = 0;
    static_cast<const QVS_Agent_v1_mgr_epv*>(manager)->BinaryDataTransfer(
        request->handle, unused1, fileName, unused2, firstBatch, lastIndex, chunks.get(), &status);
    putNumber32(static_cast<std::uint32_t>(status), reply);
    return rpc__s_ok;
}

constexpr rpc__server_stub kStubs[] = {QVS_Agent_v1_BinaryDataTransfer_stub};
constexpr rpc__server_epv kServerVector = {kStubs, 1};
constexpr QVS_Agent_v1_mgr_epv kManagerVector = {&ZAV::BinaryDataTransfer};

}  // namespace

const rpc__if_spec QVS_Agent_v1_if_spec = {
    "QVS_Agent_v1",
    {0xb1fb0fb3, 0x03c4, 0x0000, 0x02, {0x00, 0x00, 0x09, 0x35, 0x18, 0x3d, 0x00}},
    1,
    1,
};

const rpc__server_epv* QVS_Agent_v1_server_epv_locator() {
    return &kServerVector;
}

std::uint32_t QVS_Agent_v1_BinaryDataTransfer_stub(const rpc__request* request, const void* manager,
                                                   rpc__reply* reply) {
    ZAV::Trace trace(traceUnit);
    // Memory may run out anywhere in the manager; no exception may reach the runtime's thread.
    try {
        return trace.exit(callManager(request, manager, reply));
    } catch (...) {
        return trace.exit(static_cast<std::uint32_t>(rpc__s_fault_unspec));
    }
}

int QVS_NCS_RegisterAgentInterface() {
    ZAV::Trace trace(traceUnit);
    std::uint32_t status = rpc__s_ok;
    rpc__register_mgr(&uuid__nil, &QVS_Agent_v1_if_spec, QVS_Agent_v1_server_epv_locator(),
                      &kManagerVector, &status);
    return trace.exit(static_cast<int>(status));
}
