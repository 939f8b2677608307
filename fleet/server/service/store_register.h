/// The centre's records as the register of hosts that join.
#pragma once

#include "fleet/server/core/centre_store.h"
#include "fleet/server/keys/trust/host_register.h"

namespace fleet {

/// Borrows the store, and works on its thread.
class StoreRegister : public HostRegister {
public:
    explicit StoreRegister(CentreStore& store) : store_(store) {}

    void enrol(const EnrolledHost& host) override {
        if (store_.host(host.host)) return;
        HostRecord record;
        record.host = host.host;
        record.signing = host.signing;
        record.machine = host.machine;
        record.name = host.name;
        store_.keepHost(record);
    }

private:
    CentreStore& store_;
};

}  // namespace fleet
