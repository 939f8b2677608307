// Registration of RPC interfaces and memory for their stubs. This vendor's agents have no RPC
// transport, so what is registered is kept and nobody can call it: files reach the depot by other
// ways.

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <map>
#include <mutex>
#include <string>

#include "platform/ncs.h"

const uuid__t uuid__nil = {0, 0, 0, 0, {0, 0, 0, 0, 0, 0, 0}};

namespace {

struct Registration {
    const rpc__if_spec* interface;
    const rpc__server_epv* stubs;
    const void* manager;
};

struct Registry {
    std::mutex lock;
    std::map<std::string, Registration> interfaces;  ///< by the bytes of their identifiers
};

Registry& registry() {
    static Registry instance;
    return instance;
}

}  // namespace

void rpc__register_mgr(const uuid__t*, const rpc__if_spec* interface, const rpc__server_epv* stubs,
                       const void* manager, std::uint32_t* status) {
    if (interface == nullptr || stubs == nullptr || stubs->count != interface->operations) {
        *status = rpc__s_unknown_if;
        return;
    }
    const std::string id(reinterpret_cast<const char*>(&interface->id), sizeof interface->id);
    const std::lock_guard<std::mutex> guard(registry().lock);
    registry().interfaces[id] = {interface, stubs, manager};
    *status = rpc__s_ok;
}

void* rpc__malloc(std::size_t bytes) {
    // No object is larger than PTRDIFF_MAX, and allocators of debuggers end a process that asks.
    if (bytes > PTRDIFF_MAX) return nullptr;
    return std::malloc(bytes > 0 ? bytes : 1);
}

void rpc__free(void* memory) {
    std::free(memory);
}

void rpc__block_copy(const void* from, void* to, std::size_t bytes) {
    std::memcpy(to, from, bytes);
}
