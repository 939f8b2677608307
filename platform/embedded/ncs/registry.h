/// The interfaces that were registered with the RPC runtime.
#pragma once

#include "platform/ncs.h"

namespace ncs {

struct RegisteredInterface {
    const rpc__if_spec* interface = nullptr;
    const rpc__server_epv* stubs = nullptr;
    const void* manager = nullptr;
};

/// Looks an interface up by identifier and major version; false when there is none. Thread-safe.
bool findInterface(const uuid__t& id, std::uint32_t version, RegisteredInterface& found);

/// How many interfaces there are.
unsigned registeredCount();

bool operator==(const uuid__t& a, const uuid__t& b);

}  // namespace ncs
