#include "ncs/registry.h"

#include <cstring>
#include <mutex>
#include <new>
#include <vector>

const uuid__t uuid__nil = {0, 0, 0, 0, {0, 0, 0, 0, 0, 0, 0}};

namespace {

/// Never destroyed: the runtime's threads may serve calls while the process ends.
struct Registry {
    std::mutex guard;
    std::vector<ncs::RegisteredInterface> interfaces;
};

Registry& registry() {
    static Registry& instance = *new Registry;
    return instance;
}

bool isUsable(const rpc__if_spec* interface, const rpc__server_epv* stubs) {
    return interface != nullptr && stubs != nullptr && stubs->count == interface->operations;
}

}  // namespace

namespace ncs {

bool operator==(const uuid__t& a, const uuid__t& b) {
    return a.time_high == b.time_high && a.time_low == b.time_low && a.reserved == b.reserved &&
           a.family == b.family && std::memcmp(a.host, b.host, sizeof a.host) == 0;
}

bool findInterface(const uuid__t& id, std::uint32_t version, RegisteredInterface& found) {
    const std::lock_guard<std::mutex> lock(registry().guard);
    for (const RegisteredInterface& candidate : registry().interfaces) {
        if (candidate.interface->id == id && candidate.interface->version == version) {
            found = candidate;
            return true;
        }
    }
    return false;
}

unsigned registeredCount() {
    const std::lock_guard<std::mutex> lock(registry().guard);
    return static_cast<unsigned>(registry().interfaces.size());
}

}  // namespace ncs

void rpc__register_mgr(const uuid__t* object, const rpc__if_spec* interface,
                       const rpc__server_epv* stubs, const void* manager, std::uint32_t* status) {
    // Calls never name an object, so a manager for a particular object would never be called.
    if (object == nullptr || !ncs::operator==(*object, uuid__nil) || !isUsable(interface, stubs)) {
        *status = rpc__s_unknown_if;
        return;
    }
    const std::lock_guard<std::mutex> lock(registry().guard);
    *status = rpc__s_ok;
    for (ncs::RegisteredInterface& known : registry().interfaces) {
        if (ncs::operator==(known.interface->id, interface->id) &&
            known.interface->version == interface->version) {
            known = {interface, stubs, manager};
            return;
        }
    }
    try {
        registry().interfaces.push_back({interface, stubs, manager});
    } catch (const std::bad_alloc&) {
        *status = rpc__s_no_memory;
    }
}
