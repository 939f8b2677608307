/// The interfaces that were registered with the RPC runtime.
#pragma once

#include "platform/ncs.h"

namespace ncs {

struct RegisteredInterface {
    const rpc__if_spec* interface = nullptr;
    const rpc__server_epv* stubs = nullptr;
    const void* manager = nullptr;
};

/// Finds an interface by identifier and major version; false if there is none. Any thread.
bool findInterface(const uuid__t& id, std::uint32_t version, RegisteredInterface& found);

/// The number of registered interfaces.
unsigned registeredCount();

bool operator==(const uuid__t& a, const uuid__t& b);

}  // namespace ncs
