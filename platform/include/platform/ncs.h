/// The RPC runtime: registration of interfaces, and what server stubs need.
///
/// The runtime receives calls on its own threads, several at a time. It reassembles each request
/// and passes it to the server stub of the requested interface and operation. The stub unmarshals
/// the parameters, calls the manager and marshals the results into the reply. A request holds
/// whatever the client sent: a stub checks every length and count before it uses them.
#pragma once

#include <cstddef>
#include <cstdint>

/// An identifier in its 16-byte form. On the wire of the embedded runtime it is a DCE UUID of the
/// same 16 bytes, in this order: time_high (32 bits) as time_low, time_low (16) as time_mid,
/// reserved (16) as time_hi_and_version, family as clock_seq_hi_and_reserved, host[0] as
/// clock_seq_low and host[1] to host[6] as node.
struct uuid__t {
    std::uint32_t time_high;
    std::uint16_t time_low;
    std::uint16_t reserved;
    std::uint8_t family;
    std::uint8_t host[7];
};

/// Status values of the runtime and fault codes of stubs; 0 is success. A fault code is sent to the
/// caller unchanged.
enum : std::uint32_t {
    rpc__s_ok = 0,
    rpc__s_bad_stub_data = 0x000006F7,  ///< the request does not hold the operation's parameters
    rpc__s_fault_unspec = 0x1C000012,   ///< the manager failed for a reason without a code
    rpc__s_no_memory = 0x1C00001B,
    rpc__s_op_range = 0x1C010002,    ///< the interface has no such operation
    rpc__s_unknown_if = 0x1C010003,  ///< no such interface, or not in that version
    rpc__s_protocol_error = 0x1C01000B,
};

/// The caller of an operation; opaque, owned by the runtime.
struct rpc__binding;
using handle_t = rpc__binding*;

/// An interface, as server and clients agree on it.
struct rpc__if_spec {
    const char* name;  ///< for traces
    uuid__t id;
    std::uint32_t version;     ///< major version; the minor version is 0
    std::uint16_t operations;  ///< operations are numbered from 0
};

/// One reassembled request. All of it belongs to the runtime and is valid until the stub returns.
struct rpc__request {
    handle_t handle;
    const unsigned char* data;  ///< the marshalled parameters, contiguous
    std::size_t length;
    bool littleEndian;  ///< the caller's byte order
};

/// The reply to fill: marshalled results in little-endian byte order.
struct rpc__reply {
    unsigned char* data;
    std::size_t capacity;  ///< at least 4096
    std::size_t length;    ///< set by the stub
};

/// A server stub. Unmarshals the request, calls the manager through `manager` (the entry-point
/// vector given at registration) and marshals the reply. Returns 0, or a fault code that is sent
/// instead of the reply. Must not throw.
using rpc__server_stub = std::uint32_t (*)(const rpc__request* request, const void* manager,
                                           rpc__reply* reply);

/// The stubs of an interface, one per operation.
struct rpc__server_epv {
    const rpc__server_stub* stubs;
    std::uint16_t count;
};

extern "C" {

/// The nil identifier: no particular object.
extern const uuid__t uuid__nil;

/// Offers an interface to callers. `object` is the object type, `manager` the manager's entry-point
/// vector, which is passed to the stubs unchanged. All pointers are kept and must stay valid.
/// Registering an interface again replaces its vectors. Sets `*status` to rpc__s_ok, or to a code
/// that says why the registration was refused: a pointer is null or the number of stubs is not the
/// number of operations.
void rpc__register_mgr(const uuid__t* object, const rpc__if_spec* interface,
                       const rpc__server_epv* stubs, const void* manager, std::uint32_t* status);

/// Allocates memory for a stub's parameters: aligned for any type, not cleared. Returns null when
/// memory is short. Released with rpc__free, which ignores null. Any thread.
void* rpc__malloc(std::size_t bytes);
void rpc__free(void* memory);

/// Copies bytes between a packet and a parameter. The ranges must not overlap.
void rpc__block_copy(const void* from, void* to, std::size_t bytes);

}  // extern "C"
