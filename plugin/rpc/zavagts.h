/// The RPC interface QVS_Agent_v1: its identity, its server stub and its registration.
///
/// The request of its one operation. Each field is aligned to its own size, counted from the start
/// of the data, and in the caller's byte order:
///
///     offset        field
///     0             32-bit integer, not used
///     4             32-bit room for the file name in bytes, with the terminating 0
///     8             32-bit offset of the name in that room, always 0
///     12            32-bit length of the name in bytes, with the terminating 0
///     16            the name and its terminating 0
///     (4-aligned)   32-bit integer, not used
///     +4            32-bit firstBatch
///     +8            32-bit lastIndex
///     +12           16-bit count of the chunks, and 16 bits of padding
///     +16           the chunks: a 32-bit length and 4096 bytes each
///
/// The reply is the 32-bit status.
#pragma once

#include <cstdint>

#include "platform/ncs.h"
#include "rpc/zavrpc.h"

/// The interface: version 1, one operation, no well-known ports.
extern const rpc__if_spec QVS_Agent_v1_if_spec;

/// The manager's entry-point vector: the functions that the stubs call, in the order of the
/// operations.
struct QVS_Agent_v1_mgr_epv {
    decltype(&ZAV::BinaryDataTransfer) BinaryDataTransfer;
};

/// The server's entry-point vector, which holds the stub.
const rpc__server_epv* QVS_Agent_v1_server_epv_locator();

/// The stub of operation 0: reads the parameters from the request, calls the manager and writes the
/// status to the reply. When the request does not contain what its counts and lengths claim, the
/// result is the fault rpc__s_bad_stub_data and the manager is not called.
std::uint32_t QVS_Agent_v1_BinaryDataTransfer_stub(const rpc__request* request, const void* manager,
                                                   rpc__reply* reply);

/// Registers the interface with the runtime. Returns the runtime's status, 0 for success. Does not
/// retry, and traces no line of its own.
extern "C" [[gnu::visibility("default")]] int QVS_NCS_RegisterAgentInterface();
